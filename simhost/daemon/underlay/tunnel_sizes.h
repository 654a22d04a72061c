// Whether the ways of tunnels bear the packets of their switches, before a change is committed.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "daemon/devices/network_devices.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::daemon {

/// A tunnel that there is to be.
struct TunnelSize {
  std::string device;  ///< of the underlay, which may be about to come; empty without one
  storage::AddressBytes peer;
  std::uint32_t size;  ///< of the packets of its switch
};

/// Why its way does not bear them; none if it does, if nobody knows, or if it was to bear as large
/// ones before the change: that is told elsewhere, and keeps nobody from changing something else.
std::optional<std::string> why_too_large(storage::Transaction &before, TunnelSize const &wanted,
                                         NetworkDevices const &devices);

}  // namespace simhost::daemon
