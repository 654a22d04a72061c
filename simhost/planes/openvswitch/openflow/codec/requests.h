// Requests, each put as a whole message after what is there already.
#pragma once

#include <optional>

#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/openflow/requests.h"

namespace simhost::openflow {

void put_hello(Writer &out, Xid xid);
void put_echo_reply(Writer &out, Xid xid, BytesView payload);
void put_barrier_request(Writer &out, Xid xid);

// Throw std::invalid_argument for what has no form on the wire, and std::length_error for what is
// too long. What is put by then is no message: none of it is to be sent.

void put_change(Writer &out, Xid xid, Change const &change);
void put_added_flow(Writer &out, Xid xid, Flow const &flow);
void put_packet_out(Writer &out, Xid xid, PacketOut const &packet);

/// Of a bundle that is ordered and atomic.
void put_bundle_control(Writer &out, Xid xid, std::uint32_t bundle, BundleControl control);
/// Throws like put_change.
void put_bundle_add(Writer &out, Xid xid, std::uint32_t bundle, Change const &change);

enum class MeterCommand : std::uint16_t { add = 0, modify = 1 };
/// One that drops what is more than so many frames a second.
void put_meter(Writer &out, Xid xid, MeterCommand command, std::uint32_t meter, std::uint32_t rate);
/// The flows through it go with it.
void put_no_meter(Writer &out, Xid xid, std::uint32_t meter);
/// Which messages the switch sends by itself.
void put_set_async(Writer &out, Xid xid, AsyncMessages const &wanted);

/// `type` is flows or aggregate.
void put_flows_request(Writer &out, Xid xid, MultipartType type, FlowFilter const &filter);
/// `type` is port_statistics or ports.
void put_ports_request(Writer &out, Xid xid, MultipartType type, Port port);
/// `type` is groups or group_statistics.
void put_groups_request(Writer &out, Xid xid, MultipartType type, GroupId group);
/// All of them.
void put_meters_request(Writer &out, Xid xid);
void put_flow_monitor_request(Writer &out, Xid xid, FlowMonitor const &monitor);
void put_flow_monitor_cancel(Writer &out, Xid xid, std::uint32_t monitor);

}  // namespace simhost::openflow
