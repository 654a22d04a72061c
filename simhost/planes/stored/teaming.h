// Teaming: which uplink carries what a port sends, and what happens when a link changes.
//
// The policy of a port is its own, else its switch's; one that names no uplinks means all of the
// switch. A team uses as many uplinks as the policy has active ones: the first usable ones,
// active before standby. So a standby uplink steps in for an active one whose link is down, and
// steps back when that link returns; with TEAM_FRP_FLAG_ROLLING the uplinks that have been usable
// for longest come first instead, so that nothing moves until it must. Among the uplinks in use
// TEAM_FRP_TYPE_NONE and TEAM_FRP_TYPE_FO_EXPLICIT take the first, the other kinds of balance
// spread the ports by their numbers. A policy names uplink ports, uplinks or link-aggregation
// groups.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "model/plane.h"
#include "model/teaming/team.h"
#include "storage/running/generations.h"

namespace simhost::stored {

using teaming::OwnTeaming;
using teaming::Slot;
using teaming::Team;

/// The teams of a host. What was worked out of the state is kept until something changes there on
/// which it depends, in this process or in another one.
class Teaming {
 public:
  /// See Plane::team_uplink.
  std::string uplink_of(storage::Transaction &transaction, storage::Port const &port);

  /// Changes a link and lets the teams of its switch follow: every port that moves to another
  /// uplink is announced with a reverse-ARP packet if its policy says TEAM_FRP_FLAG_NOTIFY_SWITCH,
  /// at most MaxRARPsPerInterval of them.
  void change_link(storage::ChangingTransaction &transaction, std::string_view uplink,
                   Link const &link);

 private:
  struct KeptTeam {
    std::int64_t generation;
    Team team;
    std::vector<Slot> slots;  ///< that the team's policy has in use
  };
  struct KeptPorts {
    std::int64_t generation;
    /// Of the ports that were asked for; once `plain` is there, of all that have something.
    std::unordered_map<storage::PortNumber, OwnTeaming> own;
    /// All ports for clients that have nothing of their own.
    std::optional<std::vector<storage::PortNumber>> plain;
  };

  KeptTeam const &team_of_switch(storage::Transaction &transaction, storage::SwitchKey key,
                                 storage::Generations const &generations);
  KeptPorts &ports_of_switch(storage::SwitchKey key, storage::Generations const &generations);
  OwnTeaming const &own_of(storage::Transaction &transaction, storage::Port const &port,
                           KeptPorts &ports);
  KeptPorts const &all_ports(storage::Transaction &transaction, storage::SwitchKey key,
                             storage::Generations const &generations);
  static std::uint64_t count_announced(KeptTeam const &before, KeptTeam const &after,
                                       KeptPorts const &ports, std::uint64_t most);

  std::map<storage::SwitchKey, KeptTeam> teams_;
  std::map<storage::SwitchKey, KeptPorts> ports_;
};

}  // namespace simhost::stored
