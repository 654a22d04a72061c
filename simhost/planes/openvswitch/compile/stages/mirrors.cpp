// Mirror sessions: those of the port and of the VLAN that a frame comes in at, and where the copies
// go.
#include "planes/openvswitch/compile/stages/mirrors.h"

#include <set>
#include <utility>

#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

void add_if_any(Program &program, std::uint8_t where, Match match, Actions actions) {
  if (!actions.empty()) {
    program.add(where, {.priority = 100, .match = std::move(match), .actions = std::move(actions)});
  }
}

void copy_by_port(Plan const &plan, Program &program) {
  for (auto const &port : plan.network.ports) {
    add_if_any(program, table::kMirrorsOfPorts, from(port.port),
               copies(plan, &Mirror::sent, &MirrorSources::ports, port.port));
  }
  for (auto const &uplink : plan.network.uplinks) {
    add_if_any(program, table::kMirrorsOfPorts, from(uplink.port),
               copies(plan, &Mirror::received, &MirrorSources::uplinks, uplink.port));
  }
}

void copy_by_vlan(Plan const &plan, Program &program) {
  std::set<std::uint16_t> vlans;
  for (auto const &mirror : plan.network.mirrors) {
    vlans.insert(mirror.sent.vlans.begin(), mirror.sent.vlans.end());
    vlans.insert(mirror.received.vlans.begin(), mirror.received.vlans.end());
  }
  for (auto const vlan : vlans) {
    auto const in_vlan = Match().with(field::kVlan, vlan);
    add_if_any(program, table::kMirrorsOfVlans, Match(in_vlan).with(field::kOrigin, kFromClient),
               copies(plan, &Mirror::sent, &MirrorSources::vlans, vlan));
    add_if_any(program, table::kMirrorsOfVlans, Match(in_vlan).with(field::kOrigin, kFromUplink),
               copies(plan, &Mirror::received, &MirrorSources::vlans, vlan));
  }
}

openflow::Action output(Mirror const &mirror, openflow::Port port) {
  if (mirror.most_bytes != 0) {
    return openflow::OutputTruncated{.port = port, .most_bytes = mirror.most_bytes};
  }
  return openflow::Output{.port = port};
}

Actions outputs(Mirror const &mirror, std::vector<openflow::Port> const &ports) {
  Actions actions;
  for (auto const port : ports) {
    actions.push_back(output(mirror, port));
  }
  return actions;
}

Actions to_uplinks(Mirror const &mirror) {
  if (mirror.to_uplinks.empty()) {
    return {};
  }
  Actions actions{openflow::PushVlan{},
                  openflow::set(Field::vlan_vid, openflow::kVlanPresent | mirror.remote_vlan)};
  append(actions, outputs(mirror, mirror.to_uplinks)).emplace_back(openflow::PopVlan{});
  return actions;
}

void copy_out(Program &program, Mirror const &mirror) {
  auto const counted = cookie(Counted::mirrored, mirror.id);
  auto const of_session = Match().with(field::kSession, mirror.id);
  auto const remote = to_uplinks(mirror);
  auto plain = outputs(mirror, mirror.to_ports);
  if (mirror.keeps_vlan && !plain.empty()) {
    auto tagged = with_tag(field::kVlan, plain);
    program.add(table::kMirrors, {.priority = 100,
                                  .match = of_session,
                                  .actions = append(tagged, remote),
                                  .cookie = counted});
    program.add(table::kMirrors, {.priority = 200,
                                  .match = Match(of_session).with(field::kVlan, 0),
                                  .actions = append(plain, remote),
                                  .cookie = counted});
  } else {
    program.add(table::kMirrors, {.priority = 100,
                                  .match = of_session,
                                  .actions = append(plain, remote),
                                  .cookie = counted});
  }
}

}  // namespace

void compile_mirrors(Plan const &plan, Program &program) {
  Actions mirroring;
  if (!plan.network.mirrors.empty()) {
    mirroring = {go_to(table::kMirrorsOfPorts), go_to(table::kMirrorsOfVlans)};
  }
  mirroring.push_back(go_to(table::kLearning));
  program.add(table::kMirroring, {.actions = mirroring});
  copy_by_port(plan, program);
  copy_by_vlan(plan, program);
  for (auto const &mirror : plan.network.mirrors) {
    copy_out(program, mirror);
  }
}

}  // namespace simhost::openvswitch
