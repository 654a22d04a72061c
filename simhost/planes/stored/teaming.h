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
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "model/plane.h"
#include "planes/stored/links.h"
#include "planes/stored/team.h"

namespace simhost::stored {

/// What a port has of its own instead of its switch's.
struct OwnTeaming {
  std::optional<VSTeamPolicy> policy;
  std::optional<std::string> uplink;  ///< the one that it is bound to
};

/// The ports of a switch that have something of their own; most have nothing.
using OwnTeamings = std::unordered_map<std::uint32_t, OwnTeaming>;
OwnTeamings own_teamings(storage::Transaction &transaction, storage::SwitchKey key);

/// Which uplinks carry what the ports of one switch send, for many ports at one moment.
class Carriers {
 public:
  Carriers(Team team, OwnTeamings const &own);

  /// The uplink of a port; empty if none of its team is in use.
  [[nodiscard]] std::string_view of(storage::PortNumber number) const;
  /// See Plane::team_uplink.
  [[nodiscard]] std::string required_of(storage::Port const &port) const;
  /// Whether the port's policy wants its moves to be announced.
  [[nodiscard]] bool announces(storage::PortNumber number) const;

 private:
  [[nodiscard]] OwnTeaming const *own_of(storage::PortNumber number) const;

  Team team_;
  std::vector<Slot> shared_;  // what the switch's policy has in use
  OwnTeamings const &own_;
};

/// See Plane::team_uplink.
std::string team_uplink(storage::Transaction &transaction, storage::Port const &port);

/// Changes a link and lets the teams of its switch follow: every port that moves to another uplink
/// is announced with a reverse-ARP packet if its policy says TEAM_FRP_FLAG_NOTIFY_SWITCH, at most
/// MaxRARPsPerInterval of them.
void change_link(storage::Transaction &transaction, std::string_view uplink, Link const &link);

}  // namespace simhost::stored
