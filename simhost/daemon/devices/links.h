// The links of uplinks that have a device: from the device to the state, so that whoever asks there
// gets what is; and the host's own switch from the state to the device.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "daemon/devices/network_devices.h"
#include "storage/running/devices.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::daemon {

/// Switches devices of uplinks on or off as the state says, and devices of ports on. What cannot be
/// switched is told.
void switch_devices(storage::Transaction &transaction, NetworkDevices const &devices,
                    std::function<void(std::string const &)> const &say);
/// What is known of an uplink that its device does not tell; nothing while nobody knows.
struct Heard {
  std::optional<bool> partner;                 ///< if it is in a group
  std::optional<bool> beacons;                 ///< those of other uplinks arrive
  std::optional<std::uint32_t> error_percent;  ///< of what came in was damaged
};
using HeardAt = std::function<Heard(storage::SwitchKey key, storage::Device const &device)>;

/// Whether a link in the state is not as its device is.
bool links_differ(storage::Transaction &transaction, NetworkDevices const &devices,
                  HeardAt const &heard_at);
/// Puts them right, and lets the teams follow.
void put_links(storage::ChangingTransaction &transaction, NetworkDevices const &devices,
               HeardAt const &heard_at);

}  // namespace simhost::daemon
