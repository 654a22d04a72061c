// Mirror sessions: those of the port and of the VLAN that a frame comes in at, and where the copies
// go.
#include "planes/openvswitch/compile/stages/mirrors.h"

#include <set>
#include <utility>
#include <variant>

#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

void add_if_any(Program &program, std::uint8_t where, Match match, Actions actions) {
  if (!actions.empty()) {
    program.add(where, {.priority = 100, .match = std::move(match), .actions = std::move(actions)});
  }
}

void copy_by_uplink(Network const &network, Program &program) {
  for (auto const &uplink : network.uplinks) {
    add_if_any(program, table::kMirrorsOfPorts, from(uplink.port),
               copies(network.mirrors, &Mirror::received, &MirrorSources::uplinks, uplink.port,
                      Copied::coming));
  }
}

void copy_by_vlan(Network const &network, Program &program) {
  std::set<std::uint16_t> vlans;
  for (auto const &mirror : network.mirrors) {
    vlans.insert(mirror.sent.vlans.begin(), mirror.sent.vlans.end());
    vlans.insert(mirror.received.vlans.begin(), mirror.received.vlans.end());
  }
  for (auto const vlan : vlans) {
    auto const in_vlan = Match().with(field::kVlan, vlan);
    add_if_any(program, table::kMirrorsOfVlans, Match(in_vlan).with(field::kOrigin, kFromClient),
               copies(network.mirrors, &Mirror::sent, &MirrorSources::vlans, vlan, Copied::coming));
    add_if_any(
        program, table::kMirrorsOfVlans, Match(in_vlan).with(field::kOrigin, kFromUplink),
        copies(network.mirrors, &Mirror::received, &MirrorSources::vlans, vlan, Copied::coming));
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

// What a port that wraps frames takes of each of them, beside its bytes.
Actions wrapping(Mirror const &mirror, Collector const &collector, Copied where) {
  bool const is_ipv6 = std::holds_alternative<openflow::Ipv6Address>(collector.address);
  auto const address =
      std::visit([](auto const &bytes) { return openflow::to_value(bytes); }, collector.address);
  Actions actions{openflow::set(is_ipv6 ? Field::tun_ipv6_dst : Field::tun_dst, address),
                  openflow::set(Field::tun_id, mirror.key)};
  if (mirror.wrapping == Wrapping::erspan2) {
    actions.emplace_back(openflow::set(Field::tun_erspan_ver, 1));
  } else if (mirror.wrapping == Wrapping::erspan3) {
    actions.emplace_back(openflow::set(Field::tun_erspan_ver, 2));
    actions.emplace_back(openflow::set(Field::tun_erspan_dir, where == Copied::leaving ? 1 : 0));
  }
  return actions;
}

// On a copy of the frame: what wraps it is none of the frame's for those who get it next.
Actions copies_to_collectors(Mirror const &mirror, Copied where, Tagged *tagged) {
  auto const port = mirror.wrapping == Wrapping::gre ? kGrePort : kErspanPort;
  Actions actions;
  for (auto const &collector : mirror.collectors) {
    if (collector.is_reached) {
      auto copy = wrapping(mirror, collector, where);
      append(copy, tagged(mirror, {output(mirror, port)}));
      actions.emplace_back(openflow::Clone{std::move(copy)});
    }
  }
  return actions;
}

class Copies {
 public:
  Copies(Program &program, Mirror const &mirror, std::set<openflow::Port> const &closed)
      : program_(program),
        mirror_(mirror),
        to_ports_(outputs(mirror, mirror.to_ports, closed)),
        to_uplinks_(outputs(mirror, mirror.to_uplinks, closed)) {}

  void compile() {
    if (!tells_direction(mirror_)) {
      compile(Match(), Copied::coming);
      return;
    }
    for (auto const where : {Copied::coming, Copied::leaving}) {
      compile(with_bits(Match(), field::kLeaves, where == Copied::leaving ? 1 : 0), where);
    }
  }

 private:
  void compile(Match const &match, Copied where) {
    if (!mirror_.keeps_vlan) {
      add(100, match, where, {without_tag, with_remote_tag});
      return;
    }
    add(100, match, where, {with_own_tag, with_both_tags});
    if (mirror_.remote_vlan != 0 && !to_uplinks_.empty()) {
      // A third tag would take the place of the last one.
      add(150, Match(match).tagged(), where, {with_own_tag, with_remote_tag});
    }
    add(200, Match(match).with(field::kVlan, 0), where, {without_tag, with_remote_tag});
  }

  struct Tags {
    Tagged *of_others;
    Tagged *on_wires;
  };
  void add(std::uint16_t priority, Match match, Copied where, Tags const &tags) {
    auto actions = copies_to(mirror_, to_ports_, tags.of_others);
    append(actions, copies_to(mirror_, to_uplinks_, tags.on_wires));
    append(actions, copies_to_collectors(mirror_, where, tags.of_others));
    program_.add(table::kMirrors, {.priority = priority,
                                   .match = match.with(field::kSession, mirror_.id),
                                   .actions = std::move(actions),
                                   .cookie = cookie(Counted::mirrored, mirror_.id)});
  }

  Program &program_;
  Mirror const &mirror_;
  Actions to_ports_;
  Actions to_uplinks_;
};

}  // namespace

void compile_mirrors(Plan const &plan, Program &program) {
  Actions mirroring;
  if (!plan.network.mirrors.empty()) {
    mirroring = {go_to(table::kMirrorsOfPorts), go_to(table::kMirrorsOfVlans)};
  }
  mirroring.push_back(go_to(table::kRemembering));
  program.add(table::kMirroring, {.actions = mirroring});
  copy_by_uplink(plan.network, program);
  copy_by_vlan(plan.network, program);
  auto const closed = closed_ones(plan.network);
  for (auto const &mirror : plan.network.mirrors) {
    Copies(program, mirror, closed).compile();
  }
}

void compile_mirrors(PortPlan const &plan, Program &program) {
  auto const port = plan.port.port;
  add_if_any(
      program, table::kMirrorsOfPorts, from(port),
      copies(plan.common.mirrors, &Mirror::sent, &MirrorSources::ports, port, Copied::coming));
}

}  // namespace simhost::openvswitch
