// The mirror sessions of a switch.
#pragma once

#include "planes/openvswitch/compile/network.h"
#include "storage/ports.h"

namespace simhost::openvswitch {

/// Adds them to `network`, whose ports and uplinks are there, and takes from the ports that they
/// mirror to what the sessions take. Refuses as read_network does.
void read_mirrors(storage::Transaction &transaction, storage::SwitchKey key, Network &network);

}  // namespace simhost::openvswitch
