// All stages after one another, and what cannot be compiled.
#include "planes/openvswitch/compile/compile.h"

#include <algorithm>
#include <memory>
#include <set>
#include <string>
#include <utility>

#include "base/outcomes.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

// What is sampled by length has a frame's header at least.
constexpr std::uint16_t kLeastBytes = 14;

[[noreturn]] void refuse(QEX_ReturnStatus status, std::string const &reason) {
  throw Refused(status, reason);
}

void check_ports(Network const &network) {
  std::set<openflow::Port> taken;
  auto const check = [&](openflow::Port port, std::uint32_t number) {
    auto const whose = "port " + std::to_string(number) + ": ";
    if (port == 0 || port > kGreatestPort) {
      refuse(QEX_LIMIT_EXCEEDED, whose + "Open vSwitch has no port " + std::to_string(port));
    }
    if (!taken.insert(port).second) {
      refuse(QEX_BAD_PARAM,
             whose + "another one is port " + std::to_string(port) + " of Open vSwitch");
    }
  };
  for (auto const &uplink : network.uplinks) {
    check(uplink.port, uplink.number);
  }
  for (auto const &port : network.ports) {
    check(port.port, port.number);
  }
}

// Frames that come back over a wire would be taken for those of another host.
void check_mesh(Network const &network) {
  bool const has_wires = std::any_of(network.uplinks.begin(), network.uplinks.end(),
                                     [](Uplink const &uplink) { return !is_tunnel(uplink.port); });
  if (network.is_mesh() && has_wires) {
    refuse(QEX_NOT_SUPPORTED, "beside tunnels, a switch has no uplink with a device");
  }
}

void check_slot(Slot const &slot, Balance balance, std::set<openflow::Port> const &uplinks) {
  bool const all_there = std::all_of(slot.begin(), slot.end(),
                                     [&](openflow::Port port) { return uplinks.contains(port); });
  if (slot.empty() || !all_there) {
    refuse(QEX_BAD_PARAM, "a team uses an uplink that the switch has not");
  }
  if (slot.size() > kMostInSlot && balance != Balance::mesh) {
    refuse(QEX_LIMIT_EXCEEDED, "a team aggregates " + std::to_string(slot.size()) +
                                   " uplinks, more than " + std::to_string(kMostInSlot));
  }
}

void check_teams(Network const &network) {
  std::set<openflow::Port> uplinks;
  for (auto const &uplink : network.uplinks) {
    uplinks.insert(uplink.port);
  }
  for (auto const &team : network.teams) {
    for (auto const *slots : {&team.in_use, &team.standby}) {
      for (auto const &slot : *slots) {
        check_slot(slot, team.balance, uplinks);
      }
    }
  }
  for (auto const &port : network.ports) {
    if (port.team && *port.team >= network.teams.size()) {
      refuse(QEX_BAD_PARAM,
             "port " + std::to_string(port.number) + " uses a team that the switch has not");
    }
  }
}

void check_mirrors(Network const &network) {
  std::set<std::uint32_t> taken;
  for (auto const &mirror : network.mirrors) {
    auto const which = "mirror session " + std::to_string(mirror.id);
    if (mirror.id == 0 || !taken.insert(mirror.id).second) {
      refuse(QEX_BAD_PARAM, which + ": its number is 0 or another one's");
    }
    if (mirror.most_bytes != 0 && mirror.most_bytes < kLeastBytes) {
      refuse(QEX_BAD_PARAM, which + ": fewer than " + std::to_string(kLeastBytes) +
                                " bytes of a frame cannot be mirrored");
    }
  }
}

template <typename OfWhat>
using Stage = void(OfWhat const &, Program &);

constexpr Stage<Plan> *kStages[]{
    compile_admission,  compile_sources, compile_tags,           compile_private_vlans,
    compile_own_frames, compile_mirrors, compile_remote_mirrors, compile_learning,
    compile_adding_up,  compile_lookup,  compile_receiving,      compile_dispatch,
    compile_groups,     compile_lists,   compile_teams,          compile_counting};
constexpr Stage<PortPlan> *kStagesOfPorts[]{compile_admission,  compile_sources,  compile_tags,
                                            compile_own_frames, compile_mirrors,  compile_learning,
                                            compile_lookup,     compile_dispatch, compile_delivery,
                                            compile_teams,      compile_counting};

openflow::FlowPart made_of(PortPlan const &plan) {
  Program program;
  for (auto *const stage : kStagesOfPorts) {
    stage(plan, program);
  }
  return std::make_shared<std::vector<openflow::Flow> const>(program.take_flows());
}

}  // namespace

void check(Network const &network) {
  check_ports(network);
  check_teams(network);
  check_mesh(network);
  check_mirrors(network);
}

openflow::FlowPart const &MadeOfPorts::of(PortPlan const &plan) {
  auto const known = made_.find(plan.port.port);
  if (known != made_.end() && known->second.port == plan.port &&
      known->second.among_others == plan.among_others) {
    return known->second.flows;
  }
  Made made{.port = plan.port, .among_others = plan.among_others, .flows = made_of(plan)};
  return made_.insert_or_assign(plan.port.port, std::move(made)).first->second.flows;
}

std::vector<openflow::FlowPart> MadeOfPorts::of(Plan const &plan) {
  if (common_ != plan.common) {
    made_.clear();
    common_ = plan.common;
  }
  std::vector<openflow::FlowPart> parts;
  parts.reserve(plan.ports().size());
  for (auto const &port : plan.ports()) {
    parts.push_back(of(port));
  }
  if (made_.size() > parts.size()) {
    std::set<openflow::Port> there;
    for (auto const &port : plan.ports()) {
      there.insert(port.port.port);
    }
    std::erase_if(made_, [&](auto const &made) { return !there.contains(made.first); });
  }
  return parts;
}

Compiled compile(Network const &network, MadeOfPorts &before) {
  check(network);
  Plan const plan(network);
  Program program;
  for (auto *const stage : kStages) {
    stage(plan, program);
  }
  Compiled compiled{.rows = {.most_tags = has_use_for_second_tags(network) ? 2U : 1U,
                             .most_learned = network.addresses.limit},
                    .flows = program.take_flows(),
                    .groups = program.take_groups()};
  for (auto &part : before.of(plan)) {
    compiled.flows.add(std::move(part));
  }
  return compiled;
}

Compiled compile(Network const &network) {
  MadeOfPorts nothing;
  return compile(network, nothing);
}

openflow::Flow generation_marker(std::uint64_t generation) {
  openflow::Flow flow;
  flow.table = table::kGeneration;
  flow.priority = 0;
  flow.cookie = generation;
  return flow;
}

}  // namespace simhost::openvswitch
