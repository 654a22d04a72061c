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

// What nothing passes gets no copies either.
std::set<openflow::Port> closed_ones(Network const &network) {
  std::set<openflow::Port> closed;
  for (auto const &port : network.ports) {
    if (is_closed(port)) {
      closed.insert(port.port);
    }
  }
  for (auto const &uplink : network.uplinks) {
    if (uplink.blocked) {
      closed.insert(uplink.port);
    }
  }
  return closed;
}

Actions outputs(Mirror const &mirror, std::vector<openflow::Port> const &ports,
                std::set<openflow::Port> const &closed) {
  Actions actions;
  for (auto const port : ports) {
    if (!closed.contains(port)) {
      actions.push_back(output(mirror, port));
    }
  }
  return actions;
}

Actions without_tag(Mirror const & /*mirror*/, Actions const &output) {
  return output;
}
Actions with_own_tag(Mirror const & /*mirror*/, Actions const &output) {
  return with_tag(field::kVlan, output);
}
Actions with_remote_tag(Mirror const &mirror, Actions const &output) {
  if (mirror.remote_vlan == 0) {
    return output;
  }
  Actions actions{openflow::PushVlan{},
                  openflow::set(Field::vlan_vid, openflow::kVlanPresent | mirror.remote_vlan)};
  append(actions, output).emplace_back(openflow::PopVlan{});
  return actions;
}
Actions with_both_tags(Mirror const &mirror, Actions const &output) {
  return with_own_tag(mirror, with_remote_tag(mirror, output));
}

// How a copy is tagged.
using Tagged = Actions(Mirror const &, Actions const &);

// A frame is cut as it is when the tags that it had elsewhere are really gone, and before it has
// those of the copy: at the beginning of a clone.
Actions copies_to(Mirror const &mirror, Actions const &outputs, Tagged *tagged) {
  if (mirror.most_bytes == 0) {
    return outputs.empty() ? Actions{} : tagged(mirror, outputs);
  }
  Actions actions;
  for (auto const &output : outputs) {
    actions.emplace_back(openflow::Clone{tagged(mirror, {output})});
  }
  return actions;
}

void copy_out(Program &program, Mirror const &mirror, std::set<openflow::Port> const &closed) {
  auto const to_ports = outputs(mirror, mirror.to_ports, closed);
  auto const to_uplinks = outputs(mirror, mirror.to_uplinks, closed);
  auto add = [&](std::uint16_t priority, Match const &match, Tagged *at_ports, Tagged *on_wires) {
    auto actions = copies_to(mirror, to_ports, at_ports);
    append(actions, copies_to(mirror, to_uplinks, on_wires));
    program.add(table::kMirrors, {.priority = priority,
                                  .match = Match(match).with(field::kSession, mirror.id),
                                  .actions = std::move(actions),
                                  .cookie = cookie(Counted::mirrored, mirror.id)});
  };
  if (mirror.keeps_vlan) {
    add(100, Match(), with_own_tag, with_both_tags);
    if (mirror.remote_vlan != 0 && !to_uplinks.empty()) {
      // A third tag would take the place of the last one.
      add(150, Match().tagged(), with_own_tag, with_remote_tag);
    }
    add(200, Match().with(field::kVlan, 0), without_tag, with_remote_tag);
  } else {
    add(100, Match(), without_tag, with_remote_tag);
  }
}

}  // namespace

void compile_mirrors(Plan const &plan, Program &program) {
  Actions mirroring;
  if (!plan.network.mirrors.empty()) {
    mirroring = {go_to(table::kMirrorsOfPorts), go_to(table::kMirrorsOfVlans)};
  }
  mirroring.push_back(go_to(table::kRemembering));
  program.add(table::kMirroring, {.actions = mirroring});
  copy_by_port(plan, program);
  copy_by_vlan(plan, program);
  auto const closed = closed_ones(plan.network);
  for (auto const &mirror : plan.network.mirrors) {
    copy_out(program, mirror, closed);
  }
}

}  // namespace simhost::openvswitch
