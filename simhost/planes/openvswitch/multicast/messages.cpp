// The layers of a frame one after the other, each within what the one before says is its own.
#include "planes/openvswitch/multicast/messages.h"

#include <arpa/inet.h>

#include <cstring>
#include <exception>
#include <utility>

#include "planes/openvswitch/multicast/checksum.h"
#include "planes/openvswitch/multicast/floating_code.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "qexapi/ethernet.h"
#include "qexapi/ip.h"
#include "qexapi/multicast.h"

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;
using openflow::BytesView;
using openflow::Reader;

constexpr unsigned kMostTags = 2;

// Of routers that speak version 1 of IGMP, and do not say it.
constexpr auto kUsualResponse = 10s;
// How many of its intervals a router is silent for that is gone.
constexpr unsigned kSilentIntervals = 3;

constexpr unsigned kPimVersion = 2;
constexpr unsigned kPimHello = 0;
constexpr std::uint16_t kPimHoldtime = 1;
constexpr auto kUsualHoldtime = 105s;

constexpr std::uint8_t kPad1 = 0;
constexpr std::uint8_t kRouterAlert = 5;

// What is no message, although no length of it is wrong.
class NoMessage : public std::exception {};

void require(bool holds) {
  if (!holds) {
    throw NoMessage();
  }
}

template <typename Record>
Record take(Reader &in) {
  Record record;
  std::memcpy(&record, in.take(sizeof record).data(), sizeof record);
  return record;
}

// Likewise, which stays to be read.
template <typename Record>
Record peek(Reader in) {
  return take<Record>(in);
}

template <typename Bytes, typename Field>
Address address_in(Field const &field) {
  Bytes bytes;
  static_assert(sizeof field == sizeof bytes);
  std::memcpy(bytes.data(), &field, sizeof field);
  return address_of(bytes);
}
Address ipv4_in(qex_IPv4Address const &field) {
  return address_in<openflow::Ipv4Address>(field);
}
Address ipv6_in(qex_IPv6Address const &field) {
  return address_in<openflow::Ipv6Address>(field);
}

Address take_address(Reader &in, Family family) {
  if (family == Family::ipv4) {
    return ipv4_in(take<qex_IPv4Address>(in));
  }
  Address address{.family = Family::ipv6};
  auto const bytes = in.take(address.bytes.size());
  std::memcpy(address.bytes.data(), bytes.data(), bytes.size());
  return address;
}

std::vector<Address> take_sources(Reader &in, Family family, std::size_t count) {
  std::vector<Address> sources;
  while (sources.size() < count) {
    sources.push_back(take_address(in, family));
  }
  return sources;
}

// A packet to groups, and what is in it.
struct Packet {
  Address source;
  Address destination;
  std::uint8_t protocol = 0;
  bool is_from_neighbour = false;  // no router has passed it on
  bool alerts_routers = false;
  BytesView payload;
};

Packet take_ipv4(Reader &in) {
  constexpr std::size_t kUnit = 4;
  auto const whole = in.rest();
  auto const header = take<qex_IPv4Hdr>(in);
  std::size_t const header_bytes = header.headerLength * kUnit;
  std::size_t const bytes = ntohs(header.totalLength);
  bool const is_fragment =
      header.moreFragments != 0 || header.fragmentOffsetHigh != 0 || header.fragmentOffsetLow != 0;
  require(header.version == 4 && header_bytes >= sizeof header && header_bytes <= bytes &&
          bytes <= whole.size() && !is_fragment);
  require(Checksum().add(whole.first(header_bytes)).value() == 0);
  return {.source = ipv4_in(header.saddr),
          .destination = ipv4_in(header.daddr),
          .protocol = header.protocol,
          .is_from_neighbour = header.ttl == 1,
          .payload = whole.subspan(header_bytes, bytes - header_bytes)};
}

// Of the options that are for everyone on the way.
bool has_router_alert(Reader options) {
  while (!options.empty()) {
    auto const type = options.u8();
    if (type == kRouterAlert) {
      return true;
    }
    if (type != kPad1) {
      options.skip(options.u8());
    }
  }
  return false;
}

