// Groups are there before the flows that send to them, and go after those.
#include "daemon/bridge/changes.h"

#include <algorithm>

#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {

using openflow::Flow;
using openflow::FlowCommand;
using openflow::Group;
using openflow::GroupCommand;

bool is_marker(openflow::FlowEntry const &entry) {
  return entry.foreign.empty() && entry.flow == openvswitch::generation_marker(entry.flow.cookie);
}

void add_changes(openvswitch::Difference const &difference, openflow::Changes &changes) {
  auto const change_group = [&](GroupCommand command, Group const &group) {
    changes.emplace_back(openflow::GroupChange{.command = command, .group = group});
  };
  auto const change_flow = [&](FlowCommand command, Flow const &flow) {
    changes.emplace_back(openflow::FlowChange{.command = command, .flow = flow});
  };
  for (auto const &[table, cookie] : difference.forgotten) {
    Flow learned;
    learned.table = table;
    learned.cookie = cookie;
    changes.emplace_back(openflow::FlowChange{
        .command = FlowCommand::remove, .flow = learned, .cookie_mask = ~std::uint64_t{0}});
  }
  for (auto const &group : difference.added_groups) {
    change_group(GroupCommand::add, group);
  }
  for (auto const &group : difference.changed_groups) {
    change_group(GroupCommand::modify, group);
  }
  for (auto const &flow : difference.removed_flows) {
    change_flow(FlowCommand::remove_strict, flow);
  }
  for (auto const &flow : difference.added_flows) {
    change_flow(FlowCommand::add, flow);
  }
  for (auto const &flow : difference.changed_flows) {
    change_flow(FlowCommand::modify_strict, flow);
  }
  for (auto const number : difference.removed_groups) {
    change_group(GroupCommand::remove, {.id = number, .buckets = {}});
  }
}

void add_removals(std::vector<Flow> const &flows, openflow::Changes &changes) {
  for (auto const &flow : flows) {
    changes.emplace_back(openflow::FlowChange{.command = FlowCommand::remove_strict, .flow = flow});
  }
}

void add_forgetting(openflow::Changes &changes) {
  for (std::uint8_t number = 0; number <= openvswitch::kLastReached; ++number) {
    if (openvswitch::table::is_learned(number)) {
      Flow all;
      all.table = number;
      changes.emplace_back(openflow::FlowChange{.command = FlowCommand::remove, .flow = all});
    }
  }
}

std::optional<std::uint32_t> meter_of(Flow const &flow) {
  if (flow.actions.empty()) {
    return std::nullopt;
  }
  auto const *const to = std::get_if<openflow::ToMeter>(&flow.actions.front());
  return to == nullptr ? std::nullopt : std::optional(to->meter);
}

bool ends_counting(openvswitch::Difference const &difference) {
  auto const counts = [](Flow const &flow) {
    return std::ranges::find(openvswitch::kCountingTables, flow.table) !=
           openvswitch::kCountingTables.end();
  };
  return std::ranges::any_of(difference.removed_flows, counts) ||
         std::ranges::any_of(difference.added_flows, counts);
}

std::size_t size_of(openvswitch::Difference const &difference) {
  return difference.added_groups.size() + difference.changed_groups.size() +
         difference.removed_groups.size() + difference.added_flows.size() +
         difference.changed_flows.size() + difference.removed_flows.size();
}

}  // namespace simhost::daemon
