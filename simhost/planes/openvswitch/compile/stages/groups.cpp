// Frames of groups: to those who asked for their addresses, or to members as the sources say, to
// routers, and to those who had no time to say what they want.
#include "planes/openvswitch/compile/stages/groups.h"

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <map>
#include <set>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/stages/port_lists.h"
#include "planes/openvswitch/compile/stages/stages.h"
#include "qexapi/protocols.h"

namespace simhost::openvswitch {
namespace {

using multicast::Family;
using openflow::Field;
using openflow::Value;

// What there is of a family: its fields, and its lists.
struct Protocol {
  Family family;
  std::uint16_t type;
  Field source;
  Field destination;
  unsigned address_bits;
  List takers;
  List strangers;
  List routers;
};

constexpr Protocol kIpv4{.family = Family::ipv4,
                         .type = QEX_ETH_TYPE_IPV4,
                         .source = Field::ip_src,
                         .destination = Field::ip_dst,
                         .address_bits = 32,
                         .takers = List::ipv4_takers,
                         .strangers = List::ipv4_strangers,
                         .routers = List::ipv4_routers};
constexpr Protocol kIpv6{.family = Family::ipv6,
                         .type = QEX_ETH_TYPE_IPV6,
                         .source = Field::ipv6_src,
                         .destination = Field::ipv6_dst,
                         .address_bits = 128,
                         .takers = List::ipv6_takers,
                         .strangers = List::ipv6_strangers,
                         .routers = List::ipv6_routers};

Protocol const &protocol_of(Family family) {
  return family == Family::ipv4 ? kIpv4 : kIpv6;
}

Value to_value(multicast::Address const &address) {
  return address.family == Family::ipv4 ? openflow::to_value(multicast::ipv4_of(address))
                                        : openflow::to_value(address.bytes);
}

// Groups whose addresses begin so.
struct Prefix {
  openflow::Ipv6Address address;
  Value mask;
};

constexpr Value high_bits(unsigned count) {
  return ~openflow::ones(128 - count);
}

constexpr openflow::Ipv4Address kAllSystems{224, 0, 0, 1};
constexpr openflow::Ipv4Address kAllRouters{224, 0, 0, 2};
constexpr openflow::Ipv4Address kAllIgmpRouters{224, 0, 0, 22};
constexpr openflow::Ipv4Address kIpv4Local{224, 0, 0, 0};

// See multicast::is_for_all().
constexpr Prefix kIpv6Local[]{
    {.address = {0xff, 0x02}, .mask = high_bits(120)},
    {.address = {0xff, 0x02, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1, 0xff}, .mask = high_bits(104)},
    {.address = {0xff}, .mask = Value{0xff0e} << 112U},
};

// Addresses of Ethernet that nobody asks for: all receivers, groups of the link itself, those that
// neighbours are looked for by.
struct EthernetPrefix {
  EthernetAddress address;
  unsigned bits;
};
constexpr EthernetPrefix kEthernetLocal[]{{{0xff, 0xff, 0xff, 0xff, 0xff, 0xff}, 48},
                                          {{0x01, 0x00, 0x5e, 0, 0, 0}, 40},
                                          {{0x33, 0x33, 0, 0, 0, 0}, 40},
                                          {{0x33, 0x33, 0xff, 0, 0, 0}, 24}};

Match of_protocol(std::uint16_t type, std::uint8_t number) {
  return to_many(Match()).with(Field::eth_type, type).with(Field::ip_proto, number).untagged();
}
Match igmp() {
  return of_protocol(QEX_ETH_TYPE_IPV4, QEX_IP_PROTO_IGMP);
}
Match icmpv6(std::uint8_t type) {
  return of_protocol(QEX_ETH_TYPE_IPV6, QEX_IP_PROTO_ICMPV6).with(Field::icmpv6_type, type);
}

Actions to_all() {
  return to_list(List::all);
}

// By way: nothing for frames of clients.
std::vector<Way const *> ways_of(Plan const &plan) {
  std::vector<Way const *> ways{nullptr};
  for (auto const &way : plan.ways.all()) {
    ways.push_back(&way);
  }
  return ways;
}

Match over(Match match, Way const *way) {
  return match.with(field::kWay, way == nullptr ? 0 : way->number);
}

Ports reached(Plan const &plan, Ports const &ports, Way const *way) {
  Ports found;
  std::copy_if(ports.begin(), ports.end(), std::back_inserter(found),
               [&](Port const *port) { return way == nullptr || plan.ways.of(*port) == way; });
  return found;
}

// The addresses that ports ask for, with those ports that do not get everything anyway.
std::map<EthernetAddress, Ports> asked_groups(Plan const &plan) {
  std::map<EthernetAddress, Ports> asked;
  for (auto const &port : plan.network.ports) {
    if (port.asked_groups && !port.promiscuous && takes_frames(plan.common, port)) {
      for (auto const &address : *port.asked_groups) {
        auto &ports = asked[address];
        if (ports.empty() || ports.back() != &port) {
          ports.push_back(&port);
        }
      }
    }
  }
  return asked;
}

void compile_by_address(Plan const &plan, Program &program) {
  auto const add = [&](std::uint16_t priority, Match match, Actions actions) {
    program.add(table::kGroups,
                {.priority = priority, .match = std::move(match), .actions = std::move(actions)});
  };
  for (auto const &[address, bits] : kEthernetLocal) {
    auto const mask = openflow::ones(48) ^ openflow::ones(48 - bits);
    add(300, Match().with(Field::eth_dst, openflow::to_value(address), mask), to_all());
  }
  for (auto const &[address, ports] : asked_groups(plan)) {
    for (auto const *way : ways_of(plan)) {
      auto const match = Match().with(Field::eth_dst, openflow::to_value(address));
      add_ports(plan, program,
                {.table = table::kGroups,
                 .priority = 100,
                 .match = over(match, way),
                 .has_any_vlan = true},
                reached(plan, ports, way), to_list(List::unasked));
    }
  }
  add(0, Match(), to_list(List::unasked));
}

// The ports of a list: some in all of their VLANs, others in one.
struct Takers {
  std::set<Port const *> everywhere;
  std::map<std::uint16_t, std::set<Port const *>> in_domain;

