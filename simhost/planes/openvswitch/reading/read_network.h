// What a switch of the state is to its frames.
#pragma once

#include <cstdint>
#include <map>
#include <span>

#include "model/teaming/team.h"
#include "planes/openvswitch/compile/network.h"
#include "storage/ports.h"
#include "storage/running/devices.h"

namespace simhost::openvswitch {

/// What frames and counters told of the ports of a switch, which the state does not know.
struct Observed {
  /// The addresses that clients have now, where they can be seen.
  std::map<storage::PortNumber, EthernetAddress> addresses = {};
  /// Which of its team's uplinks a port is given, where that is not by its number.
  std::map<storage::PortNumber, std::uint32_t> shares = {};
  /// Who wants frames of which groups.
  multicast::Groups groups = {};
};

/// The uplinks and ports that have a device, by the numbers of their devices. `team` has the links
/// as they are, `connected` the devices of the ports. Refuses mirror sessions of kinds that are not
/// mirrored here (QEX_NOT_SUPPORTED).
Network read_network(storage::Transaction &transaction, storage::SwitchKey key,
                     teaming::Team const &team, std::span<storage::PortDevice const> connected,
                     Observed const &observed);

/// Whether a switch has anything that read_network() or check() may refuse, which is told at once:
/// of all that a state can hold, mirror sessions may be more than flows can do, and so may many
/// uplinks that are one link.
bool may_be_refused(storage::Transaction &transaction, storage::SwitchKey key);

}  // namespace simhost::openvswitch
