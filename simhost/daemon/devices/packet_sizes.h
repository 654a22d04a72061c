// How large packets are that devices carry: at least as large as those of their switch. One that
// carries larger ones is left alone.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include "daemon/devices/network_devices.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::daemon {

/// The size of the largest packet that a device is to carry, by its name.
using PacketSizes = std::map<std::string, std::uint32_t>;

/// Those of the devices of all switches, as far as they carry less.
PacketSizes sizes_to_raise(storage::Transaction &transaction, NetworkDevices const &devices);
/// Those of all devices of one switch, whose packets are as large as that.
void add_packet_sizes(storage::Transaction &transaction, storage::SwitchKey key, std::uint32_t size,
                      PacketSizes &sizes);

/// Has devices that are there carry packets of these sizes, or tells of each that cannot be made
/// to.
void raise_packet_sizes(PacketSizes const &sizes, NetworkDevices const &devices,
                        std::function<void(std::string const &)> const &say);
/// Likewise all of them, or none: returns why not. What is no more than the state wanted before
/// counts for nothing: one that cannot do it must not stand in the way of every other change.
std::optional<std::string> raise_all_packet_sizes(storage::Transaction &before,
                                                  PacketSizes const &sizes,
                                                  NetworkDevices const &devices);

}  // namespace simhost::daemon
