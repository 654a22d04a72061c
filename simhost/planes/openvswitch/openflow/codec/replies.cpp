#include "planes/openvswitch/openflow/codec/replies.h"

#include <algorithm>

#include "planes/openvswitch/openflow/codec/actions.h"
#include "planes/openvswitch/openflow/codec/foreign.h"
#include "planes/openvswitch/openflow/codec/groups.h"
#include "planes/openvswitch/openflow/codec/numbers.h"
#include "planes/openvswitch/openflow/codec/oxm.h"

namespace simhost::openflow {
namespace {

using std::chrono::nanoseconds;
using std::chrono::seconds;

/// Runs what reads a part of a flow, and keeps in words what there is no value for.
template <typename Read>
bool is_read(std::string &foreign, Read const &read) {
  try {
    read();
    return true;
  } catch (Foreign const &error) {
    foreign = error.what();
    return false;
  }
}

void take_match_of(Reader &in, ReadFlow &read) {
  read.has_match = is_read(read.foreign, [&] { read.flow.match = take_match(in); });
}

void take_instructions(Reader &in, ReadFlow &read) {
  constexpr std::size_t kInstructionHeader = 8;
  while (!in.empty()) {
    auto instruction = take_item(in, 2, kInstructionHeader);
    is_read(read.foreign, [&] {
      if (auto const type = instruction.u16(); type != kApplyActions) {
        throw Foreign("instruction " + std::to_string(type));
      }
      instruction.skip(6);
      read.flow.actions = take_actions(instruction);
    });
  }
}

nanoseconds take_duration(Reader &in) {
  auto const whole = in.u32();
  auto const part = in.u32();
  return seconds(whole) + nanoseconds(part);
}

struct Statistics {
  nanoseconds age{};
  nanoseconds unused{};
  std::uint32_t flows = 0;
  Traffic traffic;
};

Statistics take_statistics(Reader &in) {
  constexpr std::uint16_t kClass = 0x8002;
  enum Kind : std::uint8_t {
    duration = 0,
    idle_time = 1,
    flow_count = 3,
    packet_count = 4,
    byte_count = 5
  };
  Statistics statistics;
  auto list = take_item(in, 2, 4, 8);
  list.skip(4);
  while (!list.empty()) {
    auto const kind_class = list.u16();
    auto const kind = list.u8() >> 1U;
    Reader content(list.take(list.u8()));
    if (kind_class != kClass) {
      continue;
    }
    switch (kind) {
      case duration:
        statistics.age = take_duration(content);
        break;
      case idle_time:
        statistics.unused = take_duration(content);
        break;
      case flow_count:
        statistics.flows = content.u32();
        break;
      case packet_count:
        statistics.traffic.packets = content.u64();
        break;
      case byte_count:
        statistics.traffic.bytes = content.u64();
        break;
      default:
        break;
    }
  }
  return statistics;
}

Traffic take_traffic(Reader &in) {
  auto const packets = in.u64();
  return {packets, in.u64()};
}

PortDescription take_port_of(Reader &item) {
  constexpr std::size_t kNameSize = 16;
  constexpr std::uint32_t kDown = 1;
  constexpr std::uint32_t kNoLink = 1;
  constexpr std::uint32_t kLive = 4;
  PortDescription port;
  port.port = item.u32();
  item.skip(4);
  auto const address = item.take(port.address.size());
  std::copy(address.begin(), address.end(), port.address.begin());
  item.skip(2);
  auto const name = item.take(kNameSize);
  port.name.assign(name.begin(), std::find(name.begin(), name.end(), 0));
  port.is_down = (item.u32() & kDown) != 0;
  auto const state = item.u32();
  port.has_no_link = (state & kNoLink) != 0;
  port.is_live = (state & kLive) != 0;
  return port;
}

}  // namespace

ErrorReply take_error(Reader &in, Xid xid) {
  ErrorReply error;
  error.type = in.u16();
  error.code = in.u16();
  error.xid = xid;
  error.message.assign(in.rest().begin(), in.rest().end());
  return error;
}

PacketIn take_packet_in(Reader &in) {
  PacketIn packet;
  in.skip(4);  // its buffer: there is none
  packet.frame_bytes = in.u16();
  packet.reason = static_cast<PacketIn::Reason>(in.u8());
  packet.table = in.u8();
  packet.cookie = in.u64();
  packet.metadata = take_match(in, Unknown::left_out);
  in.skip(2);
  packet.frame.assign(in.rest().begin(), in.rest().end());
  return packet;
}

FlowRemoved take_flow_removed(Reader &in) {
  FlowRemoved removed;
  auto &flow = removed.flow;
  flow.table = in.u8();
  removed.reason = static_cast<FlowRemoved::Reason>(in.u8());
  flow.priority = in.u16();
  flow.idle_timeout = in.u16();
  flow.hard_timeout = in.u16();
  flow.cookie = in.u64();
  flow.tells_removal = true;
  take_match_of(in, removed);
  auto const statistics = take_statistics(in);
  removed.traffic = statistics.traffic;
  removed.age = statistics.age;
  return removed;
}

PortStatus take_port_status(Reader &in) {
  PortStatus status;
  status.reason = static_cast<PortStatus::Reason>(in.u8());
  in.skip(7);
  status.port = take_port_description(in);
  return status;
}

MultipartHeader take_multipart_header(Reader &in) {
  auto const type = static_cast<MultipartType>(in.u16());
  bool const has_more = (in.u16() & 1U) != 0;
  in.skip(4);
  return {type, has_more};
}

FlowEntry take_flow(Reader &in) {
  constexpr std::size_t kLeast = 24;
  FlowEntry entry;
  auto &flow = entry.flow;
  auto item = take_item(in, 0, kLeast);
  item.skip(4);
  flow.table = item.u8();
  item.skip(1);
  flow.priority = item.u16();
  flow.idle_timeout = item.u16();
  flow.hard_timeout = item.u16();
  flow.tells_removal = (item.u16() & kSendFlowRemoved) != 0;
  item.skip(2);
  flow.cookie = item.u64();
  take_match_of(item, entry);
  auto const statistics = take_statistics(item);
  entry.traffic = statistics.traffic;
  entry.age = statistics.age;
  entry.unused = statistics.unused;
  take_instructions(item, entry);
  return entry;
}

Aggregate take_aggregate(Reader &in) {
  auto const statistics = take_statistics(in);
  return {statistics.traffic, statistics.flows};
}

PortStatistics take_port_statistics(Reader &in) {
  constexpr std::size_t kLeast = 80;
  PortStatistics statistics;
  auto item = take_item(in, 0, kLeast);
  item.skip(4);
  statistics.port = item.u32();
  statistics.age = take_duration(item);
  statistics.received.packets = item.u64();
  statistics.sent.packets = item.u64();
  statistics.received.bytes = item.u64();
  statistics.sent.bytes = item.u64();
  statistics.received_dropped = item.u64();
  statistics.sent_dropped = item.u64();
  statistics.received_errors = item.u64();
  statistics.sent_errors = item.u64();
  return statistics;
}

PortDescription take_port_description(Reader &in) {
  constexpr std::size_t kLeast = 40;
  auto item = take_item(in, 4, kLeast);
  return take_port_of(item);
}

GroupEntry take_group(Reader &in) {
  constexpr std::size_t kLeast = 16;
  GroupEntry entry;
  auto item = take_item(in, 0, kLeast);
  item.skip(2);
  auto const type = item.u8();
  item.skip(1);
  entry.group.id = item.u32();
  auto const buckets_size = item.u16();
  item.skip(6);
  Reader buckets(item.take(buckets_size));
  is_read(entry.foreign, [&] {
    if (type > static_cast<std::uint8_t>(GroupType::fast_failover)) {
      throw Foreign("groups of type " + std::to_string(type));
    }
    entry.group.type = static_cast<GroupType>(type);
    entry.group.buckets = take_buckets(buckets);
    entry.group.selection = take_group_properties(item);
  });
  return entry;
}

std::uint32_t take_meter(Reader &in) {
  constexpr std::size_t kLeast = 8;
  auto item = take_item(in, 0, kLeast);
  item.skip(4);
  return item.u32();
}

GroupStatistics take_group_statistics(Reader &in) {
  constexpr std::size_t kLeast = 40;
  GroupStatistics statistics;
  auto item = take_item(in, 0, kLeast);
  item.skip(4);
  statistics.group = item.u32();
  statistics.references = item.u32();
  item.skip(4);
  statistics.traffic = take_traffic(item);
  statistics.age = take_duration(item);
  while (!item.empty()) {
    statistics.buckets.push_back(take_traffic(item));
  }
  return statistics;
}

FlowUpdate take_flow_update(Reader &in) {
  constexpr std::size_t kLeast = 8;
  FlowUpdate update;
  auto item = take_item(in, 0, kLeast);
  item.skip(2);
  auto const event = item.u16();
  if (event > static_cast<std::uint16_t>(FlowUpdate::Event::resumed)) {
    throw Malformed("the event of a flow monitor is unknown");
  }
  update.event = static_cast<FlowUpdate::Event>(event);
  if (update.event >= FlowUpdate::Event::own) {
    return update;
  }
  auto &flow = update.flow;
  flow.table = item.u8();
  update.reason = static_cast<FlowRemoved::Reason>(item.u8());
  flow.idle_timeout = item.u16();
  flow.hard_timeout = item.u16();
  flow.priority = item.u16();
  item.skip(4);
  flow.cookie = item.u64();
  take_match_of(item, update);
  take_instructions(item, update);
  return update;
}

}  // namespace simhost::openflow
