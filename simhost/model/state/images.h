// The state, or the state of one port, as a block of bytes, and back.
#pragma once

#include <cstdint>

#include "base/api.h"
#include "base/bytes.h"
#include "storage/ports.h"

namespace simhost {

/// What outlasts a restart, or all of it.
enum class Extent { persistent, whole };

SIMHOST_API Bytes state_image(storage::Transaction &transaction, Extent extent);
/// Replaces the state, but for the switches that are shared with other hosts. Ports get new
/// numbers; an uplink comes back to its port if the host has it free. Refuses an image of a port,
/// damaged ones as Reader does, and content that no calls could have made, as those calls would; a
/// persistent extent refuses the image of a whole state (QEX_BAD_PARAM).
SIMHOST_API void load_state(storage::ChangingTransaction &transaction, BytesView image,
                            Extent extent);
/// Removes all switches that are not shared with other hosts; their uplinks become free.
SIMHOST_API void clear_state(storage::ChangingTransaction &transaction);
/// Removes the ports of type DVSPORT_TYPE_ZOMBIE, and the switches that neither run on this host
/// nor are persistent; not what is shared with other hosts.
SIMHOST_API void sanitize_state(storage::ChangingTransaction &transaction);

/// The properties of a port, for a switch of that version; refuses version 0 (QEX_BAD_PARAM).
SIMHOST_API Bytes port_image(storage::Transaction &transaction, storage::Port const &port,
                             Extent extent, std::uint32_t version);
/// Gives a port the properties of an image, beside its own.
SIMHOST_API void load_port(storage::ChangingTransaction &transaction, storage::Port const &port,
                           BytesView image);

}  // namespace simhost
