// The runtime state of a port, as properties of it: the values that the plane has, not stored ones.
#pragma once

#include "base/api.h"
#include "base/bytes.h"
#include "model/properties/descriptor.h"
#include "storage/properties.h"

namespace simhost {

/// The value of QEX_NEBPROP_PORT_STATUS, a qex_NEBPortStatus: in use with an uplink or a client,
/// the link as below, blocked by QEX_NEBPROP_PORT_BLOCK.
SIMHOST_API Bytes read_port_status(storage::Transaction &transaction,
                                   storage::PropertyOwner const &owner);

/// The value of QEX_NEBPROP_PORT_LINK_STATUS, 4 bytes. That of an uplink port is the link of its
/// uplink. That of another port is up while it has a client (QEX_NEBPROP_PORT_VNIC_CONNECTEE) which
/// has not taken its side down.
SIMHOST_API Bytes read_link_status(storage::Transaction &transaction,
                                   storage::PropertyOwner const &owner);
/// The client's side of the link goes up or down. Refuses an uplink port (QEX_READ_ONLY).
SIMHOST_API void write_link_status(Setting const &setting);

/// The value of QEX_NEBPROP_PORT_STATISTICS, a qex_NEBPortStatistics.
SIMHOST_API Bytes read_port_statistics(storage::Transaction &transaction,
                                       storage::PropertyOwner const &owner);
/// The value of VSPROP_PORT_MAC_LEARNING_STATS, a VSPMACLearningStats.
SIMHOST_API Bytes read_learning_stats(storage::Transaction &transaction,
                                      storage::PropertyOwner const &owner);

}  // namespace simhost
