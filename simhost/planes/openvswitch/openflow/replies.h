// What a switch tells of itself, asked or by itself.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <variant>
#include <vector>

#include "planes/openvswitch/openflow/error.h"
#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

struct Traffic {
  std::uint64_t packets = 0;
  std::uint64_t bytes = 0;

  friend auto operator<=>(Traffic const &, Traffic const &) = default;
};

/// A flow as far as the values here can say it.
struct ReadFlow {
  Flow flow;
  /// What of it they cannot, in words; whoever made such a flow, it was not this host.
  std::string foreign;
  /// Of such a flow: whether the match is whole, and only actions are missing.
  bool has_match = true;
};

struct FlowEntry : ReadFlow {
  Traffic traffic;
  std::chrono::nanoseconds age{};
  /// Since a frame asked for it, or since it is there; frames of the last half a second may be
  /// missing.
  std::chrono::nanoseconds unused{};
};

/// Of all flows together.
struct Aggregate {
  Traffic traffic;
  std::uint32_t flows = 0;

  friend bool operator==(Aggregate const &, Aggregate const &) = default;
};

struct GroupEntry {
  Group group;
  std::string foreign;  // as ReadFlow
};

struct GroupStatistics {
  GroupId group = 0;
  std::uint32_t references = 0;  // by flows
  Traffic traffic;
  std::chrono::nanoseconds age{};
  std::vector<Traffic> buckets;
};

/// Counters that the port does not have are all ones.
struct PortStatistics {
  Port port = 0;
  std::chrono::nanoseconds age{};
  Traffic received;
  Traffic sent;
  std::uint64_t received_dropped = 0;
  std::uint64_t sent_dropped = 0;
  std::uint64_t received_errors = 0;
  std::uint64_t sent_errors = 0;
};

struct PortDescription {
  Port port = 0;
  EthernetAddress address{};
  std::string name;
  bool is_down = false;  // by its settings
  bool has_no_link = false;
  bool is_live = false;  // for groups that watch it
};

/// A frame that a flow sent to the controller.
struct PacketIn {
  enum class Reason : std::uint8_t { no_match, action, ttl, action_set, group, packet_out };

  std::uint64_t cookie = 0;  // of the flow
  std::uint8_t table = 0;
  Reason reason{};
  Match metadata;                 // in_port, registers; what has no value here is left out
  std::uint16_t frame_bytes = 0;  // before it was cut
  std::vector<std::uint8_t> frame;
};

/// A flow that has Flow::tells_removal.
struct FlowRemoved : ReadFlow {
  enum class Reason : std::uint8_t { idle, hard, removed, group, meter, eviction };

  Reason reason{};
  Traffic traffic;
  std::chrono::nanoseconds age{};
};

struct PortStatus {
  enum class Reason : std::uint8_t { added, removed, modified };

  Reason reason{};
  PortDescription port;
};

/// What a flow monitor saw.
struct FlowUpdate : ReadFlow {
  enum class Event : std::uint16_t {
    initial,  // it was there already
    added,
    removed,
    modified,
    own,     // a change by this connection, of which it says no more
    paused,  // there are too many to tell; what follows is not all, until
    resumed,
  };

  Event event{};
  FlowRemoved::Reason reason{};  // of a removal
};

/// What flows counted together, those of one filter after the other, and ports by themselves.
struct Sums {
  std::vector<Aggregate> flows;
  std::vector<PortStatistics> ports;
};

/// What a switch has, and what it counted.
struct Contents {
  std::vector<FlowUpdate> monitored;  ///< what monitors begin with
  std::vector<FlowEntry> flows;
  std::size_t flow_count = 0;  ///< of all, though they may not be told
  std::vector<GroupEntry> groups;
  std::vector<PortDescription> ports;
  std::vector<PortStatistics> port_statistics;
};

/// Somebody else changed groups or meters; how, is to be asked.
struct GroupsOrMetersChanged {};

/// What a switch sends by itself. An ErrorReply is of a message that nobody waits for a reply to.
using Event =
    std::variant<PacketIn, FlowRemoved, PortStatus, FlowUpdate, GroupsOrMetersChanged, ErrorReply>;

}  // namespace simhost::openflow
