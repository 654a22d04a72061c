// What cannot be said is made to differ from everything.
#include "planes/openvswitch/reconcile/present.h"

#include <algorithm>
#include <set>

namespace simhost::openvswitch {
namespace {

using openflow::Flow;
using openflow::FlowEntry;
using openflow::Group;
using openflow::GroupEntry;

// No flow that is wanted has a note.
Flow flow_of(FlowEntry const &entry) {
  auto flow = entry.flow;
  if (!entry.foreign.empty()) {
    flow.actions = {openflow::Note{}};
  }
  return flow;
}

// And no group that is wanted is without buckets.
Group group_of(GroupEntry const &entry) {
  auto group = entry.group;
  if (!entry.foreign.empty()) {
    group.buckets.clear();
  }
  return group;
}

}  // namespace

Present present_of(std::span<FlowEntry const> flows, std::span<GroupEntry const> groups) {
  Present present;
  std::set<LearnedFlows> unplaced;
  for (auto const &entry : flows) {
    if (!entry.has_match) {
      unplaced.insert(cookie_of(entry.flow));
    }
  }
  for (auto const &entry : flows) {
    if (!unplaced.contains(cookie_of(entry.flow))) {
      present.flows.push_back(flow_of(entry));
    }
  }
  std::ranges::transform(groups, std::back_inserter(present.groups), group_of);
  std::ranges::sort(present.groups);
  present.unplaced.assign(unplaced.begin(), unplaced.end());
  return present;
}

}  // namespace simhost::openvswitch
