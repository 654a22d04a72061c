// The links of uplinks that have a device: from the device to the state, so that whoever asks there
// gets what is; and the host's own switch from the state to the device.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "daemon/devices/network_devices.h"
#include "planes/openvswitch/openflow/port.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::daemon {

/// Switches devices of uplinks on or off as the state says, and devices of ports on. What cannot be
/// switched is told.
void switch_devices(storage::Transaction &transaction, NetworkDevices const &devices,
                    std::function<void(std::string const &)> const &say);
/// What is known of an uplink besides its device; nothing while nobody knows.
struct Heard {
  std::optional<bool> partner;  ///< if it is in a group
  std::optional<bool> beacons;  ///< those of other uplinks arrive
};
using HeardAt = std::function<Heard(storage::SwitchKey key, openflow::Port port)>;

/// Whether a link in the state is not as its device is.
bool links_differ(storage::Transaction &transaction, NetworkDevices const &devices,
                  HeardAt const &heard_at);
/// Puts them right, and lets the teams follow.
void put_links(storage::ChangingTransaction &transaction, NetworkDevices const &devices,
               HeardAt const &heard_at);

}  // namespace simhost::daemon
