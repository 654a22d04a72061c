// What comes from outside: for the ports of those ways whose frames are to come in at that uplink.
// The network floods a frame to all uplinks of a switch; each way takes the copy of one of them.
#include <cstddef>
#include <cstdint>
#include <optional>
#include <set>
#include <utility>

#include "planes/openvswitch/compile/stages/receiving.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

// The links of a way that an uplink is, or is a part of.
std::set<std::uint32_t> links_at(Way const &way, Uplink const &uplink) {
  std::set<std::uint32_t> links;
  for (std::size_t slot = 0; slot < way.slots.size(); ++slot) {
    if (way.is_at(uplink, slot)) {
      links.insert(way.links[slot]);
    }
  }
  return links;
}

bool elects(Way const &way) {
  return !way.is_single() && way.balance != Balance::addresses && way.balance != Balance::mesh;
}

// The network has a client where it sends from: over the uplink that its address chooses, if its
// way looks at addresses.
bool elects_by_address(Way const &way) {
  return elects(way) && way.balance == Balance::source;
}

// The group that says at which uplink frames are to come in.
std::optional<openflow::GroupId> electing_group(Way const &way, bool has_one_receiver) {
  if (!elects(way)) {
    return std::nullopt;
  }
  bool const is_by_address = has_one_receiver && elects_by_address(way);
  return (is_by_address ? kReceivingByAddress : kReceivingGroups) | way.number;
}

Actions receive(Plan const &plan, Uplink const &uplink, bool has_one_receiver) {
  Actions actions;
  for (auto const &way : plan.ways.all()) {
    append(actions, receive_by(way, uplink, has_one_receiver));
  }
  return actions;
}

void receive_at(Plan const &plan, Program &program, Uplink const &uplink) {
  auto const at = from(uplink.port);
  auto const of_port = cookie(Counted::port, uplink.number);
  auto const to_one = receive(plan, uplink, true);
  auto const to_others = receive(plan, uplink, false);
  auto add = [&](std::uint16_t priority, Match match, Actions const &actions) {
    program.add(
        table::kReceiving,
        {.priority = priority, .match = std::move(match), .actions = actions, .cookie = of_port});
  };
  if (to_one != to_others) {
    add(200, to_many(at), to_others);
    for (auto const nobody_here : {openflow::Port{0}, kBeyond, kNowhere}) {
      add(200, Match(at).with(field::kDestination, nobody_here), to_others);
    }
  }
  add(100, at, to_one);
}

// Buckets in the order of those that send, so that an address has the same one in both.
void elect(Program &program, Way const &way, openflow::Group group) {
  std::uint32_t id = 0;
  for (std::size_t slot = 0; slot < way.slots.size(); ++slot) {
    for (auto const uplink : way.slots[slot]) {
      group.buckets.push_back(
          {.id = id++,
           .watch_port = uplink,
           .actions = {openflow::set(field::kElected, way.links[slot]), go_to(table::kElection)}});
    }
  }
  program.add(std::move(group));
}

void compile_election(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    std::set<std::uint32_t> links;
    for (auto const &way : plan.ways.all()) {
      links.merge(links_at(way, uplink));
    }
    for (auto const link : links) {
      program.add(table::kElection, {.priority = 100,
                                     .match = from(uplink.port).with(field::kElected, link),
                                     .actions = {go_to(table::kDispatch)},
                                     .cookie = cookie(Counted::port, uplink.number)});
    }
  }
}

}  // namespace

Actions receive_by(Way const &way, Uplink const &uplink, bool has_one_receiver) {
  if (links_at(way, uplink).empty()) {
    return {};
  }
  Actions actions{openflow::set(field::kWay, way.number)};
  if (auto const group = electing_group(way, has_one_receiver)) {
    actions.emplace_back(openflow::ToGroup{.group = *group});
  } else {
    actions.push_back(go_to(table::kDispatch));
  }
  return actions;
}

void compile_receiving(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    if (!uplink.blocked) {
      receive_at(plan, program, uplink);
    }
  }
  for (auto const &way : plan.ways.all()) {
    if (elects(way)) {
      elect(program, way,
            {.id = kReceivingGroups | way.number,
             .type = openflow::GroupType::fast_failover,
             .buckets = {}});
    }
    if (elects_by_address(way)) {
      elect(program, way,
            {.id = kReceivingByAddress | way.number,
             .type = openflow::GroupType::select,
             .selection = {.method = "hash",
                           .fields = {{openflow::Field::eth_dst, openflow::ones(48)}}},
             .buckets = {}});
    }
  }
  compile_election(plan, program);
}

}  // namespace simhost::openvswitch
