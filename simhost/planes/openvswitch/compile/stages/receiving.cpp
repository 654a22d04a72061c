// What comes from outside: for the ports of those ways whose frames are to come in at that uplink.
// The network floods a frame to all uplinks of a switch; each way takes the copy of one of them.
#include <algorithm>
#include <cstdint>
#include <utility>

#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

bool uses(Way const &way, openflow::Port uplink) {
  return std::any_of(way.slots.begin(), way.slots.end(), [&](Slot const &slot) {
    return std::find(slot.begin(), slot.end(), uplink) != slot.end();
  });
}

// Whether a group has to say at which uplink frames are to come in.
bool elects(Way const &way, bool may_be_a_copy) {
  if (way.is_single() || way.balance == Balance::addresses) {
    return false;
  }
  return way.balance == Balance::first || may_be_a_copy;
}

Actions receive(Plan const &plan, Uplink const &uplink, bool may_be_a_copy) {
  Actions actions;
  for (auto const &way : plan.ways.all()) {
    if (!uses(way, uplink.port)) {
      continue;
    }
    actions.emplace_back(openflow::set(field::kWay, way.number));
    if (elects(way, may_be_a_copy)) {
      actions.emplace_back(openflow::ToGroup{.group = kReceivingGroups | way.number});
    } else {
      actions.push_back(go_to(table::kDispatch));
    }
  }
  return actions;
}

void receive_at(Plan const &plan, Program &program, Uplink const &uplink) {
  auto const at = from(uplink.port);
  auto const of_port = cookie(Counted::port, uplink.number);
  auto const known = receive(plan, uplink, false);
  auto const copied = receive(plan, uplink, true);
  auto add = [&](std::uint16_t priority, Match match, Actions const &actions) {
    program.add(
        table::kReceiving,
        {.priority = priority, .match = std::move(match), .actions = actions, .cookie = of_port});
  };
  if (known != copied) {
    add(200, to_many(at), copied);
    // The network may not know it either.
    for (auto const nobody_here : {openflow::Port{0}, kBeyond, kNowhere}) {
      add(200, Match(at).with(field::kDestination, nobody_here), copied);
    }
  }
  add(100, at, known);
}

void elect(Program &program, Way const &way) {
  openflow::Group group{.id = kReceivingGroups | way.number,
                        .type = openflow::GroupType::fast_failover,
                        .buckets = {}};
  std::uint32_t id = 0;
  for (auto const &slot : way.slots) {
    for (auto const uplink : slot) {
      group.buckets.push_back(
          {.id = id++,
           .watch_port = uplink,
           .actions = {openflow::set(field::kElected, name_of(slot)), go_to(table::kElection)}});
    }
  }
  program.groups.push_back(std::move(group));
}

void compile_election(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    std::vector<openflow::Port> names;
    for (auto const &way : plan.ways.all()) {
      for (auto const &slot : way.slots) {
        bool const has_it = std::find(slot.begin(), slot.end(), uplink.port) != slot.end();
        if (has_it && std::find(names.begin(), names.end(), name_of(slot)) == names.end()) {
          names.push_back(name_of(slot));
        }
      }
    }
    for (auto const name : names) {
      program.add(table::kElection, {.priority = 100,
                                     .match = from(uplink.port).with(field::kElected, name),
                                     .actions = {go_to(table::kDispatch)},
                                     .cookie = cookie(Counted::port, uplink.number)});
    }
  }
}

}  // namespace

void compile_receiving(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    if (!uplink.blocked) {
      receive_at(plan, program, uplink);
    }
  }
  for (auto const &way : plan.ways.all()) {
    if (elects(way, true)) {
      elect(program, way);
    }
  }
  compile_election(plan, program);
}

}  // namespace simhost::openvswitch
