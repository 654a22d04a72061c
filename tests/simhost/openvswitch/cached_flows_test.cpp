// That Open vSwitch forgets how frames went, and that it is known since when.
#include "daemon/bridge/cached_flows.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "lab.h"
#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {
namespace {

using openvswitch::Bridge;
using openvswitch::Lab;
using openvswitch::soon;
using testing::HasSubstr;

openflow::Changes generation(std::uint64_t number) {
  return {openflow::FlowChange{.flow = openvswitch::generation_marker(number)}};
}

bool forget(std::string const &bridge, std::uint64_t number) {
  return forget_cached_flows(Lab::shared().database_socket().parent_path(), bridge, number);
}

struct CachedFlows : testing::Test {
  CachedFlows() : connection(bridge.socket(), soon()) {}

  // What is remembered of it once a frame came.
  std::string remembered() {
    constexpr auto *kFrame = "02000000000202000000000188b5000000000000";
    Lab::shared().ovs_appctl({"netdev-dummy/receive", bridge.name() + "p1", kFrame});
    return what_is_remembered();
  }
  std::string what_is_remembered() {
    return Lab::shared().ovs_appctl({"dpif/dump-flows", bridge.name()});
  }

  Bridge bridge{1};
  openflow::Connection connection;
};

TEST_F(CachedFlows, AreForgotten) {
  connection.change(generation(5), soon());
  EXPECT_THAT(remembered(), HasSubstr("eth_type(0x88b5)"));
  forget_cached_flows(Lab::shared().database_socket().parent_path());
  EXPECT_EQ(what_is_remembered(), "");
  EXPECT_THAT(remembered(), HasSubstr("eth_type(0x88b5)"));
  forget(bridge.name(), 4);
  EXPECT_EQ(what_is_remembered(), "");
}

TEST_F(CachedFlows, AreForgottenInAGenerationThatIsTold) {
  EXPECT_FALSE(forget(bridge.name(), 5));
  connection.change(generation(5), soon());
  EXPECT_TRUE(forget(bridge.name(), 5));
  EXPECT_FALSE(forget(bridge.name(), 4));
  EXPECT_FALSE(forget(bridge.name(), 0x55));
  EXPECT_FALSE(forget("nobody's", 5));
}

TEST_F(CachedFlows, MayBeForgottenWhileAChangeIsMade) {
  bool is_forgotten = false;
  connection.change(generation(5), soon(), [&] {
    for (auto const end = soon(); !is_forgotten && openvswitch::Deadline::clock::now() < end;) {
      is_forgotten = forget(bridge.name(), 5);
    }
  });
  EXPECT_TRUE(is_forgotten);
}

// How often they are forgotten, by somebody who is right so late.
unsigned times_forgotten(openflow::Connection &connection, std::uint64_t number,
                         bool is_other_generation, unsigned right_at) {
  unsigned times = 0;
  change_and_forget(
      connection, generation(number), is_other_generation, [&] { return ++times >= right_at; },
      soon());
  return times;
}

TEST_F(CachedFlows, AreForgottenOnceMoreIfThatWasEarly) {
  EXPECT_EQ(times_forgotten(connection, 5, true, 1), 1U);
  EXPECT_EQ(times_forgotten(connection, 6, true, 2), 2U);
  EXPECT_EQ(times_forgotten(connection, 7, true, 3), 2U);
}

TEST_F(CachedFlows, AreForgottenAfterwardsIfNobodyCanTell) {
  unsigned markers = 0;
  change_and_forget(
      connection, generation(5), false,
      [&] {
        markers = static_cast<unsigned>(bridge.flows().size());
        // The connection is done with the change.
        connection.barrier(soon());
        return true;
      },
      soon());
  EXPECT_EQ(markers, 1U);
  EXPECT_EQ(times_forgotten(connection, 5, false, 2), 1U);
}

TEST_F(CachedFlows, AreNotLookedAtWhenNoChangeIsMade) {
  openflow::Flow bad;
  bad.table = 2;
  bad.match.with(openflow::Field::arp_op, 1);
  bool was_done = false;
  EXPECT_THROW(
      connection.change({openflow::FlowChange{.flow = bad}}, soon(), [&] { was_done = true; }),
      openflow::ChangeRefused);
  EXPECT_FALSE(was_done);
}

}  // namespace
}  // namespace simhost::daemon
