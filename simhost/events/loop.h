// One thread that waits for descriptors and for times, and does what each is waited for.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>

#include "events/descriptor.h"

namespace simhost::events {

using Clock = std::chrono::steady_clock;

class Loop {
 public:
  using Work = std::function<void()>;
  /// What a descriptor is waited for.
  enum class Ready { to_read, to_write };
  /// Waits as long as it lives, which is no longer than the loop does.
  class Watch;
  class Timer;

  Loop();
  Loop(Loop const &) = delete;
  Loop &operator=(Loop const &) = delete;

  /// Does `ready` whenever the descriptor can be read, or is at its end.
  [[nodiscard]] Watch watch(int descriptor, Work ready);
  /// Does `due` once.
  [[nodiscard]] Timer after(Clock::duration wait, Work due);

  /// Waits until stop(). What the work throws leaves it.
  void run();
  /// Waits once, no longer than that.
  void turn(Clock::duration longest);
  void stop() { stopped_ = true; }

 private:
  // One that waits; it outlives its own work, which may end it.
  struct Waiting {
    Work work;
  };
  using Times = std::multimap<Clock::time_point, std::shared_ptr<Waiting>>;

  void do_due();
  [[nodiscard]] int milliseconds_to_wait(Clock::duration longest) const;

  Descriptor epoll_;
  // By numbers of which none is used twice, as those of descriptors are.
  std::map<std::uint64_t, std::shared_ptr<Waiting>> watched_;
  std::uint64_t last_watch_ = 0;
  Times times_;
  bool stopped_ = false;
};

class Loop::Watch {
 public:
  Watch() = default;
  ~Watch() { end(); }
  Watch(Watch &&other) noexcept { *this = std::move(other); }
  Watch &operator=(Watch &&other) noexcept;
  Watch(Watch const &) = delete;
  Watch &operator=(Watch const &) = delete;

  /// Waits for that in place of what it waits for.
  void wait_for(Ready what);
  void end();

 private:
  friend class Loop;
  Watch(Loop &loop, int descriptor, std::uint64_t number)
      : loop_(&loop), descriptor_(descriptor), number_(number) {}

  Loop *loop_ = nullptr;
  int descriptor_ = -1;
  std::uint64_t number_ = 0;
};

class Loop::Timer {
 public:
  Timer() = default;
  ~Timer() { end(); }
  Timer(Timer &&other) noexcept { *this = std::move(other); }
  Timer &operator=(Timer &&other) noexcept;
  Timer(Timer const &) = delete;
  Timer &operator=(Timer const &) = delete;

  void end();
  /// Whether it is still to come.
  explicit operator bool() const { return !waiting_.expired(); }

 private:
  friend class Loop;
  Timer(Loop &loop, Clock::time_point time, std::weak_ptr<Waiting> waiting)
      : loop_(&loop), time_(time), waiting_(std::move(waiting)) {}

  Loop *loop_ = nullptr;
  Clock::time_point time_;
  std::weak_ptr<Waiting> waiting_;
};

}  // namespace simhost::events
