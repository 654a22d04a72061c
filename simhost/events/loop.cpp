// Waiting with epoll.
#include "events/loop.h"

#include <sys/epoll.h>

#include <algorithm>
#include <array>
#include <limits>
#include <utility>
#include <vector>

namespace simhost::events {

Loop::Loop() : epoll_(owned(epoll_create1(EPOLL_CLOEXEC), "epoll_create1")) {}

Loop::Watch Loop::watch(int descriptor, Work ready) {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.u64 = ++last_watch_;
  if (epoll_ctl(epoll_.number(), EPOLL_CTL_ADD, descriptor, &event) != 0) {
    fail_with_errno("epoll_ctl");
  }
  watched_[last_watch_] = std::make_shared<Waiting>(Waiting{std::move(ready)});
  return {*this, descriptor, last_watch_};
}

Loop::Timer Loop::after(Clock::duration wait, Work due) {
  auto const time = Clock::now() + wait;
  auto const added = times_.emplace(time, std::make_shared<Waiting>(Waiting{std::move(due)}));
  return {*this, time, added->second};
}

void Loop::run() {
  stopped_ = false;
  while (!stopped_) {
    turn(std::chrono::hours(1));
  }
}

int Loop::milliseconds_to_wait(Clock::duration longest) const {
  auto wait = longest;
  if (!times_.empty()) {
    wait = std::min(wait, times_.begin()->first - Clock::now());
  }
  auto const whole = std::chrono::ceil<std::chrono::milliseconds>(wait).count();
  return static_cast<int>(std::clamp<std::int64_t>(whole, 0, std::numeric_limits<int>::max()));
}

void Loop::turn(Clock::duration longest) {
  std::array<epoll_event, 16> events{};
  auto const count = epoll_wait(epoll_.number(), events.data(), static_cast<int>(events.size()),
                                milliseconds_to_wait(longest));
  if (count < 0 && errno != EINTR) {
    fail_with_errno("epoll_wait");
  }
  // What is done for one may end others: those are looked up when it is their turn.
  for (int at = 0; at < count; ++at) {
    auto const found = watched_.find(events.at(static_cast<std::size_t>(at)).data.u64);
    if (found != watched_.end()) {
      auto const waiting = found->second;
      waiting->work();
    }
  }
  do_due();
}

void Loop::do_due() {
  auto const now = Clock::now();
  while (!times_.empty() && times_.begin()->first <= now) {
    // No longer to come: its work may put another one in its place.
    auto const work = std::move(times_.extract(times_.begin()).mapped()->work);
    work();
  }
}

Loop::Watch &Loop::Watch::operator=(Watch &&other) noexcept {
  if (this != &other) {
    end();
    loop_ = std::exchange(other.loop_, nullptr);
    descriptor_ = other.descriptor_;
    number_ = other.number_;
  }
  return *this;
}

void Loop::Watch::wait_for(Ready what) {
  epoll_event event{};
  event.events = what == Ready::to_write ? EPOLLOUT : EPOLLIN;
  event.data.u64 = number_;
  if (epoll_ctl(loop_->epoll_.number(), EPOLL_CTL_MOD, descriptor_, &event) != 0) {
    fail_with_errno("epoll_ctl");
  }
}

void Loop::Watch::end() {
  if (auto *const loop = std::exchange(loop_, nullptr)) {
    epoll_ctl(loop->epoll_.number(), EPOLL_CTL_DEL, descriptor_, nullptr);
    loop->watched_.erase(number_);
  }
}

Loop::Timer &Loop::Timer::operator=(Timer &&other) noexcept {
  if (this != &other) {
    end();
    loop_ = std::exchange(other.loop_, nullptr);
    time_ = other.time_;
    waiting_ = std::move(other.waiting_);
  }
  return *this;
}

void Loop::Timer::end() {
  auto *const loop = std::exchange(loop_, nullptr);
  auto const waiting = waiting_.lock();
  waiting_.reset();
  if (loop == nullptr || waiting == nullptr) {
    return;
  }
  auto const [first, last] = loop->times_.equal_range(time_);
  auto const found =
      std::find_if(first, last, [&](auto const &entry) { return entry.second == waiting; });
  if (found != last) {
    loop->times_.erase(found);
  }
}

}  // namespace simhost::events
