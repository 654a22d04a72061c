// The network devices that uplinks and ports have: what real frames come and go through. What has
// one is no longer told by anybody what its wires bring.
#pragma once

#include <string_view>

#include "base/api.h"
#include "model/plane.h"
#include "storage/running/devices.h"
#include "storage/tunnels/fabrics.h"

namespace simhost {

/// Gives a port a device, in place of the one that it had. Refuses an uplink port, whose uplink has
/// the device (QEX_NOT_SUPPORTED), a name that no device can have (QEX_INVALID_NAME), a client's
/// address that is multicast or zero (QEX_INVALID_ADDRESS), a device that an uplink or another port
/// has (QEX_BUSY), more devices than a host has numbers for (QEX_NO_RESOURCES), a stopped clock
/// (QEX_NOT_SUPPORTED), and what the plane refuses.
SIMHOST_API void connect(storage::ChangingTransaction &transaction, storage::Port const &port,
                         std::string_view device, std::optional<storage::MacBytes> const &mac);
/// Refuses a port without a device (QEX_IS_DISCONNECTED).
SIMHOST_API void disconnect(storage::ChangingTransaction &transaction, storage::Port const &port);
/// Likewise of an uplink.
SIMHOST_API void connect(storage::ChangingTransaction &transaction, storage::Uplink const &uplink,
                         std::string_view device);
SIMHOST_API void disconnect(storage::ChangingTransaction &transaction,
                            storage::Uplink const &uplink);

/// The clock must run, for frames go by real time (QEX_NOT_SUPPORTED).
void require_real_time(storage::Transaction &transaction);
/// Refuses what connect() would refuse, of a device that is to carry tunnels.
void check_underlay_device(storage::Transaction &transaction, std::string_view device);

/// What stands in for the wires of an uplink, or of a place, which is the team's if any of the
/// switch's uplinks has a device. Refuses, naming it, what has a device or is tunnels
/// (QEX_NOT_SUPPORTED).
SIMHOST_API Wires &get_wires(storage::Transaction &transaction, std::string_view uplink);
SIMHOST_API Wires &get_wires(storage::Transaction &transaction, Place const &place);
/// Likewise of what counts; a mirror session may see the frames of any device of its switch.
SIMHOST_API Wires &get_wires(storage::Transaction &transaction, CounterOwner const &owner);
/// Refuses to stop the clock while frames flow, naming a device (QEX_NOT_SUPPORTED).
SIMHOST_API void stop_clock_without_devices(storage::ChangingTransaction &transaction);

}  // namespace simhost
