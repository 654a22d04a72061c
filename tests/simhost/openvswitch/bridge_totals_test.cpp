// What is told of a bridge that is asked again and again, and how little of it is asked for.
#include "daemon/counting/bridge_totals.h"

#include <gmock/gmock.h>

#include <utility>
#include <vector>

#include "lab.h"
#include "planes/openvswitch/openflow/flow.h"

namespace simhost::daemon {
namespace {

using openflow::Flow;
using openflow::FlowChange;
using openflow::FlowCommand;
using openvswitch::cookie;
using openvswitch::Counted;
using openvswitch::soon;
using openvswitch::table::kDropped;
using openvswitch::table::kLookup;
using openvswitch::table::kRecentSources;

constexpr std::uint32_t kPort = 7;
constexpr std::uint64_t kCame = cookie(Counted::in_unicast, kPort);
constexpr std::uint64_t kWent = cookie(Counted::dropped, kPort);

struct TotalsOfABridge : testing::Test {
  TotalsOfABridge() {
    add({.table = 0, .actions = {openflow::Resubmit{kLookup}}});
    add({.table = kLookup, .cookie = kCame});
    add({.table = kDropped, .cookie = kWent});
  }

  void add(Flow const &flow) {
    connection.change({FlowChange{.command = FlowCommand::add, .flow = flow}}, soon());
  }

  void send_frame() {
    connection.send({.in_port = 1,
                     .actions = {openflow::Output{openflow::kTable}},
                     .frame = {2, 0, 0, 0, 0, 1, 2, 0, 0, 0, 0, 2, 0x88, 0xb5, 1, 2, 3, 4}});
    connection.barrier(soon());
    openvswitch::Lab::shared().ovs_appctl({"revalidator/purge"});
  }

  /// Of sources that counted any.
  std::vector<std::pair<std::uint64_t, std::uint64_t>> packets() {
    std::vector<std::pair<std::uint64_t, std::uint64_t>> packets;
    for (auto const &[source, total] : totals.ask(connection, Devices::now_and_then, {}, soon())) {
      if (total.packets > 0) {
        packets.emplace_back(source, total.packets);
      }
    }
    return packets;
  }

  openvswitch::Bridge bridge{1};
  openflow::Connection connection{bridge.socket(), soon()};
  BridgeTotals totals;
};

using testing::Pair;
using testing::UnorderedElementsAre;

TEST_F(TotalsOfABridge, AreThoseOfItsFlowsEachTime) {
  EXPECT_THAT(packets(), UnorderedElementsAre());
  send_frame();
  EXPECT_THAT(packets(), UnorderedElementsAre(Pair(kCame, 1)));
  EXPECT_THAT(packets(), UnorderedElementsAre(Pair(kCame, 1)));
  add({.table = 0, .priority = 0xffff, .actions = {openflow::Resubmit{kDropped}}});
  send_frame();
  send_frame();
  EXPECT_THAT(packets(), UnorderedElementsAre(Pair(kCame, 1), Pair(kWent, 2)));
}

TEST_F(TotalsOfABridge, AreNotAskedForAgainWhereNothingCounted) {
  constexpr auto kOther = cookie(Counted::in_unicast, 8);
  auto const ask = [&] { return totals.ask(connection, Devices::always, {}, soon()); };
  ask();
  // In the place of what is known.
  add({.table = kLookup, .cookie = kOther});
  EXPECT_TRUE(ask().contains(kCame));
  totals.forget();
  auto const anew = ask();
  EXPECT_FALSE(anew.contains(kCame));
  EXPECT_TRUE(anew.contains(kOther));
}

TEST_F(TotalsOfABridge, ComeWithWhetherAddressesAreRecent) {
  EXPECT_TRUE(totals.has_recent_sources());
  packets();
  EXPECT_FALSE(totals.has_recent_sources());
  add({.table = kRecentSources});
  packets();
  EXPECT_TRUE(totals.has_recent_sources());
}

}  // namespace
}  // namespace simhost::daemon
