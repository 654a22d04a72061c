// What clients send as messages of multicast: any frame is read or is none, what is read is within
// what there is, and queries are put and read again as they were. Checksums are put right, for few
// inputs would come past them.

#include <optional>
#include <string>
#include <variant>

#include "planes/openvswitch/multicast/checksum.h"
#include "planes/openvswitch/multicast/membership.h"
#include "planes/openvswitch/multicast/messages.h"
#include "planes/openvswitch/multicast/queries.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "tests/fuzz/harness.h"

namespace {

using namespace simhost::multicast;
using namespace std::chrono_literals;
using simhost::openflow::Bytes;
using simhost::openflow::Writer;

void put_sum(Bytes &bytes, std::size_t at, Checksum const &sum) {
  bytes[at] = static_cast<std::uint8_t>(sum.value() >> 8U);
  bytes[at + 1] = static_cast<std::uint8_t>(sum.value());
}

Bytes ipv4(Input &input, Bytes payload, std::uint8_t protocol) {
  if (payload.size() >= 4) {
    payload[2] = payload[3] = 0;
    put_sum(payload, 2, Checksum().add(payload));
  }
  Writer out;
  out.u16(0x4600);
  out.u16(static_cast<std::uint16_t>(24 + payload.size()));
  out.u32(0);
  out.u8(1);
  out.u8(protocol);
  out.u16(0);
  out.u32(input.ConsumeIntegral<std::uint32_t>());
  out.u32(0xe0000016);
  out.u32(0x94040000);
  auto header = out.bytes();
  put_sum(header, 10, Checksum().add(header));
  header.insert(header.end(), payload.begin(), payload.end());
  return header;
}

Bytes ipv6(Input &input, Bytes payload, std::uint8_t protocol) {
  Address source{.family = Family::ipv6, .bytes = {0xfe, 0x80}};
  source.bytes[15] = input.ConsumeIntegral<std::uint8_t>();
  Address const to{.family = Family::ipv6, .bytes = {0xff, 2}};
  if (payload.size() >= 4) {
    payload[2] = payload[3] = 0;
    put_sum(payload, 2, Checksum().add_header(source, to, protocol, payload.size()).add(payload));
  }
  auto const options = input.ConsumeBytes<std::uint8_t>(6);
  Writer out;
  out.u32(0x60000000);
  out.u16(static_cast<std::uint16_t>(8 + payload.size()));
  out.u16(0x0001);
  out.append(source.bytes);
  out.append(to.bytes);
  out.u8(protocol);
  out.u8(0);
  out.append(options);
  out.zeros(6 - options.size());
  out.append(payload);
  return out.bytes();
}

Bytes frame_of(Input &input) {
  bool const is_ipv4 = input.ConsumeBool();
  bool const is_pim = input.ConsumeIntegralInRange(0, 7) == 0;
  Writer out;
  out.zeros(12);
  out.u16(is_ipv4 ? 0x0800 : 0x86dd);
  auto const protocol = static_cast<std::uint8_t>(is_pim ? 103 : is_ipv4 ? 2 : 58);
  auto const payload = input.ConsumeBytes<std::uint8_t>(
      input.ConsumeIntegralInRange<std::size_t>(0, input.remaining_bytes()));
  out.append(is_ipv4 ? ipv4(input, payload, protocol) : ipv6(input, payload, protocol));
  return out.bytes();
}

std::optional<Message> decoded(Bytes const &frame) {
  // With nothing of anybody's after it.
  auto const block = Block::of(frame);
  return decode({block.as<std::uint8_t>(), block.size()});
}

void check_query(Query query, Address const &source) {
  // An older version has no number for what a later one says, and zero is the first version's.
  query.response = std::max<std::chrono::milliseconds>(query.response, 100ms);
  auto const first = decode(encode(query, {.hardware = {2}, .source = source}));
  require(first.has_value(), "a query that is put is read");
  auto const &read = std::get<Query>(first->content);
  require(read.group == query.group && read.sources == query.sources, "it asks for the same");
  auto const again = decode(encode(read, {.hardware = {2}, .source = source}));
  require(again && std::get<Query>(again->content) == read, "it is read again as it was");
}

void check(Message const &message, Membership &membership, Time now) {
  if (auto const *query = std::get_if<Query>(&message.content)) {
    check_query(*query, message.source);
  } else if (auto const *report = std::get_if<Report>(&message.content)) {
    for (auto const &record : report->records) {
      require(is_group(record.group), "what is joined is a group");
    }
  }
  membership.receive({.port = 1, .vlan = 7}, message, now);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  static_cast<void>(decoded({data, data + size}));
  Membership membership;
  Time now = 0s;
  membership.set_options({.igmp = {.is_heard = true, .version = 3, .most_sources = 4},
                          .mld = {.is_heard = true, .version = 2, .most_sources = 4}},
                         now);
  membership.set_places({{.port = 1, .vlan = 7}}, now);
  Input input(data, size);
  while (input.remaining_bytes() > 0) {
    if (auto const message = decoded(frame_of(input))) {
      check(*message, membership, now);
    }
    now += std::chrono::milliseconds(input.ConsumeIntegral<std::uint16_t>());
    for (auto const &asked : membership.advance(now)) {
      require(asked.place == Place{.port = 1, .vlan = 7}, "who is there is asked");
    }
    require(membership.next() > now, "what is due is done");
    for (auto const &group : membership.groups().groups) {
      require(!group.members.empty(), "a group has members");
      for (auto const &member : group.members) {
        require(member.sources.listed.size() <= 4, "no more sources than there may be");
      }
    }
  }
  return 0;
}
