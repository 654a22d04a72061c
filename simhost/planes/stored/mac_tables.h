// MAC tables: which addresses of a switch are reached where. An address, in its VLAN and virtual
// network, is at one place of a switch only.
//
// What ages goes after the ageing time of the switch's VSPROP_SWITCH_MAC_LEARNING, or of the global
// properties for a switch without one: at that very millisecond of the host's clock. A port learns
// while its VSPROP_PORT_MAC_MANAGEMENT says so, up to the limit there; the team always does, up to
// TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT; and all of them no more than the switch's limit.
#pragma once

#include <vector>

#include "model/plane.h"

namespace simhost::stored {

std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                  VSMACAddrType type);

/// See Plane::put_address.
void put_address(storage::ChangingTransaction &transaction, Place const &place,
                 VSMACEntry const &entry);
/// See Wires::describe_address.
void describe_address(storage::ChangingTransaction &transaction, Place const &place,
                      VSMACEntry const &entry);
/// See Plane::remove_address.
void remove_address(storage::ChangingTransaction &transaction, Place const &place,
                    VSMACEntry const &entry);
/// See Wires::learn.
Sighting learn(storage::ChangingTransaction &transaction, Place const &place,
               VSMACEntry const &source);
/// See Plane::learning_stats.
VSPMACLearningStats learning_stats(storage::Transaction &transaction, Place const &place);

}  // namespace simhost::stored