Packet take_ipv6(Reader &in) {
  constexpr std::size_t kUnit = 8;
  auto const header = take<qex_IPv6Hdr>(in);
  require(header.version == 6);
  Reader payload(in.take(ntohs(header.payloadLength)));
  Packet packet{.source = ipv6_in(header.saddr),
                .destination = ipv6_in(header.daddr),
                .protocol = header.nextHeader,
                .is_from_neighbour = header.hopLimit == 1,
                .payload = {}};
  if (packet.protocol == QEX_IP_PROTO_IPV6_HOPOPT) {
    packet.protocol = payload.u8();
    std::size_t const bytes = (payload.u8() + std::size_t{1}) * kUnit;
    packet.alerts_routers = has_router_alert(Reader(payload.take(bytes - 2)));
  }
  packet.payload = payload.rest();
  return packet;
}

void require_checksum(Packet const &packet) {
  Checksum sum;
  // IGMP is one of IPv4's own, and PIM counts nothing in but over IPv6.
  if (packet.source.family == Family::ipv6) {
    sum.add_header(packet.source, packet.destination, packet.protocol, packet.payload.size());
  }
  require(sum.add(packet.payload).value() == 0);
}

// The records of both protocols have one form.
Report take_records(Reader &in, Family family, unsigned version, std::size_t count) {
  constexpr std::size_t kUnit = 4;
  Report report{.version = version, .records = {}};
  for (; count > 0; --count) {
    auto const type = in.u8();
    std::size_t const more = in.u8() * kUnit;
    auto const sources = in.u16();
    auto const group = take_address(in, family);
    auto const listed = take_sources(in, family, sources);
    in.skip(more);
    // Those of a kind that is not known say nothing.
    if (is_group(group) && type >= 1 && type <= static_cast<std::uint8_t>(RecordType::block)) {
      report.records.push_back(
          {.type = static_cast<RecordType>(type), .group = group, .sources = listed});
    }
  }
  return report;
}

std::optional<Address> group_asked_for(Address const &group) {
  require(is_unspecified(group) || is_group(group));
  return is_unspecified(group) ? std::nullopt : std::optional(group);
}

// What routers say of themselves since version 3 of IGMP and version 2 of MLD.
template <typename Header>
void read_routers_habits(Header const &header, Query &query) {
  query.robustness = header.qrv;
  query.interval = std::chrono::seconds(FloatingCode<8>::decoded(header.qqic));
}

Query take_igmp_query(Reader in) {
  auto const bytes = in.size();
  auto const old = peek<qex_IGMPHdr>(in);
  Query query{.version = old.maxResponseTime == 0 ? 1U : 2U,
              .group = group_asked_for(ipv4_in(old.groupAddr)),
              .response = old.maxResponseTime * kResponseUnit};
  if (query.version == 1) {
    query.response = kUsualResponse;
  }
  if (bytes > sizeof old) {
    auto const header = take<qex_IGMPv3QueryHdr>(in);
    query.version = 3;
    query.response = FloatingCode<8>::decoded(header.maxResponseCode) * kResponseUnit;
    query.sources = take_sources(in, Family::ipv4, ntohs(header.numSources));
    read_routers_habits(header, query);
  }
  return query;
}

Query take_mld_query(Reader in) {
  auto const bytes = in.size();
  auto const old = peek<qex_MLDHdr>(in);
  Query query{.version = 1,
              .group = group_asked_for(ipv6_in(old.groupIPv6Addr)),
              .response = std::chrono::milliseconds(ntohs(old.maxResponseTime))};
  if (bytes > sizeof old) {
    auto const header = take<qex_MLDv2QueryHdr>(in);
    query.version = 2;
    query.response =
        std::chrono::milliseconds(FloatingCode<16>::decoded(ntohs(header.maxResponseCode)));
    query.sources = take_sources(in, Family::ipv6, ntohs(header.numSources));
    read_routers_habits(header, query);
  }
  return query;
}

Report one_record(unsigned version, RecordType type, Address const &group) {
  require(is_group(group));
  return {.version = version, .records = {{.type = type, .group = group}}};
}

RouterHello advertisement(std::uint8_t interval) {
  return {.hold = std::chrono::seconds(interval) * kSilentIntervals};
}

using Content = decltype(Message::content);

