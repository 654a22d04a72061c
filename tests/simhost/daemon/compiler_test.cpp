// What is compiled once and what anew, and that nobody sees a difference.
#include "daemon/compiler.h"

#include <gtest/gtest.h>

#include <random>

#include "base/outcomes.h"

namespace {

using simhost::daemon::Compiler;
using simhost::openvswitch::Network;
using simhost::openvswitch::Port;
using simhost::storage::SwitchKey;

constexpr SwitchKey kKey{1};
constexpr SwitchKey kOther{2};

Network network_of(std::uint16_t ports) {
  Network network;
  network.uplinks = {{.port = 100, .number = 100}};
  network.teams.push_back({.in_use = {{100}}, .standby = {}});
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

// One thing more or less, of any kind.
void change(Network &network, std::mt19937 &chance) {
  auto &port = network.ports[chance() % network.ports.size()];
  auto const one_of = [&](unsigned many) { return static_cast<std::uint16_t>(chance() % many); };
  switch (chance() % 12) {
    case 0:
      port.vlan.vlan = one_of(3);
      break;
    case 1:
      port.vlan.carried.emplace().set(one_of(4096));
      break;
    case 2:
      port.vlan.carried.reset();
      break;
    case 3:
      port.blocked = !port.blocked;
      break;
    case 4:
      port.learning = simhost::openvswitch::Learning{.limit = one_of(3)};
      break;
    case 5:
      port.address = {2, 0, 0, 0, 0, static_cast<std::uint8_t>(one_of(3))};
      break;
    case 6:
      port.promiscuous = !port.promiscuous;
      break;
    case 7:
      network.mtu = static_cast<std::uint16_t>(1500 + one_of(2));
      break;
    case 8:
      network.uplinks[0].blocked = !network.uplinks[0].blocked;
      break;
    case 9:
      network.fixed_addresses = {{.address = {2}, .vlan = one_of(3), .port = port.number}};
      break;
    case 10:
      network.private_vlans = {
          {.primary = 1, .secondary = 2, .kind = simhost::openvswitch::PrivateKind::isolated}};
      break;
    default:
      network.mirrors = {{.id = 1U + one_of(2),
                          .received = {.ports = {port.port}, .uplinks = {}, .vlans = {}},
                          .sent = {},
                          .to_ports = {1},
                          .to_uplinks = {}}};
  }
}

TEST(TheCompiler, MakesWhatIsMadeOfTheWholeAfterAnyChanges) {
  std::mt19937 chance(1);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same in each run
  Compiler compiler;
  auto network = network_of(5);
  int same = 0;
  for (int round = 0; round < 500; ++round) {
    auto const before = compiler.compile(kKey, network).flows;
    change(network, chance);
    auto const &made = compiler.compile(kKey, network);
    auto const whole = simhost::openvswitch::compile(network);
    ASSERT_EQ(in_order(made.flows->flows), in_order(whole.flows)) << "in round " << round;
    ASSERT_EQ(made.flows->groups, whole.groups) << "in round " << round;
    ASSERT_EQ(made.flows->rows, whole.rows) << "in round " << round;
    ASSERT_EQ(made.network, network);
    same += made.flows == before ? 1 : 0;
  }
  // Some of what is drawn was so before.
  EXPECT_GT(same, 0);
}

}  // namespace
