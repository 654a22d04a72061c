// Replies and events, read from the payloads of messages. All throw Malformed.
#pragma once

#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/openflow/replies.h"

namespace simhost::openflow {

ErrorReply take_error(Reader &in, Xid xid);
PacketIn take_packet_in(Reader &in);
FlowRemoved take_flow_removed(Reader &in);
PortStatus take_port_status(Reader &in);

/// What a part of a multipart reply begins with.
struct MultipartHeader {
  MultipartType type;
  bool has_more;  // parts after this one
};
MultipartHeader take_multipart_header(Reader &in);

// The next item of a part; of an aggregate the only one.

FlowEntry take_flow(Reader &in);
Aggregate take_aggregate(Reader &in);
PortStatistics take_port_statistics(Reader &in);
PortDescription take_port_description(Reader &in);
GroupEntry take_group(Reader &in);
GroupStatistics take_group_statistics(Reader &in);
/// Its number.
std::uint32_t take_meter(Reader &in);
FlowUpdate take_flow_update(Reader &in);

}  // namespace simhost::openflow