  [[nodiscard]] bool have(Port const *port, std::uint16_t domain) const {
    auto const found = in_domain.find(domain);
    return everywhere.contains(port) || (found != in_domain.end() && found->second.contains(port));
  }
};

class ByMembership {
 public:
  ByMembership(Plan const &plan, Program &program, Protocol const &protocol)
      : plan_(plan), program_(program), protocol_(protocol), asked_(asked_groups(plan)) {
    for (auto const &port : plan.network.ports) {
      ports_.emplace(port.number, &port);
    }
  }

  void compile() {
    note_takers();
    compile_list(protocol_.takers, takers_);
    compile_list(protocol_.strangers, strangers_);
    compile_list(protocol_.routers, routers_);
    compile_messages();
    compile_local();
    for (auto const &group : plan_.network.multicast.groups.groups) {
      if (group.address.family == protocol_.family) {
        compile_group(group);
      }
    }
    compile_unknown();
  }

 private:
  // Null unless the port takes part in that VLAN. One that tags is looked at when frames come.
  [[nodiscard]] Port const *find(std::uint32_t number, std::uint16_t domain) const {
    auto const found = ports_.find(number);
    if (found == ports_.end() || !takes_frames(plan_.common, *found->second)) {
      return nullptr;
    }
    auto const &vlan = found->second->vlan;
    return vlan.carried || plan_.common.kind_of(vlan.vlan).domain == domain ? found->second
                                                                            : nullptr;
  }
  void note(Takers &takers, multicast::Place const &place) const {
    if (auto const *port = find(place.port, place.vlan)) {
      takers.in_domain[place.vlan].insert(port);
    }
  }

  void note_takers() {
    for (auto const &port : plan_.network.ports) {
      if (!takes_frames(plan_.common, port)) {
        continue;
      }
      if (port.promiscuous) {
        routers_.everywhere.insert(&port);
      }
      if (port.promiscuous || port.takes_all_groups) {
        takers_.everywhere.insert(&port);
      }
      if (port.promiscuous || port.takes_all_groups || port.is_sink) {
        strangers_.everywhere.insert(&port);
      }
    }
    auto const &groups = plan_.network.multicast.groups;
    for (auto const &router : groups.routers) {
      if (router.family == protocol_.family) {
        note(routers_, router.place);
        note(takers_, router.place);
        note(strangers_, router.place);
      }
    }
    for (auto const &place : groups.undecided) {
      note(takers_, place);
      note(strangers_, place);
    }
  }

  [[nodiscard]] std::uint16_t domain_of(Port const *port) const {
    return plan_.common.kind_of(port->vlan.vlan).domain;
  }

