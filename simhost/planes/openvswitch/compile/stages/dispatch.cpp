// To a port, to a list of ports, to the uplinks.
#include <algorithm>
#include <utility>

#include "planes/openvswitch/compile/stages/groups.h"
#include "planes/openvswitch/compile/stages/port_lists.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

class Dispatch {
 public:
  Dispatch(Plan const &plan, Program &program) : plan_(plan), program_(program) {
    auto const &ports = plan.network.ports;
    bool const any_promiscuous =
        std::any_of(ports.begin(), ports.end(), [](Port const &port) { return port.promiscuous; });
    if (any_promiscuous) {
      promiscuous_ = to_list(List::promiscuous);
    }
    if (!plan.network.uplinks.empty()) {
      to_uplinks_ = {go_to(table::kTeams)};
    }
  }

  void compile() {
    for (auto const &port : plan_.network.ports) {
      compile_port(port);
    }
    compile_groups();
    to_ports_and_uplinks(200, to_many(Match()), to_list(List::all));
    to_ports_and_uplinks(150, Match().with(field::kDestination, kBeyond), promiscuous_);
    to_ports_and_uplinks(150, Match().with(field::kDestination, 0), to_list(List::unknown));
    if (plan_.network.is_mesh()) {
      auto const beyond_tunnels = openflow::ones(16) ^ openflow::ones(kTunnelBits);
      to_ports_and_uplinks(150, Match().with(field::kDestination, kFirstTunnel, beyond_tunnels),
                           promiscuous_);
    }
    // To a port of another way.
    add(50, Match().with(field::kOrigin, kFromUplink), promiscuous_);
    add(10, Match(), deliver());
  }

 private:
  void compile_port(Port const &port) {
    if (port.transmits_by_uplink && sends_frames(port)) {
      add(300, from(port.port), to_uplinks_);
    }
    auto const to_it = Match().with(field::kDestination, port.port);
    if (port.promiscuous) {
      // It is on the list, and gets one copy.
      add(180, to_it, promiscuous_);
    } else if (auto const *way = plan_.ways.of(port)) {
      add(100, Match(to_it).with(field::kOrigin, kFromUplink).with(field::kWay, way->number),
          deliver());
    }
  }
  void compile_groups() {
    auto const to_groups = to_piece(table::kGroups, 0);
    if (plan_.filters_by_address()) {
      to_ports_and_uplinks(210, to_many(Match()), to_groups);
    }
    for (auto const family : {multicast::Family::ipv4, multicast::Family::ipv6}) {
      if (plan_.network.multicast.hears(family)) {
        to_ports_and_uplinks(210, group_frames(family), to_groups);
        for (auto const &message : group_messages(family)) {
          hear(message, to_groups);
        }
      }
    }
    if (plan_.network.multicast.hears_igmp || plan_.network.multicast.hears_mld) {
      send_up();
    }
  }
  // Of members that are this switch's. Last: what is over a meter's rate goes no further.
  void hear(Match const &message, Actions const &to_groups) {
    Actions const heard{go_to(table::kHearing)};
    auto actions = to_groups;
    append(append(actions, to_uplinks_), heard);
    add(250, Match(message).with(field::kOrigin, kFromClient), actions);
    for (auto const &port : plan_.network.ports) {
      if (port.transmits_by_uplink && sends_frames(port)) {
        auto out = to_uplinks_;
        add(350, Match(message).with(openflow::Field::in_port, port.port), append(out, heard));
      }
    }
  }
  // Each client by a meter of its own, so that none who says too much keeps others from being
  // heard.
  void send_up() {
    program_.add(table::kHearing, {.priority = 100, .match = questions(Match())});
    for (auto const &port : plan_.network.ports) {
      if (sends_frames(port)) {
        program_.add(table::kHearing,
                     {.match = from(port.port),
                      .actions = {openflow::ToMeter{port.port}, openflow::ToController{}}});
      }
    }
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

  Plan const &plan_;
  Program &program_;
  Actions promiscuous_;
  Actions to_uplinks_;
};

}  // namespace

void compile_dispatch(Plan const &plan, Program &program) {
  Dispatch(plan, program).compile();
}

}  // namespace simhost::openvswitch
