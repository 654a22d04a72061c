// Messages as a whole: what begins each, and the numbers that say what it is.
#pragma once

#include <cstdint>

#include "planes/openvswitch/openflow/codec/wire.h"

namespace simhost::openflow {

inline constexpr std::uint8_t kVersion = 6;  // OpenFlow 1.5
inline constexpr std::size_t kHeaderSize = 8;

enum class MessageType : std::uint8_t {
  hello = 0,
  error = 1,
  echo_request = 2,
  echo_reply = 3,
  packet_in = 10,
  flow_removed = 11,
  port_status = 12,
  packet_out = 13,
  flow_mod = 14,
  group_mod = 15,
  multipart_request = 18,
  multipart_reply = 19,
  barrier_request = 20,
  barrier_reply = 21,
  set_async = 28,
  meter_mod = 29,
  request_forward = 32,
  bundle_control = 33,
  bundle_add = 34,
};

enum class MultipartType : std::uint16_t {
  flows = 1,
  aggregate = 2,
  port_statistics = 4,
  group_statistics = 6,
  groups = 7,
  meters = 10,
  ports = 13,
  flow_monitor = 16,
};

enum class BundleControl : std::uint16_t {
  open = 0,
  close = 2,
  commit = 4,
  discard = 6,
};

/// What relates a reply to its request.
using Xid = std::uint32_t;

struct Header {
  std::uint8_t version;
  MessageType type;
  std::uint16_t length;  // of the whole message
  Xid xid;
};

inline Header take_header(Reader &in) {
  auto const version = in.u8();
  auto const type = static_cast<MessageType>(in.u8());
  auto const length = in.u16();
  return {version, type, length, in.u32()};
}

}  // namespace simhost::openflow
