// Flows as they are counted, and the tags that ports and uplinks get alike.
#include "planes/openvswitch/compile/program.h"

#include <algorithm>

namespace simhost::openvswitch {
namespace {

using openflow::Field;

openflow::Action priority_from_register() {
  return openflow::Move{.source = openflow::part(field::kPriority, 0, 2),
                        .destination = openflow::whole(Field::vlan_pcp)};
}

constexpr openflow::Value kAllReceivers = openflow::ones(48);

}  // namespace

void Program::add(std::uint8_t table, Rule rule) {
  flows_.push_back({.table = table,
                    .priority = rule.priority,
                    .match = std::move(rule.match),
                    .cookie = rule.cookie,
                    .actions = std::move(rule.actions)});
}

std::vector<openflow::Group> Program::take_groups() {
  std::ranges::sort(groups_);
  return std::move(groups_);
}

void add_by_receivers(Program &program, std::uint8_t table, Rule const &rule,
                      ByReceivers const &counted, std::uint32_t number) {
  auto const add = [&](std::uint16_t above, Match match, Counted kind) {
    program.add(table, {.priority = static_cast<std::uint16_t>(rule.priority + above),
                        .match = std::move(match),
                        .actions = rule.actions,
                        .cookie = cookie(kind, number)});
  };
  add(0, rule.match, counted.one);
  add(1, to_many(rule.match), counted.several);
  add(2, Match(rule.match).with(Field::eth_dst, kAllReceivers), counted.all);
}

Actions with_tag(Field vlan, Actions const &output) {
  Actions actions{
      openflow::PushVlan{},
      openflow::Move{.source = vlan_bits(vlan), .destination = openflow::whole(Field::vlan_vid)},
      priority_from_register()};
  append(actions, output).emplace_back(openflow::PopVlan{});
  return actions;
}

Actions with_priority_tag(Actions const &output) {
  Actions actions{openflow::PushVlan{}, openflow::set(Field::vlan_vid, openflow::kVlanPresent),
                  priority_from_register()};
  append(actions, output).emplace_back(openflow::PopVlan{});
  return actions;
}

}  // namespace simhost::openvswitch
