#include "planes/openvswitch/compile/stages/port_lists.h"

#include <algorithm>

namespace simhost::openvswitch {
namespace {

// An action takes 16 bytes, a port two of them at most, and a flow has 65,535 bytes.
constexpr std::size_t kMostPorts = 1000;

Actions to_ports(Plan const &plan, bool has_any_vlan, Ports::const_iterator from,
                 Ports::const_iterator to) {
  Actions actions;
  for (; from != to; ++from) {
    auto const &port = **from;
    if (has_any_vlan || plan.is_looked_at(port)) {
      append(actions, {openflow::set(field::kReceiver, port.port), go_to(table::kDelivery)});
    } else if (plan.counts_sent(port)) {
      append(actions, send_to(port.port));
    } else {
      actions.emplace_back(openflow::Output{.port = port.port});
    }
  }
  return actions;
}

}  // namespace

Actions to_piece(std::uint8_t table, std::uint32_t number) {
  return {openflow::set(field::kPiece, number), go_to(table)};
}

Actions to_list(List list) {
  Actions actions{openflow::set(field::kList, static_cast<openflow::Value>(list))};
  return append(actions, to_piece(table::kLists, 0));
}

void add_ports(Plan const &plan, Program &program, ListPlace const &place, Ports const &ports,
               Actions const &after) {
  auto const add = [&](std::uint32_t piece, Actions const &actions) {
    program.add(place.table, {.priority = place.priority,
                              .match = Match(place.match).with(field::kPiece, piece),
                              .actions = actions});
  };
  Actions actions;
  if (ports.size() <= kMostPorts) {
    actions = to_ports(plan, place.has_any_vlan, ports.begin(), ports.end());
  } else {
    auto number = place.first_piece;
    for (auto at = ports.begin(); at != ports.end();) {
      auto const end = at + std::min<std::ptrdiff_t>(kMostPorts, ports.end() - at);
      append(actions, to_piece(place.table, ++number));
      add(number, to_ports(plan, place.has_any_vlan, at, end));
      at = end;
    }
  }
  add(place.first_piece, append(actions, after));
}

}  // namespace simhost::openvswitch
