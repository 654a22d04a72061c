// To a port, to a list of ports, to the uplinks.
#include <algorithm>
#include <iterator>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/stages/groups.h"
#include "planes/openvswitch/compile/stages/port_lists.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

class Dispatch {
 public:
  Dispatch(Common const &common, Program &program) : common_(common), program_(program) {
    if (common.any_promiscuous) {
      promiscuous_ = to_list(List::promiscuous);
    }
    if (common.has_uplinks) {
      to_uplinks_ = {go_to(table::kTeams)};
    }
  }

  void compile(Plan const &plan) {
    compile_groups(plan);
    to_ports_and_uplinks(200, to_many(Match()), to_list(List::all));
    to_ports_and_uplinks(150, Match().with(field::kDestination, kBeyond), promiscuous_);
    to_ports_and_uplinks(150, Match().with(field::kDestination, 0), to_list(List::unknown));
    if (plan.network.is_mesh()) {
      auto const beyond_tunnels = openflow::ones(16) ^ openflow::ones(kTunnelBits);
      to_ports_and_uplinks(150, Match().with(field::kDestination, kFirstTunnel, beyond_tunnels),
                           promiscuous_);
    }
    // To a port of another way.
    add(50, Match().with(field::kOrigin, kFromUplink), promiscuous_);
    add(10, Match(), deliver());
  }

  void compile(PortPlan const &plan) {
    auto const &port = plan.port;
    if (port.transmits_by_uplink && sends_frames(port)) {
      send_out(port);
    }
    auto const to_it = Match().with(field::kDestination, port.port);
    if (port.promiscuous) {
      // It is on the list, and gets one copy.
      add(180, to_it, promiscuous_);
    } else if (auto const way = plan.among_others.way) {
      add(100, Match(to_it).with(field::kOrigin, kFromUplink).with(field::kWay, *way), deliver());
    }
    if (hears() && sends_frames(port)) {
      send_up(port);
    }
  }

 private:
  [[nodiscard]] bool hears() const { return common_.hears_igmp || common_.hears_mld; }
  void compile_groups(Plan const &plan) {
    auto const to_groups = to_piece(table::kGroups, 0);
    if (plan.filters_by_address()) {
      to_ports_and_uplinks(210, to_many(Match()), to_groups);
    }
    for (auto const family : {multicast::Family::ipv4, multicast::Family::ipv6}) {
      if (plan.network.multicast.hears(family)) {
        to_ports_and_uplinks(210, group_frames(family), to_groups);
      }
    }
    for (auto const &message : heard_messages()) {
      hear(message, to_groups);
    }
    if (hears()) {
      program_.add(table::kHearing, {.priority = 100, .match = questions(Match())});
    }
  }
  [[nodiscard]] std::vector<Match> heard_messages() const {
    std::vector<Match> messages;
    for (auto const &[family, is_heard] : {std::pair(multicast::Family::ipv4, common_.hears_igmp),
                                           std::pair(multicast::Family::ipv6, common_.hears_mld)}) {
      if (is_heard) {
        std::ranges::move(group_messages(family), std::back_inserter(messages));
      }
    }
    return messages;
  }
  // Of members that are this switch's. Last: what is over a meter's rate goes no further.
  void hear(Match const &message, Actions const &to_groups) {
    Actions const heard{go_to(table::kHearing)};
    auto actions = to_groups;
    append(append(actions, to_uplinks_), heard);
    add(250, Match(message).with(field::kOrigin, kFromClient), actions);
  }
  void send_out(Port const &port) {
    add(300, from(port.port), to_uplinks_);
    auto out = to_uplinks_;
    out.push_back(go_to(table::kHearing));
    for (auto const &message : heard_messages()) {
      add(350, Match(message).with(openflow::Field::in_port, port.port), out);
    }
  }
  // Each client by a meter of its own, so that none who says too much keeps others from being
  // heard.
  void send_up(Port const &port) {
    program_.add(table::kHearing,
                 {.match = from(port.port),
                  .actions = {openflow::ToMeter{port.port}, openflow::ToController{}}});
  }
  // The uplinks have their own frames already.
  void to_ports_and_uplinks(std::uint16_t priority, Match const &match, Actions const &ports) {
    auto from_clients = ports;
    add(priority, Match(match).with(field::kOrigin, kFromClient),
        append(from_clients, to_uplinks_));
    add(priority, Match(match).with(field::kOrigin, kFromUplink), ports);
  }
  [[nodiscard]] Actions deliver() const {
    // The destination is asked for again where the next way begins.
    Actions actions{openflow::Move{.source = openflow::whole(field::kDestination),
                                   .destination = openflow::whole(field::kReceiver)},
                    go_to(table::kDelivery)};
    return append(actions, promiscuous_);
  }
  void add(std::uint16_t priority, Match match, Actions actions) {
    program_.add(table::kDispatch,
                 {.priority = priority, .match = std::move(match), .actions = std::move(actions)});
  }

  Common const &common_;
  Program &program_;
  Actions promiscuous_;
  Actions to_uplinks_;
};

}  // namespace

void compile_dispatch(Plan const &plan, Program &program) {
  Dispatch(plan.common, program).compile(plan);
}

void compile_dispatch(PortPlan const &plan, Program &program) {
  Dispatch(plan.common, program).compile(plan);
}

}  // namespace simhost::openvswitch
