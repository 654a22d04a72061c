// What a bridge is told ahead, over several connections, and to which bridge.
#include "daemon/bridge/unreached_flows.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <vector>

#include "lab.h"
#include "planes/openvswitch/compile/pipeline.h"
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

TEST_F(ABridge, HasAllAndAGate) {
  auto const wanted = switch_of(150);
  auto const added = add(wanted);
  std::vector<std::string> flows{to_text(gate())};
  for (auto const &flow : wanted.flows) {
    flows.push_back(to_text(flow));
  }
  std::ranges::sort(flows);
  ASSERT_GT(flows.size(), 1000U);
  EXPECT_EQ(bridge.flows(), flows);
  EXPECT_EQ(bridge.groups().size(), wanted.groups.size());
  EXPECT_EQ(added, wanted.flows.size() + wanted.groups.size());
}

// Whatever wanted flows let in, and with whatever priority.
TEST_F(ABridge, LetsNothingInThroughTheGate) {
  auto const wanted = switch_of(150);
  add(wanted);
  for (auto const &flow : wanted.flows) {
    EXPECT_TRUE(flow.table != gate().table || flow.priority < gate().priority) << to_text(flow);
  }
  auto const traced = openvswitch::Lab::shared().ovs_appctl(
      {"ofproto/trace", bridge.name(), "in_port=10,dl_type=0x88b5"});
  EXPECT_THAT(traced, testing::HasSubstr("0. priority 65535\n    drop\n"));
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
  openflow::Flow refused;
  refused.table = openvswitch::table::kGeneration;
  refused.actions = {openflow::ToGroup{.group = 12345}};
  wanted.flows.add(std::make_shared<std::vector<openflow::Flow> const>(1, refused));
  EXPECT_THROW(add(wanted), openflow::HalfMade);
}

}  // namespace
}  // namespace simhost::daemon
