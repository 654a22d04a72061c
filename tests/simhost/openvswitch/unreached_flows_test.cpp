// What a bridge is told ahead, over several connections, and to which bridge.
#include "daemon/bridge/unreached_flows.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "lab.h"
#include "planes/openvswitch/openflow/text.h"

namespace simhost::daemon {
namespace {

using openvswitch::Bridge;
using openvswitch::Compiled;
using openvswitch::soon;

// With ports whose clients tag by themselves, each of which takes a dozen flows.
Compiled switch_of(std::uint32_t ports) {
  openvswitch::Network network;
  network.uplinks = {{.port = 1, .number = 1000}, {.port = 2, .number = 1001}};
  network.teams = {{.balance = openvswitch::Balance::share, .in_use = {{1}, {2}}, .standby = {}}};
  for (std::uint32_t number = 0; number < ports; ++number) {
    auto &port = network.ports.emplace_back();
    port.port = 10 + number;
    port.number = number;
    port.team = 0;
    port.vlan.carried.emplace().set(7);
  }
  return compile(network);
}

struct ABridge : testing::Test {
  ABridge() : connection(bridge.socket(), soon()) {
    connection.have_meters({{simhost::openflow::kControllerMeter, 1000}}, soon());
  }

  std::size_t add(Compiled const &wanted) {
    return add_unreached(connection, bridge.socket(), wanted, soon());
  }

  Bridge bridge;
  openflow::Connection connection;
};

TEST_F(ABridge, HasAllButWhatLetsFramesIn) {
  auto const wanted = switch_of(150);
  auto const added = add(wanted);
  std::vector<std::string> flows;
  for (auto const &flow : wanted.flows) {
    if (flow.table != 0) {
      flows.push_back(to_text(flow));
    }
  }
  std::ranges::sort(flows);
  ASSERT_GT(flows.size(), 1000U);
  EXPECT_EQ(bridge.flows(), flows);
  EXPECT_EQ(bridge.groups().size(), wanted.groups.size());
  EXPECT_EQ(added, flows.size() + wanted.groups.size());
}

TEST_F(ABridge, IsLeftAloneIfFramesMayPassAlready) {
  openflow::Flow any;
  any.table = 0;
  connection.change({openflow::FlowChange{.flow = any}}, soon());
  EXPECT_EQ(add(switch_of(150)), 0U);
  EXPECT_THAT(bridge.flows(), testing::ElementsAre(to_text(any)));
}

TEST_F(ABridge, IsLeftAloneIfItHasGroups) {
  openflow::Group const group{.id = 1, .buckets = {}};
  connection.change({openflow::GroupChange{.group = group}}, soon());
  EXPECT_EQ(add(switch_of(150)), 0U);
  EXPECT_EQ(bridge.groups().size(), 1U);
}

TEST_F(ABridge, OfFewFlowsIsToldInOneBundle) {
  EXPECT_EQ(add(switch_of(5)), 0U);
  EXPECT_TRUE(bridge.flows().empty());
}

TEST_F(ABridge, SaysSoIfOpenVswitchRefusesAFlow) {
  auto wanted = switch_of(150);
  auto &last = wanted.flows.back();
  last.actions = {openflow::ToGroup{.group = 12345}};
  EXPECT_THROW(add(wanted), openflow::ChangeRefused);
}

}  // namespace
}  // namespace simhost::daemon
