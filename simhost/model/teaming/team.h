// One team of uplinks as it is at a moment, and the rules by which a policy chooses among them.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "clock/clock.h"
#include "storage/ports.h"
#include "storage/running/links.h"
#include "vswitch/teaming.h"

namespace simhost::teaming {

using storage::Link;

/// Whether the other end would aggregate the link with others.
inline bool would_aggregate(Link const &link) {
  return link.up() && link.partner;
}

/// Changes a link; its up_since is kept by the clock, whatever `link` says.
SIMHOST_API void set_link(storage::ChangingTransaction &transaction, std::string_view uplink,
                          Link const &link);

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

/// The link of an uplink as the plane knows it.
using LinkOf = std::function<Link(storage::Transaction &transaction, std::string_view uplink)>;

SIMHOST_API Team team_of(storage::Transaction &transaction, storage::SwitchKey key,
                         LinkOf const &link_of);

/// When the team is another one although nothing changes: how long from its `now` until the next
/// uplink that came up has been so for the up-delay.
SIMHOST_API std::optional<ClockTime> until_next_settles(Team const &team);

/// What a policy has in use under one name: an uplink, or the uplinks of a group.
struct Slot {
  std::vector<std::size_t> uplinks;  ///< where they are in Team::uplinks; not empty
  ClockTime since;                   ///< when the first of them became usable

  bool operator==(Slot const &) const = default;
};

/// What a policy can use, in its order: the first ones are in use, the others stand by for them.
struct UsableSlots {
  std::vector<Slot> slots;
  std::size_t in_use;
};

/// The same for all ports, so that a team is looked at once for all of them.
SIMHOST_API UsableSlots usable_slots(Team const &team, VSTeamPolicy const &policy);
/// Those of them that are in use.
std::vector<Slot> slots_in_use(Team const &team, VSTeamPolicy const &policy);
/// Whether every port uses the first slot instead of one chosen by its number.
inline bool uses_first_slot(VSTeamPolicy const &policy) {
  return policy.loadBalance == TEAM_FRP_TYPE_NONE ||
         policy.loadBalance == TEAM_FRP_TYPE_FO_EXPLICIT;
}

/// Where in Team::uplinks the uplink is that a port uses; nothing without a slot.
std::optional<std::size_t> uplink_for(std::vector<Slot> const &slots, VSTeamPolicy const &policy,
                                      storage::PortNumber number);
/// Likewise for a port that is bound to one uplink, which need only be up.
SIMHOST_API std::optional<std::size_t> bound_uplink_in(Team const &team, std::string_view name);

/// What a port has of its own instead of its switch's.
struct OwnTeaming {
  std::optional<VSTeamPolicy> policy;
  std::optional<std::string> uplink;  ///< the one that it is bound to
};

SIMHOST_API OwnTeaming own_teaming(storage::Transaction &transaction, storage::Port const &port);
/// Where in Team::uplinks the uplink is that a port uses, with whatever it has of its own. `shared`
/// are the slots that the policy of the team has in use.
SIMHOST_API std::optional<std::size_t> uplink_with(Team const &team, OwnTeaming const &own,
                                                   std::vector<Slot> const &shared,
                                                   storage::PortNumber number);

}  // namespace simhost::teaming
