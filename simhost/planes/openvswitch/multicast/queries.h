// The frames of queries, as the switch sends them.
#pragma once

#include <cstdint>
#include <vector>

#include "planes/openvswitch/multicast/messages.h"

namespace simhost::multicast {

/// Who asks.
struct Querier {
  openflow::EthernetAddress hardware = {};
  Address source = {};  ///< its family is that of the query
};

/// Of IGMP or MLD in the version of the query, without a tag, and decode() reads it. Times that its
/// version has no number for become the next smaller ones that have one.
std::vector<std::uint8_t> encode(Query const &query, Querier const &from);

/// The address from which a switch asks that has no other one for it: members of IPv6 listen to
/// neighbours only.
Address link_local_address(openflow::EthernetAddress const &hardware);

}  // namespace simhost::multicast
