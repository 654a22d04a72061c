// What a switch may send: any bytes are read or refused, and what is read as a change of flows or
// groups is put and read again as the same.

#include "planes/openvswitch/openflow/codec/groups.h"
#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/replies.h"
#include "planes/openvswitch/openflow/codec/requests.h"
#include "planes/openvswitch/openflow/text.h"
#include "tests/fuzz/harness.h"

namespace {

using namespace simhost::openflow;

Bytes put_flow(Flow const &flow) {
  Writer out;
  put_change(out, 1, FlowChange{FlowCommand::add, flow});
  return out.bytes();
}

Bytes put_group(Group const &group) {
  Writer out;
  put_change(out, 1, GroupChange{GroupCommand::add, group});
  return out.bytes();
}

/// A flow that is put, as the part of a reply that says it: other members, the same match and
/// actions.
FlowEntry read_again(Flow const &flow) {
  constexpr std::size_t kBeforeMatch = 48;
  auto const change = put_flow(flow);
  Reader in(BytesView(change).subspan(kBeforeMatch));
  Writer reply;
  reply.zeros(4);
  reply.u8(flow.table);
  reply.zeros(1);
  reply.u16(flow.priority);
  reply.u16(flow.idle_timeout);
  reply.u16(flow.hard_timeout);
  reply.u16(flow.tells_removal ? 1 : 0);
  reply.zeros(2);
  reply.u64(flow.cookie);
  auto const whole = in.rest();
  take_item(in, 2, 4, 8);
  auto const instructions = in.rest();
  reply.append(whole.first(whole.size() - instructions.size()));
  reply.u32(4);  // statistics of none
  reply.zeros(4);
  reply.append(instructions);
  reply.put_length(0, 0);
  Reader again(reply.bytes());
  return take_flow(again);
}

void check(FlowEntry const &entry) {
  require(!to_text(entry.flow).empty(), "a flow has a text");
  if (!entry.foreign.empty()) {
    return;
  }
  FlowEntry again;
  try {
    again = read_again(entry.flow);
  } catch (std::length_error const &) {
    return;
  } catch (std::invalid_argument const &) {
    return;
  }
  require(again.foreign.empty() && again.flow == entry.flow, "a flow is read again as it was");
}

/// What of a group is put: weights where they count, and how it selects if a method says so.
Group put_part(Group group) {
  if (group.type != GroupType::select) {
    for (auto &bucket : group.buckets) {
      bucket.weight = Bucket().weight;
    }
  }
  if (group.selection.method.empty()) {
    group.selection = {};
  }
  return group;
}

/// A group that is put, as far as a reply has the same form.
Group read_again(Group const &group) {
  constexpr std::size_t kBeforeSize = 16;
  auto const change = put_group(group);
  Reader in(BytesView(change).subspan(kBeforeSize));
  auto const size = in.u16();
  in.skip(6);
  Reader buckets(in.take(size));
  Group again{group.id, group.type, {}, take_buckets(buckets)};
  again.selection = take_group_properties(in);
  return again;
}

void check(GroupEntry const &entry) {
  require(!to_text(entry.group).empty(), "a group has a text");
  if (!entry.foreign.empty()) {
    return;
  }
  Group again;
  try {
    again = read_again(entry.group);
  } catch (std::length_error const &) {
    return;
  } catch (std::invalid_argument const &) {
    return;
  }
  require(again == put_part(entry.group), "a group is read again as it was");
}

template <typename Item>
void check(Item const & /*item*/) {}

template <typename Item>
void read_all(Reader in, Item (*take)(Reader &)) {
  while (!in.empty()) {
    auto const left = in.size();
    check(take(in));
    require(in.size() < left, "each item has bytes");
  }
}

void read_multipart(Reader in) {
  switch (take_multipart_header(in).type) {
    case MultipartType::flows:
      return read_all(in, take_flow);
    case MultipartType::aggregate:
      return read_all(in, take_aggregate);
    case MultipartType::port_statistics:
      return read_all(in, take_port_statistics);
    case MultipartType::group_statistics:
      return read_all(in, take_group_statistics);
    case MultipartType::groups:
      return read_all(in, take_group);
    case MultipartType::meters:
      return read_all(in, take_meter);
    case MultipartType::ports:
      return read_all(in, take_port_description);
    case MultipartType::flow_monitor:
      return read_all(in, take_flow_update);
  }
}

void read_message(Reader in) {
  auto const header = take_header(in);
  switch (header.type) {
    case MessageType::error:
      require(!to_text(take_error(in, header.xid)).empty(), "an error has words");
      return;
    case MessageType::packet_in:
      take_packet_in(in);
      return;
    case MessageType::flow_removed:
      take_flow_removed(in);
      return;
    case MessageType::port_status:
      take_port_status(in);
      return;
    case MessageType::multipart_reply:
      return read_multipart(in);
    default:
      return;
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  try {
    read_message(Reader({data, size}));
  } catch (Malformed const &error) {
    require(*error.what() != '\0', "what is wrong is said");
  }
  return 0;
}
