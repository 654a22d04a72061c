// Teams that go by load: what the clients of their ports send, and which uplinks these use for it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <vector>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/counting/tally.h"
#include "storage/load/chosen.h"
#include "storage/store.h"

namespace simhost::daemon {

class LoadBalance {
 public:
  explicit LoadBalance(storage::Store &store) : store_(store) {}

  /// What the bridge of a switch counted, all of it.
  void count(storage::SwitchKey key, openvswitch::Totals const &totals);
  /// Has the ports of such teams use the uplinks that were chosen for them.
  void follow(storage::Transaction &transaction, storage::SwitchKey key,
              openvswitch::Network &network);
  /// Looks at what was sent since the last time, and chooses another uplink for a port of each team
  /// that gains by it. Returns whether any does.
  bool choose();
  /// Over which uplink goes what a port of such a team sends, or over the first of those that are
  /// one link; 0 for a port of no such team, or of one with nothing to choose.
  [[nodiscard]] openflow::Port carrier(storage::SwitchKey key, std::uint32_t port) const;
  /// Only those switches are there.
  void keep(std::set<storage::SwitchKey> const &keys);
  /// Puts into the state what was chosen. Returns whether all of it is there: nothing is put while
  /// somebody else writes, for whom frames are not to wait. Not within a transaction on the store.
  /// A switch without readings has begun anew: nothing is put that was chosen for it before.
  bool save();

 private:
  struct Team {
    std::vector<openvswitch::Slot> slots;
    std::vector<std::uint32_t> ports;
  };
  struct OfSwitch {
    std::vector<Team> teams;
    std::map<std::uint32_t, std::uint32_t> shares;  // of the ports of these teams
    std::map<std::uint32_t, std::uint64_t> sent;    // by the clients of ports
    // At the last look, or at first: a bridge may have counted long before.
    std::optional<std::map<std::uint32_t, std::uint64_t>> sent_before;
  };

  bool choose(storage::SwitchKey key, OfSwitch &of_switch, Team const &team);

  storage::Store &store_;
  std::map<storage::SwitchKey, OfSwitch> switches_;
  std::map<storage::SwitchKey, storage::ChosenShares> unsaved_;
};

}  // namespace simhost::daemon
