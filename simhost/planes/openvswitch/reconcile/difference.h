// What is to be told to a switch so that it has the flows and groups that are wanted of it, and
// what nobody wants changed stays with its counters.
#pragma once

#include <compare>
#include <cstdint>
#include <span>
#include <vector>

#include "planes/openvswitch/openflow/flows/flow_parts.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openvswitch {

/// All flows of a table that a cookie knows.
struct LearnedFlows {
  std::uint8_t table;
  std::uint64_t cookie;

  friend auto operator<=>(LearnedFlows const &, LearnedFlows const &) = default;
};

/// What a flow with that action learns.
inline LearnedFlows taught_by(openflow::Learn const &learn) {
  return {.table = learn.table, .cookie = learn.cookie};
}
/// What knows a flow, if it was learned.
inline LearnedFlows cookie_of(openflow::Flow const &flow) {
  return {.table = flow.table, .cookie = flow.cookie};
}

/// To be done in the order of the members, all of it or nothing.
struct Difference {
  /// What was learned by flows that teach otherwise now: it would stand in the way of what is to be
  /// learned, or say what is no longer true.
  std::vector<LearnedFlows> forgotten;
  std::vector<openflow::Group> added_groups;
  std::vector<openflow::Group> changed_groups;
  /// At places that have none, or one that is other than by its actions; that one goes.
  std::vector<openflow::Flow> added_flows;
  /// Other actions for flows that stay, with their counters.
  std::vector<openflow::Flow> changed_flows;
  std::vector<openflow::Flow> removed_flows;
  std::vector<openflow::GroupId> removed_groups;

  [[nodiscard]] bool empty() const;
};

/// What the switch learned by a wanted flow that teaches as it did stays: see Teachers. Groups are
/// in their order, and no two have one number.
Difference difference(openflow::FlowParts const &present_flows,
                      std::span<openflow::Group const> present_groups,
                      openflow::FlowParts const &wanted_flows,
                      std::span<openflow::Group const> wanted_groups);

}  // namespace simhost::openvswitch
