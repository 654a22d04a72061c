// What a switch is told to change of its flows and groups.
#pragma once

#include <compare>
#include <cstdint>
#include <string>
#include <variant>
#include <vector>

#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openflow {

inline constexpr std::uint8_t kAllTables = 0xff;

enum class FlowCommand : std::uint8_t {
  add = 0,            // another flow at its place goes, and with it the counters
  modify = 1,         // the actions of all flows that match at least so much; counters stay
  modify_strict = 2,  // of the flow at this place
  remove = 3,         // all flows that match at least so much; kAllTables is for all tables
  remove_strict = 4,  // the flow at this place
};

struct FlowChange {
  FlowCommand command = FlowCommand::add;
  Flow flow{};
  // Which bits of the cookie flows must have to be modified or removed.
  std::uint64_t cookie_mask = 0;

  friend auto operator<=>(FlowChange const &, FlowChange const &) = default;
};

enum class GroupCommand : std::uint8_t {
  add = 0,
  modify = 1,
  remove = 2,  // with all flows that lead to it; kAllGroups is for all
};

struct GroupChange {
  GroupCommand command = GroupCommand::add;
  Group group{};

  friend auto operator<=>(GroupChange const &, GroupChange const &) = default;
};

using Change = std::variant<FlowChange, GroupChange>;
using Changes = std::vector<Change>;

/// "add flow table=3, priority=1 actions=drop"
std::string to_text(Change const &change);

}  // namespace simhost::openflow