Content take_igmp(Packet const &packet) {
  require_checksum(packet);
  Reader in(packet.payload);
  auto const type = peek<std::uint8_t>(in);
  // It alone is shorter.
  if (type == QEX_IGMP_MRDTERM) {
    require(packet.is_from_neighbour);
    take<qex_ICMPHdr>(in);
    return RouterHello{};
  }
  auto const header = peek<qex_IGMPHdr>(in);
  switch (type) {
    case QEX_IGMP_QUERY:
      return take_igmp_query(in);
    case QEX_IGMP_V1REPORT:
      return one_record(1, RecordType::is_exclude, ipv4_in(header.groupAddr));
    case QEX_IGMP_V2REPORT:
      return one_record(2, RecordType::is_exclude, ipv4_in(header.groupAddr));
    case QEX_IGMP_V2LEAVE:
      return one_record(2, RecordType::to_include, ipv4_in(header.groupAddr));
    case QEX_IGMP_V3REPORT:
      return take_records(in, Family::ipv4, 3, ntohs(take<qex_IGMPv3ReportHdr>(in).numGroups));
    case QEX_IGMP_MRDADV:
      require(packet.is_from_neighbour);
      return advertisement(header.maxResponseTime);
    default:
      throw NoMessage();
  }
}

bool may_report(Address const &source) {
  return is_unspecified(source) || is_link_local(source.bytes);
}

Content take_mld(Packet const &packet) {
  require_checksum(packet);
  require(packet.is_from_neighbour && packet.alerts_routers);
  Reader in(packet.payload);
  auto const icmp = peek<qex_ICMPHdr>(in);
  bool const is_from_router = is_link_local(packet.source.bytes);
  bool const is_from_host = may_report(packet.source);
  switch (icmp.type) {
    case QEX_MLD_QUERY:
      require(is_from_router);
      return take_mld_query(in);
    case QEX_MLD_V1REPORT:
      require(is_from_host);
      return one_record(1, RecordType::is_exclude, ipv6_in(take<qex_MLDHdr>(in).groupIPv6Addr));
    case QEX_MLD_DONE:
      require(is_from_host);
      return one_record(1, RecordType::to_include, ipv6_in(take<qex_MLDHdr>(in).groupIPv6Addr));
    case QEX_MLD_V2REPORT:
      require(is_from_host);
      return take_records(in, Family::ipv6, 2, ntohs(take<qex_MLDv2ReportHdr>(in).numGroups));
    case QEX_MLD_MRDADV:
      require(is_from_router);
      return advertisement(icmp.code);
    case QEX_MLD_MRDTERM:
      require(is_from_router);
      return RouterHello{};
    default:
      throw NoMessage();
  }
}

Content take_pim(Packet const &packet) {
  require_checksum(packet);
  require(packet.is_from_neighbour);
  Reader in(packet.payload);
  auto const header = take<qex_PIMHdr>(in);
  require(header.version == kPimVersion && header.type == kPimHello);
  RouterHello hello{.hold = kUsualHoldtime};
  while (!in.empty()) {
    auto const option = in.u16();
    Reader value(in.take(in.u16()));
    if (option == kPimHoldtime) {
      hello.hold = std::chrono::seconds(value.u16());
    }
  }
  return hello;
}

Packet take_packet(Reader &frame) {
  frame.skip(2 * sizeof(qex_EthAddress));
  auto type = frame.u16();
  for (unsigned tags = 0;
       tags < kMostTags && (type == QEX_ETH_TYPE_VLAN || type == QEX_ETH_TYPE_PROVIDER_BRIDGING);
       ++tags) {
    frame.skip(sizeof(std::uint16_t));
    type = frame.u16();
  }
  require(type == QEX_ETH_TYPE_IPV4 || type == QEX_ETH_TYPE_IPV6);
  return type == QEX_ETH_TYPE_IPV4 ? take_ipv4(frame) : take_ipv6(frame);
}

Content take_content(Packet const &packet) {
  require(is_group(packet.destination));
  bool const is_ipv4 = packet.source.family == Family::ipv4;
  switch (packet.protocol) {
    case QEX_IP_PROTO_IGMP:
      require(is_ipv4);
      return take_igmp(packet);
    case QEX_IP_PROTO_ICMPV6:
      require(!is_ipv4);
      return take_mld(packet);
    case QEX_IP_PROTO_PIM:
      return take_pim(packet);
    default:
      throw NoMessage();
  }
}

}  // namespace

std::optional<Message> decode(std::span<std::uint8_t const> frame) {
  try {
    Reader in(frame);
    auto const packet = take_packet(in);
    return Message{.source = packet.source, .content = take_content(packet)};
  } catch (openflow::Malformed const &) {
    return std::nullopt;
  } catch (NoMessage const &) {
    return std::nullopt;
  }
}

}  // namespace simhost::multicast
