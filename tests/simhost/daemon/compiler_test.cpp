// What is compiled once and what anew, and that nobody sees a difference.
#include "daemon/compiler.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <memory>
#include <optional>
#include <random>
#include <set>
#include <utility>

#include "base/outcomes.h"

namespace {

using simhost::daemon::Compiler;
using simhost::openvswitch::Balance;
using simhost::openvswitch::Compiled;
using simhost::openvswitch::EthernetAddress;
using simhost::openvswitch::Learning;
using simhost::openvswitch::Network;
using simhost::openvswitch::Port;
using simhost::openvswitch::PrivateKind;
using simhost::openvswitch::Team;
using simhost::openvswitch::WhenFull;
using simhost::storage::SwitchKey;

constexpr SwitchKey kKey{1};
constexpr SwitchKey kOther{2};

Network network_of(std::uint16_t ports) {
  Network network;
  network.uplinks = {{.port = 100, .number = 100}};
  network.teams = {{.in_use = {{100}}, .standby = {}}, {.in_use = {}, .standby = {}}};
  for (std::uint16_t number = 1; number <= ports; ++number) {
    Port port;
    port.port = number;
    port.number = number;
    port.team = 0;
    network.ports.push_back(port);
  }
  return network;
}

TEST(TheCompiler, MakesNothingAnewOfWhatIsTheSame) {
  Compiler compiler;
  auto const first = compiler.compile(kKey, network_of(2)).flows;
  EXPECT_EQ(compiler.compile(kKey, network_of(2)).flows, first);
  // Each switch has its own.
  EXPECT_NE(compiler.compile(kOther, network_of(2)).flows, first);
  EXPECT_NE(compiler.compile(kKey, network_of(3)).flows, first);
}

TEST(TheCompiler, ForgetsSwitchesThatNobodyAsksFor) {
  Compiler compiler;
  std::weak_ptr const first = compiler.compile(kKey, network_of(2)).flows;
  compiler.forget_others();
  EXPECT_FALSE(first.expired()) << "nobody had a chance to ask";
  compiler.begin();
  compiler.compile(kKey, network_of(2));
  compiler.forget_others();
  EXPECT_FALSE(first.expired());
  compiler.begin();
  compiler.forget_others();
  EXPECT_TRUE(first.expired());
}

TEST(TheCompiler, KeepsWhatItHadWhenItRefuses) {
  Compiler compiler;
  auto const first = compiler.compile(kKey, network_of(2)).flows;
  auto refused = network_of(2);
  refused.ports[1].port = 1;
  EXPECT_THROW(compiler.compile(kKey, refused), simhost::Refused);
  EXPECT_THROW(compiler.compile(kKey, refused), simhost::Refused);
  EXPECT_EQ(compiler.compile(kKey, network_of(2)).flows, first);
}

using Chance = std::mt19937;

std::uint16_t one_of(Chance &chance, unsigned many) {
  return static_cast<std::uint16_t>(chance() % many);
}

bool toss(Chance &chance) {
  return one_of(chance, 2) == 1;
}

EthernetAddress group_address(Chance &chance) {
  return {0x01, 0x00, 0x5e, 0, 1, static_cast<std::uint8_t>(one_of(chance, 3))};
}

// What there is to a port, by itself.
constexpr std::array<void (*)(Port &, Chance &), 20> kOfPorts{
    [](Port &port, Chance &chance) { port.vlan.vlan = one_of(chance, 4); },
    [](Port &port, Chance &chance) { port.vlan.carried.emplace().set(one_of(chance, 4)); },
    [](Port &port, Chance & /*chance*/) { port.vlan.carried.reset(); },
    [](Port &port, Chance &chance) { port.vlan.must_be_private = toss(chance); },
    [](Port &port, Chance &chance) { port.vlan.priority = one_of(chance, 8) & 7U; },
    [](Port &port, Chance &chance) { port.vlan.nested = toss(chance); },
    [](Port &port, Chance &chance) { port.blocked = toss(chance); },
    [](Port &port, Chance &chance) { port.address_changed = toss(chance); },
    [](Port &port, Chance &chance) { port.may_forge = toss(chance); },
    [](Port &port, Chance &chance) { port.promiscuous = toss(chance); },
    [](Port &port, Chance &chance) { port.floods = toss(chance); },
    [](Port &port, Chance &chance) { port.is_sink = toss(chance); },
    [](Port &port, Chance &chance) { port.takes_all_groups = toss(chance); },
    [](Port &port, Chance &chance) { port.asked_groups = {group_address(chance)}; },
    [](Port &port, Chance &chance) { port.transmits_by_uplink = toss(chance); },
    [](Port &port, Chance &chance) {
      port.learning = Learning{.limit = one_of(chance, 3),
                               .when_full = toss(chance) ? WhenFull::drop : WhenFull::allow};
    },
    [](Port &port, Chance &chance) { port.team = one_of(chance, 2); },
    [](Port &port, Chance &chance) { port.share = one_of(chance, 3); },
    [](Port &port, Chance &chance) { port.mirrors_only = toss(chance); },
    [](Port &port, Chance &chance) { port.sends_nothing = toss(chance); },
};

// What there is to a switch, and to a port beside others.
constexpr std::array<void (*)(Network &, Port &, Chance &), 20> kOfSwitches{
    [](Network &network, Port & /*port*/, Chance &chance) { network.disabled = toss(chance); },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.mtu = static_cast<std::uint16_t>(1500 + one_of(chance, 2));
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.beacons = toss(chance) ? std::optional(group_address(chance)) : std::nullopt;
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.uplinks[0].blocked = toss(chance);
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.uplinks.resize(1);
      if (toss(chance)) {
        network.uplinks.push_back({.port = 101, .number = 101});
      }
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      auto &team = network.teams[one_of(chance, 2)];
      team.balance = static_cast<Balance>(one_of(chance, 4));
      team.in_use = {{100}};
      if (network.uplinks.size() > 1) {
        toss(chance) ? team.in_use.push_back({101}) : team.in_use[0].push_back(101);
      }
    },
    // Without teams the uplinks are of no use, and may go.
    [](Network &network, Port & /*port*/, Chance & /*chance*/) {
      network.teams = {Team{}, Team{}};
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.addresses.aging = 300U * one_of(chance, 3);
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.addresses.limit = one_of(chance, 3);
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.addresses.uplink_limit = one_of(chance, 2);
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.addresses.fixed_ones_move = toss(chance);
    },
    [](Network &network, Port &port, Chance &chance) {
      network.fixed_addresses = {{.address = {2}, .vlan = one_of(chance, 3), .port = port.number}};
    },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.private_vlans = {
          {.primary = 1,
           .secondary = 2,
           .kind = toss(chance) ? PrivateKind::isolated : PrivateKind::community}};
    },
    [](Network &network, Port & /*port*/, Chance & /*chance*/) { network.private_vlans = {}; },
    [](Network &network, Port &port, Chance &chance) {
      network.mirrors = {{.id = 1U + one_of(chance, 2),
                          .received = {.ports = {port.port}, .uplinks = {}, .vlans = {1}},
                          .sent = {.ports = {1}, .uplinks = {}, .vlans = {}},
                          .to_ports = {1},
                          .to_uplinks = {},
                          .most_bytes = static_cast<std::uint16_t>(64 * one_of(chance, 2))}};
    },
    [](Network &network, Port & /*port*/, Chance & /*chance*/) { network.mirrors = {}; },
    [](Network &network, Port & /*port*/, Chance &chance) {
      network.multicast.hears_igmp = toss(chance);
      network.multicast.hears_mld = toss(chance);
    },
    [](Network &network, Port &port, Chance &chance) {
      network.multicast.groups.undecided = {{.port = port.number, .vlan = one_of(chance, 3)}};
    },
    // Somebody else's address, too.
    [](Network & /*network*/, Port &port, Chance &chance) {
      port.address = {2, 0, 0, 0, 0, static_cast<std::uint8_t>(one_of(chance, 2))};
    },
    [](Network &network, Port &port, Chance &chance) {
      auto const number = port.port;
      if (network.ports.size() > 2 && toss(chance)) {
        std::erase_if(network.ports, [&](Port const &one) { return one.port == number; });
      } else {
        auto another = network_of(9);
        for (auto const &one : network.ports) {
          std::erase_if(another.ports, [&](Port const &of) { return of.port == one.port; });
        }
        network.ports.insert(network.ports.end(), another.ports.begin(), another.ports.end());
      }
    },
};

