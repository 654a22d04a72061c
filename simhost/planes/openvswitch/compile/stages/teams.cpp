// Over which uplink a port's frames go, and with which tag.
#include <utility>

#include "planes/openvswitch/compile/stages/mirrors.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

void compile_mesh(Plan const &plan, Program &program) {
  Actions all;
  for (auto const &uplink : plan.network.uplinks) {
    program.add(table::kMesh, {.priority = 100,
                               .match = Match().with(field::kDestination, uplink.port),
                               .actions = over(uplink.port),
                               .cookie = cookie(Counted::port, uplink.number)});
    append(all, over(uplink.port));
  }
  program.add(table::kMesh, {.actions = all});
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
  auto const copied = copies(plan.network.mirrors, &Mirror::sent, &MirrorSources::uplinks,
                             uplink.port, Copied::leaving);
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
  for (auto const &group : plan.outlets.groups) {
    program.add(group);
  }
  if (plan.network.is_mesh()) {
    compile_mesh(plan, program);
  }
  for (auto const &uplink : plan.network.uplinks) {
    compile_wire(plan, program, uplink);
  }
}

void compile_teams(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  if (plan.among_others.way && sends_frames(port)) {
    program.add(table::kTeams, {.priority = 100,
                                .match = from(port.port),
                                .actions = plan.among_others.out,
                                .cookie = cookie(Counted::port, port.number)});
  }
}

}  // namespace simhost::openvswitch
