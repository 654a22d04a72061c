// Whether machines on the networks of this one reply.
#pragma once

#include "storage/tunnels/fabrics.h"

namespace simhost::daemon {

/// Whether the machine with an address, which a device leads to without a gateway, said lately
/// where it is. Has the kernel ask it once more, so that the next question tells. Open vSwitch sees
/// what it replies, and sends there what goes into tunnels. Throws std::system_error.
bool replies(unsigned device, storage::AddressBytes const &address);

}  // namespace simhost::daemon
