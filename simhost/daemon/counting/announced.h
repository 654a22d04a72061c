// How many clients of each switch were announced, until the state has it.
#pragma once

#include <cstdint>
#include <map>

#include "events/loop.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::daemon {

class AnnouncedCounts {
 public:
  explicit AnnouncedCounts(storage::Store &store) : store_(store) {}

  /// So many packets of a switch went out just now.
  void add(storage::SwitchKey key, std::uint64_t sent);
  /// Forgets what went out of switches without readings, which have begun anew: before new readings
  /// hide that.
  void follow(storage::Transaction &transaction);
  /// Puts into the state what is not there yet. Returns whether all of it is: nothing is put while
  /// somebody else writes, for whom frames are not to wait. Not within a transaction on the store.
  /// A switch without readings has begun anew: what went out before is counted nowhere.
  bool save();

 private:
  struct Sent {
    std::uint64_t packets = 0;
    events::Clock::time_point last;
  };

  storage::Store &store_;
  std::map<storage::SwitchKey, Sent> unsaved_;
};

}  // namespace simhost::daemon
