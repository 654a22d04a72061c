// How many of the frames that came in over a wire lately were damaged.
#pragma once

#include <cstdint>
#include <deque>
#include <optional>

#include "events/loop.h"

namespace simhost::daemon {

/// What came in at a device since it is there.
struct Arrived {
  std::uint64_t whole = 0;
  std::uint64_t damaged = 0;
};

class DamagedFrames {
 public:
  void count(events::Clock::time_point now, Arrived const &all);

  /// Of a hundred frames, those begun counted as whole ones: more than a limit if the frames are.
  /// As it was while none come; nothing while none came.
  [[nodiscard]] std::optional<std::uint32_t> percent() const { return percent_; }

 private:
  struct Look {
    events::Clock::time_point time;
    Arrived all;
  };

  std::deque<Look> looks_;
  std::optional<std::uint32_t> percent_;
};

}  // namespace simhost::daemon
