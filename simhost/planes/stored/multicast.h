// Multicast filters: the groups that the clients of ports have joined.
#pragma once

#include <cstddef>
#include <optional>
#include <vector>

#include "model/plane.h"

namespace simhost::stored {

/// Joins a group, or reports it anew: what is known of it is replaced. Its time of update is the
/// clock's, whatever `group` says. Refuses an address of another length than 4, 6 or 16 bytes or
/// that is not multicast, and sources of another length or beside a group of Ethernet
/// (QEX_INVALID_ADDRESS); a protocol version or source mode out of bounds (QEX_BAD_PARAM); more
/// sources than IGMPV3MaxSrcIPNum or MLDV2MaxSrcIPNum (QEX_LIMIT_EXCEEDED).
void join(storage::Transaction &transaction, storage::PortNumber port, McastGroup const &group);
/// Refuses a group that the port has not joined (QEX_NOT_FOUND).
void leave(storage::Transaction &transaction, storage::PortNumber port,
           AddressBytes const &address);

std::vector<AddressBytes> groups(storage::Transaction &transaction, storage::PortNumber port,
                                 std::size_t length);
std::optional<McastGroup> group(storage::Transaction &transaction, storage::PortNumber port,
                                AddressBytes const &address);

void forget_groups(storage::Transaction &transaction);

}  // namespace simhost::stored