  void compile_list(List list, Takers const &takers) {
    std::set<std::uint16_t> domains;
    std::set<Port const *> trunks;
    for (auto const *port : takers.everywhere) {
      port->vlan.carried ? static_cast<void>(trunks.insert(port))
                         : static_cast<void>(domains.insert(domain_of(port)));
    }
    for (auto const &[domain, ports] : takers.in_domain) {
      domains.insert(domain);
    }
    auto const of_list = Match().with(field::kList, static_cast<Value>(list));
    for (auto const domain : domains) {
      auto ports = trunks;
      if (auto const found = takers.in_domain.find(domain); found != takers.in_domain.end()) {
        ports.insert(found->second.begin(), found->second.end());
      }
      for (auto const *port : takers.everywhere) {
        if (!port->vlan.carried && domain_of(port) == domain) {
          ports.insert(port);
        }
      }
      add_list(100, Match(of_list).with(field::kDomain, domain), ports);
    }
    add_list(50, of_list, trunks);
  }
  void add_list(std::uint16_t priority, Match const &match, std::set<Port const *> const &ports) {
    for (auto const *way : ways_of(plan_)) {
      auto const found = reached(plan_, {ports.begin(), ports.end()}, way);
      if (!found.empty()) {
        add_ports(plan_, program_,
                  {.table = table::kLists, .priority = priority, .match = over(match, way)}, found,
                  {});
      }
    }
  }

  // Queries to all; what members say to routers only, so that no member hears it and is silent.
  void compile_messages() {
    if (protocol_.family == Family::ipv6) {
      add(400, icmpv6(QEX_MLD_QUERY), to_all());
      for (auto const type : {QEX_MLD_V1REPORT, QEX_MLD_DONE, QEX_MLD_V2REPORT}) {
        add(390, icmpv6(static_cast<std::uint8_t>(type)), to_list(protocol_.routers));
      }
      return;
    }
    // No flow can look at the type of these. Who asks for one group is a router that asked for all
    // before; what comes from outside for a group is for its members.
    auto const to_group = [](openflow::Ipv4Address const &group) {
      return igmp().with(Field::ip_dst, openflow::to_value(group));
    };
    add(400, to_group(kAllSystems), to_all());
    for (auto const &[domain, routers] : routers_.in_domain) {
      for (auto const *port : routers) {
        add(390, igmp().with(Field::in_port, port->port).with(field::kDomain, domain), to_all());
      }
    }
    add(380, igmp().with(field::kOrigin, kFromClient), to_list(protocol_.routers));
    add(370, to_group(kAllRouters), to_list(protocol_.routers));
    add(370, to_group(kAllIgmpRouters), to_list(protocol_.routers));
  }

  void compile_local() {
    if (protocol_.family == Family::ipv4) {
      auto const mask = openflow::ones(32) ^ openflow::ones(8);
      add(300, frames().with(Field::ip_dst, openflow::to_value(kIpv4Local), mask), to_all());
      return;
    }
    for (auto const &[address, mask] : kIpv6Local) {
      add(300, frames().with(Field::ipv6_dst, openflow::to_value(address), mask), to_all());
    }
  }

  struct Wanting {
    Port const *port;
    multicast::Sources sources;
  };

  [[nodiscard]] std::vector<Wanting> wanting(multicast::Group const &group) const {
    std::map<Port const *, multicast::Sources> found;
    for (auto const &member : group.members) {
      if (auto const *port = find(member.port, group.vlan)) {
        found.emplace(port, member.sources);
      }
    }
    auto const asking = asked_.find(multicast::ethernet_of(group.address));
    if (asking != asked_.end()) {
      for (auto const *port : asking->second) {
        if (find(port->number, group.vlan) != nullptr) {
          found[port] = {.are_excluded = true};
        }
      }
    }
    std::vector<Wanting> wanting;
    for (auto const &port : plan_.network.ports) {
      auto const one = found.find(&port);
      if (one != found.end() && !takers_.have(&port, group.vlan)) {
        wanting.push_back({.port = &port, .sources = one->second});
      }
    }
    return wanting;
  }

