// What a bridge and its devices have counted, asked of it.
#pragma once

#include <cstdint>
#include <map>
#include <span>
#include <vector>

#include "planes/openvswitch/counting/tally.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// Ports by the numbers that the bridge has for them.
using PortNumbers = std::map<openflow::Port, std::uint32_t>;

/// Asks for no flows but those that count. Throws what a Connection does.
std::vector<openflow::FlowEntry> counting_flows(openflow::Connection &connection,
                                                openvswitch::Deadline deadline);
/// Open vSwitch adds to a flow what its data path counted half a second later at most; devices
/// count at once. Flows that do not count may be among them.
openvswitch::Totals totals_of(std::span<openflow::FlowEntry const> flows,
                              std::span<openflow::PortStatistics const> ports,
                              PortNumbers const &numbers);

}  // namespace simhost::daemon
