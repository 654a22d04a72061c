// The counters of the switches that have real frames: those of the state, raised by what their
// bridges count. What a bridge had counted when it was read is kept with them, so that whoever ends
// in between, nothing counts twice and nothing counts down.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "planes/openvswitch/counting/tally.h"
#include "storage/store.h"

namespace simhost::daemon {

class Counting {
 public:
  explicit Counting(storage::Store &store) : store_(store) {}

  // None of these four may be called in a transaction on the store.

  /// See Tally::count.
  void count(storage::SwitchKey key, openvswitch::Totals const &totals,
             openvswitch::CountedSessions const &sessions);
  void count_move(storage::SwitchKey key, std::uint32_t port);
  /// Raises the counters of the state. Does nothing while somebody else writes. Returns whether
  /// the state has all of them.
  bool save();
  /// Likewise, if there is a switch of which the state has nothing yet: whether its counters go is
  /// seen from now on.
  void save_new();

  /// What is in the state and what is not yet.
  Counters counters_of(storage::Transaction &transaction, CounterOwner const &owner);
  /// The mirror sessions that have counted what is not in the state yet.
  std::vector<std::string> unsaved_sessions(storage::SwitchKey key) const;

  /// Counters of the state may have been removed, and with them what was counted: then nothing is
  /// left here either, and the next count() is the first one.
  void forget_removed(storage::Transaction &transaction);
  /// Likewise. Returns whether some were since it was asked last.
  bool follow(storage::Transaction &transaction);

 private:
  struct OfSwitch {
    openvswitch::Tally tally;
    openvswitch::Totals saved;  // what the state has
    bool is_in_state = false;

    [[nodiscard]] bool is_saved() const;
    void set_saved();
  };

  OfSwitch &of_switch(storage::SwitchKey key);
  void remove_other_switches(storage::Transaction &transaction);

  storage::Store &store_;
  std::map<storage::SwitchKey, OfSwitch> switches_;
  bool has_forgotten_ = false;  // what follow() has not told yet
};

}  // namespace simhost::daemon