// One thing more or less, of any kind.
void change(Network &network, Chance &chance) {
  auto &port = network.ports[chance() % network.ports.size()];
  if (toss(chance)) {
    kOfPorts.at(chance() % kOfPorts.size())(port, chance);
  } else {
    kOfSwitches.at(chance() % kOfSwitches.size())(network, port, chance);
  }
}

std::set<simhost::openflow::Flow const *> places_of(Compiled const &compiled) {
  std::set<simhost::openflow::Flow const *> places;
  for (auto const &flow : compiled.flows) {
    places.insert(&flow);
  }
  return places;
}

// How many flows of the first are the second's very own.
std::size_t shared(Compiled const &one, Compiled const &other) {
  auto const places = places_of(one);
  return static_cast<std::size_t>(std::ranges::count_if(
      places_of(other), [&](auto const *flow) { return places.contains(flow); }));
}

TEST(TheCompiler, MakesOtherPortsNotAgainOfWhichNothingChanged) {
  Compiler compiler;
  auto network = network_of(20);
  auto const before = compiler.compile(kKey, network).flows;
  network.ports[7].vlan.vlan = 9;
  auto const after = compiler.compile(kKey, network).flows;
  EXPECT_GT(shared(*before, *after), after->flows.size() / 2);
  // What all ports have in common changes them all.
  network.addresses.aging = 60;
  EXPECT_EQ(shared(*after, *compiler.compile(kKey, network).flows), 0);
}

TEST(TheCompiler, MakesWhatIsMadeOfTheWholeAfterAnyChanges) {
  Chance chance(1);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same in each run
  Compiler compiler;
  auto network = network_of(5);
  int same = 0;
  std::size_t kept = 0;
  int refused = 0;
  for (int round = 0; round < 600; ++round) {
    auto const before = compiler.compile(kKey, network).flows;
    auto changed = network;
    change(changed, chance);
    try {
      simhost::openvswitch::check(changed);
    } catch (simhost::Refused const &) {
      ++refused;
      continue;
    }
    network = std::move(changed);
    auto const &made = compiler.compile(kKey, network);
    auto const whole = simhost::openvswitch::compile(network);
    ASSERT_EQ(in_order(made.flows->flows), in_order(whole.flows)) << "in round " << round;
    ASSERT_EQ(made.flows->groups, whole.groups) << "in round " << round;
    ASSERT_EQ(made.flows->rows, whole.rows) << "in round " << round;
    ASSERT_EQ(made.network, network);
    same += made.flows == before ? 1 : 0;
    kept += shared(*before, *made.flows);
  }
  // Some of what is drawn was so before, some is so for other ports, and little makes no sense.
  EXPECT_GT(same, 30);
  EXPECT_GT(kept, 3000);
  EXPECT_LT(refused, 150);
}

}  // namespace
