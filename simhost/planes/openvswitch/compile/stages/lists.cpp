// Lists of ports: all of a VLAN, those for unknown addresses, promiscuous ones; each for what
// clients send, and for what comes over each way. One flow holds no more than so many ports and one
// frame takes no more than 4,096 lookups: so lists are cut into pieces, and a port of which nothing
// is to be looked at when a frame of its VLAN comes is sent to from the list, or is an output in it
// where there are too many to count what each is sent.
#include <algorithm>
#include <cstdint>
#include <map>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/stages/port_lists.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

// In kPiece: the ports that may be in many VLANs, which are on the lists of all; then their pieces.
constexpr std::uint32_t kTrunks = 0x10000;

bool is_on(List list, Port const &port) {
  switch (list) {
    case List::all:
      return true;
    case List::unknown:
      return port.floods || port.is_sink || port.promiscuous;
    case List::promiscuous:
      return port.promiscuous;
    case List::unasked:
      return !port.asked_groups || port.promiscuous;
    default:
      return false;
  }
}

struct Members {
  std::map<std::uint16_t, Ports> by_domain;
  Ports trunks;

  [[nodiscard]] bool empty() const { return by_domain.empty() && trunks.empty(); }
};

class Lists {
 public:
  Lists(Plan const &plan, Program &program) : plan_(plan), program_(program) {}

  void compile(List list, Way const *way) {
    of_list_ = Match()
                   .with(field::kList, static_cast<openflow::Value>(list))
                   .with(field::kWay, way == nullptr ? 0 : way->number);
    auto const members = members_of(list, way);
    for (auto const &[domain, ports] : members.by_domain) {
      compile_domain(domain, ports, !members.trunks.empty());
    }
    if (!members.trunks.empty()) {
      add(50, piece(0), to_piece(table::kLists, kTrunks));
      compile_pieces(kTrunks, of_list_, {}, members.trunks, 100);
    }
  }

 private:
  Members members_of(List list, Way const *way) {
    Members members;
    for (auto const &port : plan_.network.ports) {
      bool const of_way = way == nullptr || plan_.ways.of(port) == way;
      if (!takes_frames(plan_.common, port) || !of_way || !is_on(list, port)) {
        continue;
      }
      auto &ports = port.vlan.carried
                        ? members.trunks
                        : members.by_domain[plan_.common.kind_of(port.vlan.vlan).domain];
      ports.push_back(&port);
    }
    return members;
  }

  void compile_domain(std::uint16_t domain, Ports const &ports, bool with_trunks) {
    auto const after = with_trunks ? to_piece(table::kLists, kTrunks) : Actions{};
    auto const in_domain = Match(of_list_).with(field::kDomain, domain);
    compile_pieces(0, in_domain, after, ports, 100);
    if (domain == 0) {
      return;
    }
    // With a second tag, only to those that may have one.
    Ports nested;
    std::copy_if(ports.begin(), ports.end(), std::back_inserter(nested),
                 [](Port const *port) { return port->vlan.nested; });
    if (nested.size() != ports.size()) {
      auto second = in_domain;
      compile_pieces(0, second.tagged(), after, nested, 150);
    }
  }

  void compile_pieces(std::uint32_t first, Match const &match, Actions const &after,
                      Ports const &ports, std::uint16_t priority) {
    add_ports(plan_, program_,
              {.table = table::kLists, .priority = priority, .match = match, .first_piece = first},
              ports, after);
  }
  [[nodiscard]] Match piece(std::uint32_t number) const {
    return Match(of_list_).with(field::kPiece, number);
  }
  void add(std::uint16_t priority, Match match, Actions actions) {
    program_.add(table::kLists,
                 {.priority = priority, .match = std::move(match), .actions = std::move(actions)});
  }

  Plan const &plan_;
  Program &program_;
  Match of_list_;
};

}  // namespace

void compile_lists(Plan const &plan, Program &program) {
  std::vector wanted{List::all, List::unknown, List::promiscuous};
  if (plan.filters_by_address()) {
    wanted.push_back(List::unasked);
  }
  Lists lists(plan, program);
  for (auto const list : wanted) {
    lists.compile(list, nullptr);
    for (auto const &way : plan.ways.all()) {
      lists.compile(list, &way);
    }
  }
}

}  // namespace simhost::openvswitch