  // One all of whose members get all groups has members, too.
  void compile_group(multicast::Group const &group) {
    bool const has_members = std::ranges::any_of(group.members, [&](auto const &member) {
      return find(member.port, group.vlan) != nullptr;
    });
    if (!has_members) {
      return;
    }
    auto const all = wanting(group);
    std::set<multicast::Address> sources;
    for (auto const &one : all) {
      sources.insert(one.sources.listed.begin(), one.sources.listed.end());
    }
    auto const match = frames()
                           .with(protocol_.destination, to_value(group.address))
                           .with(field::kDomain, group.vlan);
    auto const some = [&](auto const &wants) {
      Ports ports;
      for (auto const &one : all) {
        if (wants(one.sources)) {
          ports.push_back(one.port);
        }
      }
      return ports;
    };
    for (auto const *way : ways_of(plan_)) {
      auto const others = [](multicast::Sources const &wanted) { return wanted.are_excluded; };
      add_group(100, match, some(others), way);
      for (auto const &source : sources) {
        auto const is_wanted = [&](multicast::Sources const &wanted) {
          return std::ranges::binary_search(wanted.listed, source) != wanted.are_excluded;
        };
        add_group(200, Match(match).with(protocol_.source, to_value(source)), some(is_wanted), way);
      }
    }
  }
  void add_group(std::uint16_t priority, Match const &match, Ports const &ports, Way const *way) {
    add_ports(plan_, program_,
              {.table = table::kGroups, .priority = priority, .match = over(match, way)},
              reached(plan_, ports, way), to_list(protocol_.takers));
  }

  // Groups without members, to those who ask for their addresses all the same.
  void compile_unknown() {
    auto const first = multicast::ethernet_of({.family = protocol_.family})[0];
    for (auto const &[address, asking] : asked_) {
      if (address[0] != first) {
        continue;
      }
      auto const match = frames().with(Field::eth_dst, openflow::to_value(address));
      compile_asked(50, match, strangers_.everywhere, asking);
      for (auto const &[domain, taking] : strangers_.in_domain) {
        auto getting = strangers_.everywhere;
        getting.insert(taking.begin(), taking.end());
        compile_asked(60, Match(match).with(field::kDomain, domain), getting, asking);
      }
    }
    add(0, frames(), to_list(protocol_.strangers));
  }
  // But those that are on the list of strangers.
  void compile_asked(std::uint16_t priority, Match const &match,
                     std::set<Port const *> const &getting, Ports const &asking) {
    Ports ports;
    std::copy_if(asking.begin(), asking.end(), std::back_inserter(ports),
                 [&](Port const *port) { return !getting.contains(port); });
    for (auto const *way : ways_of(plan_)) {
      add_ports(plan_, program_,
                {.table = table::kGroups,
                 .priority = priority,
                 .match = over(match, way),
                 .has_any_vlan = true},
                reached(plan_, ports, way), to_list(protocol_.strangers));
    }
  }

  [[nodiscard]] Match frames() const { return group_frames(protocol_.family); }
  void add(std::uint16_t priority, Match match, Actions actions) {
    program_.add(table::kGroups,
                 {.priority = priority, .match = std::move(match), .actions = std::move(actions)});
  }

  Plan const &plan_;
  Program &program_;
  Protocol const &protocol_;
  std::map<EthernetAddress, Ports> asked_;
  std::map<std::uint32_t, Port const *> ports_;
  Takers takers_;
  Takers strangers_;
  Takers routers_;
};

}  // namespace

Match group_frames(Family family) {
  auto const &protocol = protocol_of(family);
  auto const prefix = family == Family::ipv4 ? 4U : 8U;
  auto const mask =
      openflow::ones(protocol.address_bits) ^ openflow::ones(protocol.address_bits - prefix);
  auto const first = Value{family == Family::ipv4 ? 0xe0U : 0xffU} << (protocol.address_bits - 8);
  return to_many(Match())
      .with(Field::eth_type, protocol.type)
      .with(protocol.destination, first, mask)
      .untagged();
}

std::vector<Match> group_messages(Family family) {
  if (family == Family::ipv4) {
    return {igmp(), of_protocol(QEX_ETH_TYPE_IPV4, QEX_IP_PROTO_PIM)};
  }
  std::vector<Match> messages{of_protocol(QEX_ETH_TYPE_IPV6, QEX_IP_PROTO_PIM)};
  for (auto const type : {QEX_MLD_QUERY, QEX_MLD_V1REPORT, QEX_MLD_DONE, QEX_MLD_V2REPORT,
                          QEX_MLD_MRDADV, QEX_MLD_MRDTERM}) {
    messages.push_back(icmpv6(static_cast<std::uint8_t>(type)));
  }
  return messages;
}

void compile_groups(Plan const &plan, Program &program) {
  if (plan.filters_by_address()) {
    compile_by_address(plan, program);
  }
  for (auto const family : {Family::ipv4, Family::ipv6}) {
    if (plan.network.multicast.hears(family)) {
      ByMembership(plan, program, protocol_of(family)).compile();
    }
  }
}

}  // namespace simhost::openvswitch
