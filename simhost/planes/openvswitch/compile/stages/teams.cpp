// Over which uplink a port's frames go, and with which tag.
#include <utility>

#include "planes/openvswitch/compile/stages/mirrors.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

Actions over(openflow::Port uplink) {
  return {openflow::set(field::kWire, uplink), go_to(table::kWires)};
}

openflow::Selection selection_of(Way const &way) {
  if (way.balance == Balance::source) {
    return {.method = "hash", .fields = {{Field::eth_src, openflow::ones(48)}}};
  }
  if (way.balance == Balance::addresses) {
    return {.method = "hash",
            .fields = {{Field::ip_src, openflow::ones(32)},
                       {Field::ip_dst, openflow::ones(32)},
                       {Field::ipv6_src, openflow::ones(128)},
                       {Field::ipv6_dst, openflow::ones(128)}}};
  }
  return {};
}

openflow::Group group_of(Way const &way) {
  openflow::Group group{.id = kSendingGroups | way.number,
                        .type = way.spreads_frames() ? openflow::GroupType::select
                                                     : openflow::GroupType::fast_failover,
                        .selection = selection_of(way),
                        .buckets = {}};
  std::uint32_t id = 0;
  for (auto const &slot : way.slots) {
    for (auto const uplink : slot) {
      group.buckets.push_back({.id = id++, .watch_port = uplink, .actions = over(uplink)});
    }
  }
  return group;
}

void compile_wire(Plan const &plan, Program &program, Uplink const &uplink) {
  auto const on_wire = Match().with(field::kWire, uplink.port);
  auto add = [&](std::uint16_t priority, Match const &match, Actions actions) {
    program.add(table::kWires, {.priority = priority,
                                .match = match,
                                .actions = std::move(actions),
                                .cookie = cookie(Counted::port, uplink.number)});
  };
  if (uplink.blocked) {
    add(100, on_wire, {});
    return;
  }
  // Of the frame as it is inside.
  auto const copied = copies(plan, &Mirror::sent, &MirrorSources::uplinks, uplink.port);
  auto send = [&](std::uint16_t priority, Match const &match, Actions const &out) {
    auto actions = copied;
    add(priority, match, append(actions, out));
  };
  auto const out = send_to(uplink.port);
  send(300, Match(on_wire).with(field::kVlan, 0).with(field::kPriority, 0), out);
  send(200, Match(on_wire).with(field::kVlan, 0), with_priority_tag(out));
  send(100, on_wire, with_tag(field::kVlan, out));
}

}  // namespace

void compile_teams(Plan const &plan, Program &program) {
  for (auto const &port : plan.network.ports) {
    auto const *way = plan.ways.of(port);
    if (way == nullptr || !sends_frames(port)) {
      continue;
    }
    auto const send = way->is_single()
                          ? over(way->slots.front().front())
                          : Actions{openflow::ToGroup{.group = kSendingGroups | way->number}};
    program.add(table::kTeams, {.priority = 100,
                                .match = from(port.port),
                                .actions = send,
                                .cookie = cookie(Counted::port, port.number)});
  }
  for (auto const &way : plan.ways.all()) {
    if (!way.is_single()) {
      program.add(group_of(way));
    }
  }
  for (auto const &uplink : plan.network.uplinks) {
    compile_wire(plan, program, uplink);
  }
}

}  // namespace simhost::openvswitch
