#include "planes/openvswitch/multicast/address.h"

#include <algorithm>

namespace simhost::multicast {
namespace {

// The lowest of the four bits that say how far a group of IPv6 reaches which is not the machine.
constexpr unsigned kLinkScope = 2;

bool are_zero(openflow::Ipv6Address const &bytes, std::size_t first, std::size_t end) {
  return std::all_of(bytes.begin() + static_cast<std::ptrdiff_t>(first),
                     bytes.begin() + static_cast<std::ptrdiff_t>(end),
                     [](auto byte) { return byte == 0; });
}

bool is_for_all_of_ipv6(openflow::Ipv6Address const &group) {
  auto const scope = group[1] & 0xfU;
  if (scope != kLinkScope) {
    return scope < kLinkScope;
  }
  if (group[1] != kLinkScope) {
    return false;
  }
  bool const is_well_known = are_zero(group, 2, 15);
  bool const is_solicited_node = are_zero(group, 2, 11) && group[11] == 0x01 && group[12] == 0xff;
  return is_well_known || is_solicited_node;
}

}  // namespace

openflow::Ipv4Address ipv4_of(Address const &address) {
  auto const &bytes = address.bytes;
  return {bytes[0], bytes[1], bytes[2], bytes[3]};
}

bool is_group(Address const &address) {
  return address.family == Family::ipv4 ? (address.bytes[0] & 0xf0U) == 0xe0U
                                        : address.bytes[0] == 0xffU;
}

bool is_for_all(Address const &group) {
  auto const &bytes = group.bytes;
  return group.family == Family::ipv4 ? bytes[0] == 224 && bytes[1] == 0 && bytes[2] == 0
                                      : is_for_all_of_ipv6(bytes);
}

bool is_unspecified(Address const &address) {
  return are_zero(address.bytes, 0, address.bytes.size());
}

bool is_link_local(openflow::Ipv6Address const &address) {
  return address[0] == 0xfe && (address[1] & 0xc0U) == 0x80U;
}

openflow::EthernetAddress ethernet_of(Address const &group) {
  auto const &bytes = group.bytes;
  if (group.family == Family::ipv4) {
    return {0x01, 0x00, 0x5e, static_cast<std::uint8_t>(bytes[1] & 0x7fU), bytes[2], bytes[3]};
  }
  return {0x33, 0x33, bytes[12], bytes[13], bytes[14], bytes[15]};
}

}  // namespace simhost::multicast
