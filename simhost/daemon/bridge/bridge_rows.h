// The rows of bridges that are wanted, next to those that are there.
#pragma once

#include <set>
#include <string>
#include <vector>

#include "daemon/wanted.h"
#include "planes/openvswitch/rows/rows.h"

namespace simhost::daemon {

/// Without devices that others have. Bridges of switches that cannot be run stay as they are.
std::vector<openvswitch::BridgeRow> wanted_rows(Wanted const &wanted,
                                                openvswitch::PresentRows const &present);
/// Whether one of them is of a bridge that is not there yet.
bool has_new(std::vector<openvswitch::BridgeRow> const &wanted,
             openvswitch::PresentRows const &present);
/// Such bridges without devices: ovs-vswitchd looks for frames at all devices after each fifty
/// messages, so that flows are in a bridge sooner before it has any.
std::vector<openvswitch::BridgeRow> rows_before_flows(std::vector<openvswitch::BridgeRow> wanted,
                                                      openvswitch::PresentRows const &present);
/// The devices that come to a bridge.
std::set<std::string> added_devices(openvswitch::PresentRows const &present,
                                    std::vector<openvswitch::BridgeRow> const &wanted);

/// Devices of a bridge that are in groups.
std::set<std::string> aggregated_devices(openvswitch::BridgeRow const &row);
/// Of which Open vSwitch chooses by their links; see Carried::slots.
std::set<openflow::Port> chosen_uplinks(WantedBridge const &wanted);

}  // namespace simhost::daemon
