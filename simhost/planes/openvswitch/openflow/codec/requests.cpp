#include "planes/openvswitch/openflow/codec/requests.h"

#include "planes/openvswitch/openflow/codec/actions.h"
#include "planes/openvswitch/openflow/codec/groups.h"
#include "planes/openvswitch/openflow/codec/numbers.h"
#include "planes/openvswitch/openflow/codec/oxm.h"

namespace simhost::openflow {
namespace {

constexpr std::uint32_t kNoBuffer = 0xffffffff;
constexpr std::uint32_t kAllBuckets = 0xffffffff;
constexpr std::uint16_t kAtomic = 1;
constexpr std::uint16_t kOrdered = 2;
constexpr std::uint8_t kAddMonitor = 0;
constexpr std::uint8_t kRemoveMonitor = 2;
constexpr std::uint16_t kMonitorPresent = 0x1;
// What is added, removed and modified, with instructions.
constexpr std::uint16_t kMonitorChanges = 0x1e;
// Changes of the connection's own are not cut short.
constexpr std::uint16_t kMonitorOwn = 0x40;

template <typename Payload>
void put_message(Writer &out, MessageType type, Xid xid, Payload const &payload) {
  auto const start = out.size();
  out.u8(kVersion);
  out.u8(static_cast<std::uint8_t>(type));
  out.u16(0);
  out.u32(xid);
  payload();
  out.put_length(start + 2, start);
}

template <typename Payload>
void put_multipart(Writer &out, MultipartType type, Xid xid, Payload const &payload) {
  put_message(out, MessageType::multipart_request, xid, [&] {
    out.u16(static_cast<std::uint16_t>(type));
    out.zeros(6);
    payload();
  });
}

void put_meter_head(Writer &out, std::uint16_t command, std::uint32_t meter) {
  constexpr std::uint16_t kPacketsWithBurst = 0x2 | 0x4;
  out.u16(command);
  out.u16(kPacketsWithBurst);
  out.u32(meter);
}

void put_instructions(Writer &out, Actions const &actions) {
  if (actions.empty()) {
    return;
  }
  auto const start = out.size();
  out.u16(kApplyActions);
  out.u16(0);
  out.zeros(4);
  put_actions(out, actions);
  out.put_length(start + 2, start);
}

void put_flow_mod(Writer &out, Xid xid, FlowCommand command, Flow const &flow,
                  std::uint64_t cookie_mask) {
  put_message(out, MessageType::flow_mod, xid, [&] {
    out.u64(flow.cookie);
    out.u64(cookie_mask);
    out.u8(flow.table);
    out.u8(static_cast<std::uint8_t>(command));
    out.u16(flow.idle_timeout);
    out.u16(flow.hard_timeout);
    out.u16(flow.priority);
    out.u32(kNoBuffer);
    out.u32(kAnyPort);
    out.u32(kAnyGroup);
    out.u16(flow.tells_removal ? kSendFlowRemoved : 0);
    out.zeros(2);
    put_match(out, flow.match);
    put_instructions(out, flow.actions);
  });
}

class ChangePut {
 public:
  ChangePut(Writer &out, Xid xid) : out_(out), xid_(xid) {}

  void operator()(FlowChange const &change) const {
    put_flow_mod(out_, xid_, change.command, change.flow, change.cookie_mask);
  }

  void operator()(GroupChange const &change) const {
    put_message(out_, MessageType::group_mod, xid_, [&] {
      out_.u16(static_cast<std::uint16_t>(change.command));
      out_.u8(static_cast<std::uint8_t>(change.group.type));
      out_.zeros(1);
      out_.u32(change.group.id);
      auto const length = out_.size();
      out_.zeros(4);
      out_.u32(kAllBuckets);
      if (change.command != GroupCommand::remove) {
        auto const buckets = out_.size();
        put_buckets(out_, change.group);
        out_.put_length(length, buckets);
        put_selection(out_, change.group.selection);
      }
    });
  }

