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

/// Puts a static or user address at a place; one that is there already starts over. A learned
/// address gives way wherever it is. Refuses other types (QEX_BAD_PARAM), a multicast or zero
/// address (QEX_INVALID_ADDRESS), a VLAN past 4094 (QEX_BAD_VLANID), a network of more than 24 bits
/// (QEX_BAD_PARAM), and an address that is static or a user's elsewhere (QEX_EXISTS).
void put_address(storage::Transaction &transaction, Place const &place, VSMACEntry const &entry);
/// Puts an address of any type at a place, last seen `elapsed` seconds ago: for describing a host,
/// past all limits. The rest as above.
void describe_address(storage::Transaction &transaction, Place const &place,
                      VSMACEntry const &entry);
/// Takes an address from a place. Refuses an address that is not there, or of another type than the
/// entry's unless that is VS_MAC_ADDR_TYPE_ALL (QEX_NOT_FOUND).
void remove_address(storage::Transaction &transaction, Place const &place, VSMACEntry const &entry);

/// What became of an address that was seen as the source of a frame.
enum class Sighting {
  learned,
  refreshed,
  moved,
  fixed_elsewhere,  ///< it is static or a user's elsewhere; static ones move with learnStatic
  learning_off,
  let_through,  ///< no room, and the limit policy allows its frames
  dropped,      ///< no room, and the limit policy drops its frames
};

/// A frame from this address, VLAN and network arrives at a place; its other fields mean nothing.
/// Refuses what no frame can come from, like put_address.
Sighting learn(storage::Transaction &transaction, Place const &place, VSMACEntry const &source);

/// How many addresses a place has learned, and its counters.
VSPMACLearningStats learning_stats(storage::Transaction &transaction, Place const &place);

void forget_learned(storage::Transaction &transaction);

}  // namespace simhost::stored
