// What the compiler refuses, what stays when something else changes, and large switches.
#include "planes/openvswitch/compile/compile.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <set>
#include <string>
#include <utility>

#include "base/outcomes.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/compile/vlan_masks.h"
#include "planes/openvswitch/compile/ways.h"
#include "planes/openvswitch/openflow/text.h"

namespace simhost::openvswitch {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

Port access_port(openflow::Port number, std::uint16_t vlan) {
  Port port;
  port.port = number;
  port.number = number;
  port.address = EthernetAddress{
      2, 0, 0, 0, static_cast<std::uint8_t>(number >> 8U), static_cast<std::uint8_t>(number)};
  port.vlan.vlan = vlan;
  port.share = number;
  return port;
}

Network with_ports(openflow::Port count) {
  Network network;
  for (openflow::Port number = 1; number <= count; ++number) {
    network.ports.push_back(access_port(number, 7));
  }
  return network;
}

Network with_uplinks() {
  auto network = with_ports(2);
  network.uplinks = {{.port = 11, .number = 11}, {.port = 12, .number = 12}};
  network.teams.push_back({.balance = Balance::share, .in_use = {{11}, {12}}, .standby = {}});
  for (auto &port : network.ports) {
    port.team = 0;
  }
  return network;
}

// The status and the words of a refusal.
std::pair<QEX_ReturnStatus, std::string> refusal(Network const &network) {
  try {
    compile(network);
  } catch (Refused const &refused) {
    return {refused.status(), refused.what()};
  }
  return {QEX_OK, ""};
}

TEST(Compiling, RefusesPortsThatOpenVSwitchHasNot) {
  auto network = with_ports(2);
  network.ports[1].port = kGreatestPort + 1;
  EXPECT_EQ(refusal(network),
            std::pair(QEX_LIMIT_EXCEEDED, std::string("port 2: Open vSwitch has no port 65280")));
  network.ports[1].port = 0;
  EXPECT_EQ(refusal(network),
            std::pair(QEX_LIMIT_EXCEEDED, std::string("port 2: Open vSwitch has no port 0")));
  network.ports[1].port = kGreatestPort;
  EXPECT_EQ(refusal(network).first, QEX_OK);
}

TEST(Compiling, RefusesOnePortForTwo) {
  auto network = with_ports(2);
  network.ports[1].port = 1;
  EXPECT_EQ(refusal(network),
            std::pair(QEX_BAD_PARAM, std::string("port 2: another one is port 1 of Open vSwitch")));
}

TEST(Compiling, RefusesTeamsOfOtherSwitches) {
  auto network = with_uplinks();
  network.teams[0].standby = {{13}};
  EXPECT_EQ(refusal(network),
            std::pair(QEX_BAD_PARAM, std::string("a team uses an uplink that the switch has not")));
  network = with_uplinks();
  network.ports[1].team = 1;
  EXPECT_EQ(refusal(network),
            std::pair(QEX_BAD_PARAM, std::string("port 2 uses a team that the switch has not")));
}

TEST(Compiling, RefusesMoreUplinksThanAreAggregated) {
  auto network = with_ports(2);
  Slot slot;
  for (openflow::Port uplink = 11; uplink < 11 + kMostInSlot; ++uplink) {
    network.uplinks.push_back({.port = uplink, .number = uplink});
    slot.push_back(uplink);
  }
  network.teams.push_back({.balance = Balance::first, .in_use = {slot}, .standby = {}});
  EXPECT_EQ(refusal(network).first, QEX_OK);
  network.uplinks.push_back({.port = 100, .number = 100});
  network.teams[0].in_use[0].push_back(100);
  EXPECT_EQ(refusal(network), std::pair(QEX_LIMIT_EXCEEDED,
                                        std::string("a team aggregates 33 uplinks, more than 32")));
}

TEST(Compiling, RefusesCopiesOfLessThanAHeader) {
  auto network = with_ports(1);
  network.mirrors.resize(1);
  network.mirrors[0].id = 5;
  for (std::uint16_t const enough : {0, 14}) {
    network.mirrors[0].most_bytes = enough;
    EXPECT_EQ(refusal(network).first, QEX_OK);
  }
  network.mirrors[0].most_bytes = 13;
  EXPECT_EQ(refusal(network),
            std::pair(QEX_BAD_PARAM, std::string("mirror session 5: fewer than 14 bytes of a frame "
                                                 "cannot be mirrored")));
}

TEST(Compiling, RefusesSessionsThatCannotBeToldApart) {
  auto network = with_ports(1);
  network.mirrors.resize(2);
  network.mirrors[0].id = network.mirrors[1].id = 5;
  EXPECT_EQ(
      refusal(network),
      std::pair(QEX_BAD_PARAM, std::string("mirror session 5: its number is 0 or another one's")));
}

TEST(Compiling, HasNoPlaceAndNoGroupTwice) {
  auto network = with_uplinks();
  // The address of one port is another's, too.
  network.ports[1].address = network.ports[0].address;
  // And one is fixed in two private VLANs of one primary.
  network.private_vlans = {{.primary = 100, .secondary = 101, .kind = PrivateKind::isolated},
                           {.primary = 100, .secondary = 102, .kind = PrivateKind::community}};
  network.fixed_addresses = {{.address = {2}, .vlan = 101, .port = 1},
                             {.address = {2}, .vlan = 102, .port = 2}};
  auto const made = compile(network);
  auto const same_place = [](auto const &one, auto const &other) {
    return place(one) == place(other);
  };
  auto const flows = in_order(made.flows);
  EXPECT_EQ(std::adjacent_find(flows.begin(), flows.end(), same_place), flows.end());
  auto const same_number = [](auto const &one, auto const &other) { return one.id == other.id; };
  EXPECT_EQ(std::adjacent_find(made.groups.begin(), made.groups.end(), same_number),
            made.groups.end());
}

// The flows that one of two networks has.
std::vector<openflow::Flow> only_in(Network const &one, Network const &other) {
  auto const ours = in_order(compile(one).flows);
  auto const theirs = in_order(compile(other).flows);
  std::vector<openflow::Flow> found;
  std::set_difference(ours.begin(), ours.end(), theirs.begin(), theirs.end(),
                      std::back_inserter(found));
  return found;
}

TEST(Compiling, ChangesNoFlowOfAnotherPort) {
  auto const before = with_uplinks();
  auto after = before;
  after.ports[0].vlan.priority = 5;
  auto const changed = only_in(after, before);
  EXPECT_THAT(changed, Not(IsEmpty()));
  for (auto const &flow : changed) {
    EXPECT_EQ(flow.cookie, cookie(Counted::port, 1)) << to_text(flow);
  }
  after.disabled = true;
  EXPECT_EQ(only_in(after, before).size(), only_in(before, after).size() + 1);
}

TEST(Compiling, ChangesGroupsOnlyWhenAnotherUplinkComesFirst) {
  auto const before = with_uplinks();
  auto after = before;
  std::swap(after.teams[0].in_use[0], after.teams[0].in_use[1]);
  EXPECT_THAT(only_in(after, before), IsEmpty());
  EXPECT_NE(compile(after).groups, compile(before).groups);
}

// The flows of a network by which a port learns.
std::vector<std::string> teachers_in(Network const &network) {
  std::vector<std::string> found;
  for (auto const &flow : compile(network).flows) {
    if (flow.table == table::kTeaching && flow.cookie == cookie(Counted::port, 1) &&
        flow.priority == 100) {
      found.push_back(to_text(flow));
    }
  }
  return found;
}

TEST(Compiling, KeepsForEverWhatAgesLaterThanAFlowCan) {
  auto network = with_ports(1);
  network.ports[0].learning = Learning{.limit = 1};
  network.addresses.aging = 65535;
  EXPECT_THAT(teachers_in(network), ElementsAre(HasSubstr(",hard_timeout=65535,")));
  network.addresses.aging = 65536;
  EXPECT_THAT(teachers_in(network), ElementsAre(Not(HasSubstr("timeout"))));
}

TEST(Compiling, HasTheTableLearnAsManyAsTheSwitchMay) {
  auto network = with_ports(1);
  network.addresses.limit = 12;
  EXPECT_EQ(compile(network).rows.most_learned, 12U);
}

TEST(Compiling, HasOneTagToldApartWhileNobodyHasAUseForASecondOne) {
  auto nested = with_ports(2);
  EXPECT_EQ(compile(nested).rows.most_tags, 1U);
  nested.ports[1].vlan.nested = true;
  EXPECT_EQ(compile(nested).rows.most_tags, 2U);
  auto mirroring = with_ports(2);
  mirroring.mirrors.resize(1);
  mirroring.mirrors[0].id = 5;
  EXPECT_EQ(compile(mirroring).rows.most_tags, 2U);
}

// How many actions of each flow of lists are such, of those that have some.
template <typename Is>
std::vector<std::size_t> in_lists(Network const &network, Is const &is) {
  std::vector<std::size_t> counts;
  for (auto const &flow : compile(network).flows) {
    auto const count = std::count_if(flow.actions.begin(), flow.actions.end(), is);
    if (flow.table == table::kLists && count != 0) {
      counts.push_back(static_cast<std::size_t>(count));
    }
  }
  std::sort(counts.begin(), counts.end());
  return counts;
}

bool counts_and_sends(openflow::Action const &action) {
  return action == openflow::Action(openflow::Resubmit{.table = table::kSending});
}

bool only_sends(openflow::Action const &action) {
  return std::holds_alternative<openflow::Output>(action);
}

TEST(Compiling, CutsLongListsIntoPieces) {
  EXPECT_THAT(in_lists(with_ports(3001), counts_and_sends), ElementsAre(1, 1000, 1000, 1000));
  EXPECT_THAT(in_lists(with_ports(3001), only_sends), IsEmpty());
}

TEST(Compiling, CountsNoMoreThanAFrameHasLookups) {
  EXPECT_THAT(in_lists(with_ports(4100), counts_and_sends), ElementsAre(900, 1000, 1000, 1000));
  EXPECT_THAT(in_lists(with_ports(4100), only_sends), ElementsAre(100, 100));
  // A port of which something is looked at takes two, if it is counted.
  auto network = with_ports(3000);
  for (auto &port : network.ports) {
    port.transmits_by_uplink = true;
  }
  auto const flows = compile(network).flows;
  EXPECT_EQ(std::count_if(flows.begin(), flows.end(),
                          [](openflow::Flow const &flow) {
                            return flow.table == table::kSending &&
                                   flow.cookie >> 56U == std::uint64_t{0x15};
                          }),
            900);
}

TEST(GenerationMarker, IsAFlowThatNoFrameReaches) {
  EXPECT_EQ(to_text(generation_marker(7)), "cookie=0x7, table=250, priority=0 actions=drop");
}

TEST(VlanMasks, AreAsFewAsTheyCanBe) {
  auto const set = [](std::initializer_list<std::pair<unsigned, unsigned>> ranges) {
    Vlans vlans;
    for (auto const &[first, last] : ranges) {
      for (auto vlan = first; vlan <= last; ++vlan) {
        vlans.set(vlan);
      }
    }
    return masks_of(vlans);
  };
  EXPECT_THAT(set({}), IsEmpty());
  EXPECT_THAT(set({{0, 0}}), IsEmpty());
  EXPECT_THAT(set({{1, 4094}}), ElementsAre(VlanMask{0, 0}));
  EXPECT_THAT(set({{1, 1}}), ElementsAre(VlanMask{0, 0xffe}));
  EXPECT_THAT(set({{4, 7}}), ElementsAre(VlanMask{4, 0xffc}));
  EXPECT_THAT(masks_with_0_of(Vlans(0b11)), ElementsAre(VlanMask{0, 0xffe}));
  EXPECT_THAT(masks_with_0_of(Vlans(0b10)), ElementsAre(VlanMask{1, 0xfff}));
  EXPECT_THAT(set({{3, 5}, {4094, 4094}}),
              ElementsAre(VlanMask{3, 0xfff}, VlanMask{4, 0xffe}, VlanMask{0xffe, 0xffe}));
}

TEST(TheWays, AreOneWhereUplinksAndOrderAre) {
  auto network = with_uplinks();
  network.ports.push_back(access_port(3, 7));
  network.ports[2].team = 0;
  Ways const ways(network);
  EXPECT_EQ(ways.of(network.ports[0]), ways.of(network.ports[2]));
  EXPECT_NE(ways.of(network.ports[0]), ways.of(network.ports[1]));
  network.ports[2].team = std::nullopt;
  EXPECT_EQ(Ways(network).of(network.ports[2]), nullptr);
}

// More than the names of a policy are: those of a switch that names none.
TEST(TheWays, OfManyUplinksAllHaveNumbersOfTheirOwn) {
  auto network = with_ports(3000);
  Team team{.balance = Balance::share, .in_use = {}, .standby = {}};
  for (openflow::Port uplink = 10001; uplink <= 13000; ++uplink) {
    network.uplinks.push_back({.port = uplink, .number = uplink});
    team.in_use.push_back({uplink});
  }
  network.teams = {team, {.balance = Balance::first, .in_use = {{10001, 10002}}, .standby = {}}};
  for (auto &port : network.ports) {
    port.team = 0;
  }
  network.ports.push_back(access_port(1, 7));
  network.ports.back().team = 1;
  std::set<std::uint32_t> numbers;
  for (auto const &way : Ways(network).all()) {
    EXPECT_LT(way.number, kSendingGroups);
    numbers.insert(way.number);
  }
  EXPECT_EQ(numbers.size(), 3001);
}

// The two uplinks are a group whose partner has one of them, or both.
Network with_lag(bool both) {
  auto network = with_uplinks();
  for (auto &uplink : network.uplinks) {
    uplink.lag = 1;
    uplink.has_partner = both || uplink.port == 11;
  }
  return network;
}

TEST(TheWays, OverUplinksOfAGroupAreOneLinkWhileTheyHaveAPartner) {
  auto const whole = with_lag(true);
  Ways const ways(whole);
  auto const &way = *ways.of(whole.ports[0]);
  EXPECT_THAT(way.links, testing::Each(way.links.front()));
  for (std::size_t slot = 0; slot < way.slots.size(); ++slot) {
    EXPECT_TRUE(way.is_at(whole.uplinks[0], slot));
    EXPECT_TRUE(way.is_at(whole.uplinks[1], slot));
  }
}

// The first port begins at the uplink 12, the second at 11.
TEST(TheWays, LeaveOutUplinksThatOpenVswitchTakesForDead) {
  auto const half = with_lag(false);
  Ways const ways(half);
  EXPECT_THAT(ways.of(half.ports[0])->slots, ElementsAre(Slot{12})) << "is to use it all the same";
  EXPECT_THAT(ways.of(half.ports[1])->slots, ElementsAre(Slot{11}));
  EXPECT_FALSE(ways.of(half.ports[1])->is_at(half.uplinks[1], 0));
}

TEST(TheWays, OfAGroupAreOneForAllPorts) {
  auto network = with_lag(true);
  network.teams[0] = {.balance = Balance::first, .in_use = {{11, 12}}, .standby = {}};
  Ways const ways(network);
  EXPECT_EQ(ways.of(network.ports[0]), ways.of(network.ports[1]));
}

// Its hash may say another uplink for the same flow otherwise.
TEST(TheGroups, ThatSpreadFlowsAreOnePerSetOfUplinks) {
  auto network = with_lag(true);
  network.uplinks.push_back({.port = 13, .number = 13, .lag = 1, .has_partner = true});
  network.teams = {{.balance = Balance::first, .in_use = {{11, 12}}, .standby = {}},
                   {.balance = Balance::first, .in_use = {{12, 11}}, .standby = {{13}}},
                   {.balance = Balance::first, .in_use = {{11, 13}}, .standby = {}}};
  network.ports[1].team = 1;
  network.ports.push_back(access_port(3, 7));
  network.ports.back().team = 2;
  std::vector<std::string> spreading;
  for (auto const &group : compile(network).groups) {
    if (group.type == openflow::GroupType::select) {
      spreading.push_back(std::to_string(group.id & 0xffffffU));
    }
  }
  EXPECT_THAT(spreading, ElementsAre("11", std::to_string(0x10000 | 11)));
}

std::string actions_of(Compiled const &compiled, std::string const &match) {
  for (auto const &flow : compiled.flows) {
    auto const text = openflow::to_text(flow);
    if (text.find(match) != std::string::npos) {
      return text.substr(text.find("actions="));
    }
  }
  return "none";
}

multicast::Group group_of(std::uint8_t number, std::uint32_t ports) {
  multicast::Group group{.vlan = 7,
                         .address = multicast::address_of(openflow::Ipv4Address{239, 1, 1, number}),
                         .members = {}};
  for (std::uint32_t port = 1; port <= ports; ++port) {
    group.members.push_back({.port = port, .sources = {.are_excluded = true}});
  }
  return group;
}

TEST(Groups, LeaveOthersAsTheyAre) {
  auto network = with_ports(3);
  network.multicast.hears_igmp = true;
  network.multicast.groups.groups = {group_of(2, 2)};
  auto const before = compile(network);
  network.multicast.groups.groups = {group_of(1, 3), group_of(2, 2), group_of(3, 1)};
  auto const after = compile(network);
  EXPECT_EQ(after.flows.size(), before.flows.size() + 2);
  EXPECT_TRUE(std::ranges::includes(in_order(after.flows), in_order(before.flows)));
}

TEST(Groups, MayHaveMoreMembersThanAFlowHasRoomFor) {
  auto network = with_ports(2500);
  network.multicast.hears_igmp = true;
  network.multicast.groups.groups = {group_of(1, 2500)};
  auto const compiled = compile(network);
  EXPECT_EQ(actions_of(compiled,
                       "reg9=0,vlan_tci=0x0000/0x1fff,dl_dst=01:00:00:00:00:00/"
                       "01:00:00:00:00:00,nw_dst=239.1.1.1 "),
            "actions=set_field:0x1->reg9,resubmit(,26),set_field:0x2->reg9,resubmit(,26),"
            "set_field:0x3->reg9,resubmit(,26),set_field:0x5->reg8,set_field:0->reg9,"
            "resubmit(,14)");
  auto const last = actions_of(compiled,
                               "reg9=0x3,vlan_tci=0x0000/0x1fff,dl_dst=01:00:00:00:00:00/"
                               "01:00:00:00:00:00,nw_dst=239.1.1.1 ");
  EXPECT_THAT(last, HasSubstr("actions=set_field:0x7d1->reg14"));
  EXPECT_THAT(last, HasSubstr("set_field:0x9c4->reg14,resubmit(,23)"));
}

TEST(Groups, HaveNoMembersThatAreGoneOrElsewhere) {
  auto network = with_ports(2);
  network.ports[1].vlan.vlan = 8;
  network.multicast.hears_igmp = true;
  auto const without = compile(network);
  auto group = group_of(1, 3);
  group.members.erase(group.members.begin());
  network.multicast.groups = {.groups = {group},
                              .routers = {{.place = {.port = 2, .vlan = 7}, .family = {}}},
                              .undecided = {{.port = 9, .vlan = 7}}};
  EXPECT_EQ(in_order(compile(network).flows), in_order(without.flows));
}

}  // namespace
}  // namespace simhost::openvswitch
