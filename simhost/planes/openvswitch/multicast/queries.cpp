#include "planes/openvswitch/multicast/queries.h"

#include <algorithm>
#include <span>

#include "planes/openvswitch/multicast/checksum.h"
#include "planes/openvswitch/multicast/floating_code.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "qexapi/protocols.h"

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;
using openflow::Bytes;
using openflow::Writer;

constexpr std::uint8_t kMostRobustness = 7;

// All systems of the link.
constexpr openflow::Ipv4Address kAllOfIpv4{224, 0, 0, 1};
constexpr openflow::Ipv6Address kAllOfIpv6{0xff, 0x02, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1};

// For routers on the way to look at, and no router passes it on.
constexpr std::uint8_t kIpv4RouterAlert[]{0x94, 4, 0, 0};
constexpr std::uint8_t kIpv6RouterAlert[]{5, 2, 0, 0, 1, 0};
constexpr std::uint8_t kHops = 1;
// Internetwork control.
constexpr std::uint8_t kServiceClass = 0xc0;

void put_address(Writer &out, Address const &address) {
  std::span<std::uint8_t const> const bytes(address.bytes);
  out.append(address.family == Family::ipv4 ? bytes.first(sizeof(openflow::Ipv4Address)) : bytes);
}

void put_group(Writer &out, Query const &query, Family family) {
  put_address(out, query.group.value_or(Address{.family = family}));
}

// What versions with sources end with.
void put_sources(Writer &out, Query const &query) {
  auto const robustness = query.robustness > kMostRobustness ? 0 : query.robustness;
  out.u8(static_cast<std::uint8_t>(robustness));
  out.u8(static_cast<std::uint8_t>(
      FloatingCode<8>::encoded(static_cast<std::uint64_t>(query.interval.count()))));
  out.u16(static_cast<std::uint16_t>(query.sources.size()));
  for (auto const &source : query.sources) {
    put_address(out, source);
  }
}

// 0 would be the first version.
std::uint8_t tenths(Query const &query) {
  auto const count =
      static_cast<std::uint64_t>(std::max(query.response, kResponseUnit) / kResponseUnit);
  switch (query.version) {
    case 1:
      return 0;
    case 2:
      return static_cast<std::uint8_t>(std::min<std::uint64_t>(count, 0xff));
    default:
      return static_cast<std::uint8_t>(FloatingCode<8>::encoded(count));
  }
}

Bytes igmp(Query const &query) {
  Writer out;
  out.u8(QEX_IGMP_QUERY);
  out.u8(tenths(query));
  out.u16(0);
  put_group(out, query, Family::ipv4);
  if (query.version > 2) {
    put_sources(out, query);
  }
  return out.bytes();
}

std::uint16_t milliseconds(Query const &query) {
  auto const count = static_cast<std::uint64_t>(query.response.count());
  return static_cast<std::uint16_t>(query.version == 1 ? std::min<std::uint64_t>(count, 0xffff)
                                                       : FloatingCode<16>::encoded(count));
}

Bytes mld(Query const &query) {
  Writer out;
  out.u8(QEX_MLD_QUERY);
  out.u8(0);
  out.u16(0);
  out.u16(milliseconds(query));
  out.u16(0);
  put_group(out, query, Family::ipv6);
  if (query.version > 1) {
    put_sources(out, query);
  }
  return out.bytes();
}

// After a type and a code, where both have it.
void put_checksum(Bytes &message, std::uint16_t sum) {
  message[2] = static_cast<std::uint8_t>(sum >> 8U);
  message[3] = static_cast<std::uint8_t>(sum);
}

Writer frame_to(Address const &destination, openflow::EthernetAddress const &from,
                std::uint16_t type) {
  Writer out;
  out.append(ethernet_of(destination));
  out.append(from);
  out.u16(type);
  return out;
}

Bytes ipv4_frame(Querier const &from, Address const &destination, Bytes message) {
  put_checksum(message, Checksum().add(message).value());
  constexpr std::size_t kHeader = 24;
  Writer header;
  header.u8(0x40 | kHeader / 4);
  header.u8(kServiceClass);
  header.u16(static_cast<std::uint16_t>(kHeader + message.size()));
  header.u32(0x4000);  // not to be fragmented
  header.u8(kHops);
  header.u8(QEX_IP_PROTO_IGMP);
  auto const sum_at = header.size();
  header.u16(0);
  put_address(header, from.source);
  put_address(header, destination);
  header.append(kIpv4RouterAlert);
  auto bytes = header.bytes();
  auto const sum = Checksum().add(bytes).value();
  bytes[sum_at] = static_cast<std::uint8_t>(sum >> 8U);
  bytes[sum_at + 1] = static_cast<std::uint8_t>(sum);
  auto out = frame_to(destination, from.hardware, QEX_ETH_TYPE_IPV4);
  out.append(bytes);
  out.append(message);
  return out.bytes();
}

Bytes ipv6_frame(Querier const &from, Address const &destination, Bytes message) {
  put_checksum(message,
               Checksum()
                   .add_header(from.source, destination, QEX_IP_PROTO_ICMPV6, message.size())
                   .add(message)
                   .value());
  auto out = frame_to(destination, from.hardware, QEX_ETH_TYPE_IPV6);
  out.u32(0x60000000);
  out.u16(static_cast<std::uint16_t>(2 + sizeof kIpv6RouterAlert + message.size()));
  out.u8(QEX_IP_PROTO_IPV6_HOPOPT);
  out.u8(kHops);
  put_address(out, from.source);
  put_address(out, destination);
  out.u8(QEX_IP_PROTO_ICMPV6);
  out.u8(0);
  out.append(kIpv6RouterAlert);
  out.append(message);
  return out.bytes();
}

}  // namespace

std::vector<std::uint8_t> encode(Query const &query, Querier const &from) {
  bool const is_ipv4 = from.source.family == Family::ipv4;
  auto const all = is_ipv4 ? address_of(kAllOfIpv4) : address_of(kAllOfIpv6);
  auto const destination = query.group.value_or(all);
  return is_ipv4 ? ipv4_frame(from, destination, igmp(query))
                 : ipv6_frame(from, destination, mld(query));
}

Address link_local_address(openflow::EthernetAddress const &hardware) {
  auto const &h = hardware;
  return address_of(openflow::Ipv6Address{0xfe, 0x80, 0, 0, 0, 0, 0, 0,
                                          static_cast<std::uint8_t>(h[0] ^ 2U), h[1], h[2], 0xff,
                                          0xfe, h[3], h[4], h[5]});
}

}  // namespace simhost::multicast
