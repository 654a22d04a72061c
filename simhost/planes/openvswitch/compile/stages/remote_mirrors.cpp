// Copies of mirror sessions that come in over uplinks, each in the VLAN of its session: for the
// sessions here that take them, and for nobody else. They are no frames of the switch: it learns
// nothing from them, and no session copies them once more.
#include <algorithm>
#include <map>
#include <set>
#include <utility>

#include "planes/openvswitch/compile/stages/mirrors.h"
#include "planes/openvswitch/compile/stages/receiving.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// Also those of what this switch sends: the network may send it back over another uplink.
std::set<std::uint16_t> remote_vlans(Network const &network) {
  std::set<std::uint16_t> vlans;
  for (auto const &mirror : network.mirrors) {
    vlans.insert(mirror.taken_vlans.begin(), mirror.taken_vlans.end());
    if (mirror.remote_vlan != 0 && !mirror.to_uplinks.empty()) {
      vlans.insert(mirror.remote_vlan);
    }
  }
  return vlans;
}

// A session takes what comes in for the first of its ports that any uplink is for; without such a
// port, what comes in for any other.
Way const *way_of(Plan const &plan, Mirror const &mirror) {
  for (auto const to : mirror.to_ports) {
    auto const port = std::ranges::find(plan.network.ports, to, &Port::port);
    auto const *const way = port == plan.network.ports.end() ? nullptr : plan.ways.of(*port);
    if (way != nullptr) {
      return way;
    }
  }
  return plan.ways.all().empty() ? nullptr : &plan.ways.all().front();
}

// The copies that the sessions of a VLAN make, by the way over which they take their frames.
std::map<Way const *, Actions> takers(Plan const &plan, std::uint16_t vlan) {
  std::map<Way const *, Actions> takers;
  for (auto const &mirror : plan.network.mirrors) {
    bool const takes = std::ranges::find(mirror.taken_vlans, vlan) != mirror.taken_vlans.end();
    if (auto const *const way = takes ? way_of(plan, mirror) : nullptr) {
      append_copies(takers[way], mirror, Copied::coming);
    }
  }
  return takers;
}

// What was mirrored fits whatever it came through; with its tags it may be larger than a packet of
// the switch.
void take_off_tag(Program &program, std::uint16_t vlan) {
  program.add(table::kTags,
              {.priority = 20,
               .match = Match().with(field::kOrigin, kFromUplink).vlan(vlan),
               .actions = {openflow::Move{.source = openflow::part(Field::vlan_tci, 13, 15),
                                          .destination = openflow::part(field::kPriority, 0, 2)},
                           openflow::PopVlan{}, openflow::set(field::kVlan, vlan),
                           go_to(table::kRemoteMirrors)}});
}

void compile_vlan(Plan const &plan, Program &program, std::uint16_t vlan) {
  take_off_tag(program, vlan);
  auto taken = takers(plan, vlan);
  for (auto const &uplink : plan.network.uplinks) {
    if (uplink.blocked || taken.empty()) {
      continue;
    }
    Actions receive;
    for (auto const &[way, copies] : taken) {
      append(receive, receive_by(*way, uplink, false));
    }
    add_by_receivers(
        program, table::kRemoteMirrors,
        {.priority = 100, .match = from(uplink.port).with(field::kVlan, vlan), .actions = receive},
        kLetIn, uplink.number);
  }
  for (auto &[way, copies] : taken) {
    // A clone that is the last of all actions is none: the tag that was taken off and the one of
    // the copy would be the same one, which the copy is cut with.
    copies.emplace_back(openflow::set(field::kSession, 0));
    program.add(table::kDispatch, {.priority = 400,
                                   .match = Match()
                                                .with(field::kOrigin, kFromUplink)
                                                .with(field::kVlan, vlan)
                                                .with(field::kWay, way->number),
                                   .actions = copies});
  }
}

}  // namespace

void compile_remote_mirrors(Plan const &plan, Program &program) {
  auto const vlans = remote_vlans(plan.network);
  for (auto const vlan : vlans) {
    compile_vlan(plan, program, vlan);
  }
  if (!vlans.empty()) {
    program.add(table::kRemoteMirrors,
                {.actions = drop(), .cookie = cookie(Counted::unwanted_copy)});
  }
}

}  // namespace simhost::openvswitch
