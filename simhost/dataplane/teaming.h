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

#include <string>
#include <string_view>

#include "core/data_plane.h"
#include "dataplane/links.h"

namespace simhost::dataplane {

/// See DataPlane::team_uplink.
std::string team_uplink(store::Transaction &transaction, store::Port const &port);

/// Changes a link and lets the teams of its switch follow: every port that moves to another uplink
/// is announced with a reverse-ARP packet if its policy says TEAM_FRP_FLAG_NOTIFY_SWITCH, at most
/// MaxRARPsPerInterval of them.
void change_link(store::Transaction &transaction, std::string_view uplink, Link const &link);

}  // namespace simhost::dataplane
