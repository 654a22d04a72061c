// Teams that go by load: what the clients of their ports send, and which uplinks these use for it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <set>
#include <vector>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/counting/tally.h"
#include "storage/switches.h"

namespace simhost::daemon {

class LoadBalance {
 public:
  /// What the bridge of a switch counted, all of it.
  void count(storage::SwitchKey key, openvswitch::Totals const &totals);
  /// Has the ports of such teams use the uplinks that were chosen for them.
  void follow(storage::SwitchKey key, openvswitch::Network &network);
  /// Looks at what was sent since the last time, and chooses another uplink for a port of each team
  /// that gains by it. Returns whether any does.
  bool choose();
  /// Over which uplink goes what a port of such a team sends, or over the first of those that are
  /// one link; 0 for a port of no such team, or of one with nothing to choose.
  [[nodiscard]] openflow::Port carrier(storage::SwitchKey key, std::uint32_t port) const;
  /// Only those switches are there.
  void keep(std::set<storage::SwitchKey> const &keys);

 private:
  struct Team {
    std::vector<openvswitch::Slot> slots;
    std::vector<std::uint32_t> ports;
  };
  struct OfSwitch {
    std::vector<Team> teams;
    std::map<std::uint32_t, std::uint32_t> shares;  // of ports for which one was chosen
    std::map<std::uint32_t, std::uint64_t> sent;    // by the clients of ports
    std::map<std::uint32_t, std::uint64_t> sent_before;
  };

  static bool choose(OfSwitch &of_switch, Team const &team);

  std::map<storage::SwitchKey, OfSwitch> switches_;
};

}  // namespace simhost::daemon