 private:
  Writer &out_;
  Xid xid_;
};

void put_monitor(Writer &out, Xid xid, std::uint32_t monitor, std::uint8_t command,
                 std::uint16_t flags, FlowFilter const &filter) {
  put_multipart(out, MultipartType::flow_monitor, xid, [&] {
    out.u32(monitor);
    out.u32(kAnyPort);
    out.u32(kAnyGroup);
    out.u16(flags);
    out.u8(filter.table);
    out.u8(command);
    put_match(out, filter.match);
  });
}

}  // namespace

void put_hello(Writer &out, Xid xid) {
  constexpr std::uint16_t kVersionBitmap = 1;
  put_message(out, MessageType::hello, xid, [&] {
    out.u16(kVersionBitmap);
    out.u16(8);
    out.u32(1U << kVersion);
  });
}

void put_echo_reply(Writer &out, Xid xid, BytesView payload) {
  put_message(out, MessageType::echo_reply, xid, [&] { out.append(payload); });
}

void put_barrier_request(Writer &out, Xid xid) {
  put_message(out, MessageType::barrier_request, xid, [] {});
}

void put_change(Writer &out, Xid xid, Change const &change) {
  std::visit(ChangePut(out, xid), change);
}

void put_added_flow(Writer &out, Xid xid, Flow const &flow) {
  put_flow_mod(out, xid, FlowCommand::add, flow, 0);
}

void put_packet_out(Writer &out, Xid xid, PacketOut const &packet) {
  put_message(out, MessageType::packet_out, xid, [&] {
    out.u32(kNoBuffer);
    auto const length = out.size();
    out.zeros(4);
    put_match(out, Match().with(Field::in_port, packet.in_port));
    auto const actions = out.size();
    put_actions(out, packet.actions);
    out.put_length(length, actions);
    out.append(packet.frame);
  });
}

void put_bundle_control(Writer &out, Xid xid, std::uint32_t bundle, BundleControl control) {
  put_message(out, MessageType::bundle_control, xid, [&] {
    out.u32(bundle);
    out.u16(static_cast<std::uint16_t>(control));
    out.u16(kAtomic | kOrdered);
  });
}

void put_bundle_add(Writer &out, Xid xid, std::uint32_t bundle, Change const &change) {
  put_message(out, MessageType::bundle_add, xid, [&] {
    out.u32(bundle);
    out.zeros(2);
    out.u16(kAtomic | kOrdered);
    put_change(out, xid, change);
  });
}

void put_no_meter(Writer &out, Xid xid, std::uint32_t meter) {
  constexpr std::uint16_t kRemove = 2;
  put_message(out, MessageType::meter_mod, xid, [&] { put_meter_head(out, kRemove, meter); });
}

void put_meter(Writer &out, Xid xid, MeterCommand command, std::uint32_t meter,
               std::uint32_t rate) {
  constexpr std::uint16_t kDropBand = 1;
  constexpr std::uint16_t kBandBytes = 16;
  put_message(out, MessageType::meter_mod, xid, [&] {
    put_meter_head(out, static_cast<std::uint16_t>(command), meter);
    out.u16(kDropBand);
    out.u16(kBandBytes);
    out.u32(rate);
    out.u32(rate);
    out.zeros(4);
  });
}

void put_set_async(Writer &out, Xid xid, AsyncMessages const &wanted) {
  // Each kind twice, the second for a controller that is no slave.
  constexpr std::uint16_t kPacketIn = 0;
  constexpr std::uint16_t kPortStatus = 2;
  constexpr std::uint16_t kFlowRemoved = 4;
  constexpr std::uint16_t kRequestForward = 10;
  constexpr std::uint32_t kAllReasons = 0x3f;
  put_message(out, MessageType::set_async, xid, [&] {
    auto const put = [&](std::uint16_t type, std::uint32_t reasons) {
      out.u16(type);
      out.u16(8);
      out.u32(reasons);
    };
    put(kPacketIn + 1, wanted.packet_in ? kAllReasons : 0);
    put(kPortStatus + 1, wanted.port_status ? 0x7 : 0);
    put(kFlowRemoved + 1, wanted.flow_removed ? kAllReasons : 0);
    put(kRequestForward + 1, wanted.group_and_meter_changes ? 0x3 : 0);
  });
}

void put_flows_request(Writer &out, Xid xid, MultipartType type, FlowFilter const &filter) {
  put_multipart(out, type, xid, [&] {
    out.u8(filter.table);
    out.zeros(3);
    out.u32(kAnyPort);
    out.u32(kAnyGroup);
    out.zeros(4);
    out.u64(filter.cookie);
    out.u64(filter.cookie_mask);
    put_match(out, filter.match);
  });
}

void put_ports_request(Writer &out, Xid xid, MultipartType type, Port port) {
  put_multipart(out, type, xid, [&] {
    out.u32(port);
    out.zeros(4);
  });
}

void put_groups_request(Writer &out, Xid xid, MultipartType type, GroupId group) {
  put_multipart(out, type, xid, [&] {
    out.u32(group);
    out.zeros(4);
  });
}

void put_meters_request(Writer &out, Xid xid) {
  constexpr std::uint32_t kAllMeters = 0xffffffff;
  put_multipart(out, MultipartType::meters, xid, [&] {
    out.u32(kAllMeters);
    out.zeros(4);
  });
}

void put_flow_monitor_request(Writer &out, Xid xid, FlowMonitor const &monitor) {
  auto const flags = kMonitorChanges |
                     (monitor.present == PresentFlows::told ? kMonitorPresent : 0U) |
                     (monitor.own == OwnChanges::told ? kMonitorOwn : 0U);
  put_monitor(out, xid, monitor.number, kAddMonitor, static_cast<std::uint16_t>(flags),
              monitor.filter);
}

void put_flow_monitor_cancel(Writer &out, Xid xid, std::uint32_t monitor) {
  put_monitor(out, xid, monitor, kRemoveMonitor, 0, {});
}

}  // namespace simhost::openflow
