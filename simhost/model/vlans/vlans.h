// VLANs of ports: a setting and its priority, as one.
#pragma once

#include "base/api.h"
#include "model/vlans/properties.h"
#include "storage/ports.h"

namespace simhost {

/// Sets the VLANs of a port and, if there is one, the priority; without one it goes.
SIMHOST_API void set_vlans(storage::ChangingTransaction &transaction, storage::Port const &port,
                           vlans::PortVlans const &wanted);
/// Takes a port out of all VLANs; its priority goes too.
SIMHOST_API void clear_vlans(storage::ChangingTransaction &transaction, storage::Port const &port);

}  // namespace simhost
