// Multicast filters: the groups that the clients of ports have joined.
#pragma once

#include "model/plane.h"

namespace simhost::stored {

/// See Wires::join.
void join(storage::ChangingTransaction &transaction, storage::PortNumber port,
          McastGroup const &group);
/// See Wires::leave.
void leave(storage::ChangingTransaction &transaction, storage::PortNumber port,
           AddressBytes const &address);

}  // namespace simhost::stored
