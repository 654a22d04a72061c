// What a bridge and its devices have counted, asked of it.
#pragma once

#include <cstdint>
#include <map>

#include "planes/openvswitch/counting/tally.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// Ports by the numbers that the bridge has for them.
using PortNumbers = std::map<openflow::Port, std::uint32_t>;

/// Open vSwitch adds to a flow what its data path counted half a second later at most; devices
/// count at once. Throws what a Connection does.
openvswitch::Totals totals_of(openflow::Connection &connection, PortNumbers const &numbers,
                              openvswitch::Deadline deadline);

}  // namespace simhost::daemon
