// An entry of a flow table.
#pragma once

#include <compare>
#include <cstdint>
#include <tuple>

#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/match.h"

namespace simhost::openflow {

/// Flows are ordered by place: table, priority, match.
struct Flow {
  std::uint8_t table = 0;
  std::uint16_t priority = 0x8000;
  Match match{};
  std::uint64_t cookie = 0;
  std::uint16_t idle_timeout = 0;  // seconds, 0 for never
  std::uint16_t hard_timeout = 0;
  bool tells_removal = false;  // the switch sends a FlowRemoved when the flow goes
  Actions actions{};           // none: the frame is dropped

  friend auto operator<=>(Flow const &, Flow const &) = default;
};

/// What no two flows of a switch have in common.
inline auto place(Flow const &flow) {
  return std::tie(flow.table, flow.priority, flow.match);
}

/// What else there is to a flow but its place and its actions.
inline auto settings(Flow const &flow) {
  return std::tie(flow.cookie, flow.idle_timeout, flow.hard_timeout, flow.tells_removal);
}

}  // namespace simhost::openflow
