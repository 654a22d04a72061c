// The difference of two looks: the last one, and one that was long enough ago.
#include "daemon/devices/damaged_frames.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

// Shorter, and a single frame would be much of what came.
constexpr auto kLately = 10s;

std::uint32_t percent_of(std::uint64_t part, std::uint64_t whole) {
  constexpr std::uint64_t kHundred = 100;
  return static_cast<std::uint32_t>((part * kHundred + whole - 1) / whole);
}

}  // namespace

void DamagedFrames::count(events::Clock::time_point now, Arrived const &all) {
  // What counts less than before began anew.
  if (!looks_.empty() &&
      (all.whole < looks_.back().all.whole || all.damaged < looks_.back().all.damaged)) {
    looks_.clear();
  }
  looks_.push_back({.time = now, .all = all});
  while (looks_.size() > 2 && looks_[1].time <= now - kLately) {
    looks_.pop_front();
  }
  auto const &first = looks_.front().all;
  auto const damaged = all.damaged - first.damaged;
  if (auto const came = all.whole - first.whole + damaged; came > 0) {
    percent_ = percent_of(damaged, came);
  }
}

}  // namespace simhost::daemon
