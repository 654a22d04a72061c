// One team of uplinks as it is at a moment, and the rules by which a policy chooses among them.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "model/plane.h"
#include "planes/stored/links.h"
#include "vswitch/teaming.h"

namespace simhost::stored {

struct TeamUplink {
  std::string name;
  std::string port;        ///< name of the uplink port it is at,
  std::string identifier;  ///< and the identifier of that port
  Link link;
  bool aggregated;
  bool blocked;  ///< its port lets nothing through
};

/// What all ports of a switch have in common.
struct Team {
  std::vector<TeamUplink> uplinks;  ///< in the order of their ports
  std::vector<storage::LagRow> lags;
  VSTeamPolicy policy;  ///< of the ports without one of their own
  ClockTime now;
  ClockTime up_delay;
};

Team team_of(storage::Transaction &transaction, storage::SwitchKey key);

/// What a policy has in use under one name: an uplink, or the uplinks of a group.
struct Slot {
  std::vector<std::size_t> uplinks;  ///< where they are in Team::uplinks; not empty
  ClockTime since;                   ///< when the first of them became usable

  bool operator==(Slot const &) const = default;
};

/// The slots that a policy has in use, in its order. The same for all ports, so that a team is
/// looked at once for all of them.
std::vector<Slot> slots_in_use(Team const &team, VSTeamPolicy const &policy);

/// Where in Team::uplinks the uplink is that a port uses; nothing without a slot.
std::optional<std::size_t> uplink_for(std::vector<Slot> const &slots, VSTeamPolicy const &policy,
                                      storage::PortNumber number);
/// Likewise for a port that is bound to one uplink, which need only be up.
std::optional<std::size_t> bound_uplink(Team const &team, std::string_view name);

}  // namespace simhost::stored
