// Addresses of IPv4 and IPv6, and which of them are groups.
#pragma once

#include <compare>
#include <cstdint>

#include "planes/openvswitch/openflow/value.h"

namespace simhost::multicast {

enum class Family : std::uint8_t { ipv4, ipv6 };

struct Address {
  Family family = Family::ipv4;
  openflow::Ipv6Address bytes = {};  ///< those of IPv4 come first, and zeros after them

  friend auto operator<=>(Address const &, Address const &) = default;
};

inline Address address_of(openflow::Ipv4Address const &bytes) {
  return {.family = Family::ipv4, .bytes = {bytes[0], bytes[1], bytes[2], bytes[3]}};
}
inline Address address_of(openflow::Ipv6Address const &bytes) {
  return {.family = Family::ipv6, .bytes = bytes};
}
openflow::Ipv4Address ipv4_of(Address const &address);

/// Whether it is a group's.
bool is_group(Address const &address);
/// Whether it is a group of the link itself, whose frames everybody gets because nobody has to join
/// it: 224.0.0.0/24; ff02::/120, addresses that neighbours are looked for by (ff02::1:ff00:0/104),
/// and what never leaves a machine.
bool is_for_all(Address const &group);
bool is_unspecified(Address const &address);
bool is_link_local(openflow::Ipv6Address const &address);

/// The Ethernet address to which frames of a group go.
openflow::EthernetAddress ethernet_of(Address const &group);

}  // namespace simhost::multicast
