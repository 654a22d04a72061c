// The mirror sessions of a switch.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

#include "planes/openvswitch/compile/network.h"
#include "storage/ports.h"

namespace simhost::openvswitch {

/// Adds them to `network`, whose ports and uplinks are there, and takes from the ports that they
/// mirror to what the sessions take. Refuses as read_network does.
void read_mirrors(storage::Transaction &transaction, storage::SwitchKey key, Network &network);

/// Where the session with an id is.
struct SessionAt {
  std::optional<storage::PortNumber> port;  ///< of the table; none: the one of the uplinks
  std::size_t index;                        ///< in the table
};
SessionAt session_at(std::uint32_t id);

bool has_mirror_sessions(storage::Transaction &transaction, storage::SwitchKey key);

}  // namespace simhost::openvswitch
