// Addresses and routes of the kernel, in the namespace of this process.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "storage/tunnels/fabrics.h"

namespace simhost::daemon {

/// Gives a device an address of this machine; false if it has it. What is there already is not told
/// anew: Open vSwitch would lose sight of it for a moment. These throw std::system_error.
bool put_address(unsigned device, storage::AddressBytes const &address, std::uint8_t prefix);
/// Sends what has no better way over a device to a gateway; false if it goes somewhere already.
bool put_default_route(unsigned device, storage::AddressBytes const &gateway);

/// Where packets to an address go.
struct Route {
  bool is_local = false;                            ///< nowhere: it is this machine's
  std::string device = {};                          ///< else the one over which they leave
  storage::AddressBytes gateway = {};               ///< that they go to first; empty for none
  std::optional<std::uint32_t> mtu = std::nullopt;  ///< where it is another than the device's
};

/// Nothing for an address that cannot be reached.
std::optional<Route> find_route(storage::AddressBytes const &address);

}  // namespace simhost::daemon
