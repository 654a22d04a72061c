// What becomes of a bridge that is told changes, as Open vSwitch has it then.
#include "daemon/bridge/running_bridge.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <memory>
#include <ostream>
#include <string>
#include <tuple>
#include <vector>

#include "events/loop.h"
#include "lab.h"
#include "memory_state.h"
#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/openflow/text.h"
#include "spoiling_relay.h"

namespace simhost::daemon {
namespace {

using openflow::Flow;
using openflow::Match;
using openvswitch::soon;

constexpr std::uint64_t kSpoiled = 0x5b01;

Flow numbered(std::uint64_t number, std::uint64_t says) {
  return {.table = 1,
          .match = Match().with(openflow::Field::reg1, number),
          .cookie = number,
          .actions = {openflow::set(openflow::Field::reg2, says)}};
}

struct ARunningBridge : MemoryState {
  [[nodiscard]] WantedBridge wanted(std::vector<Flow> flows) const {
    return {.key = {},
            .alias = "lab",
            .row = {.name = bridge.name(), .datapath = "dummy"},
            .ports = {},
            .numbers = {},
            .sessions = {},
            .aging = std::chrono::seconds(300),
            .flows = std::make_shared<openvswitch::Compiled const>(
                openvswitch::Compiled{.rows = {}, .flows = std::move(flows), .groups = {}})};
  }

  openvswitch::Bridge bridge;
  openvswitch::SpoilingRelay relay{bridge.socket(), kSpoiled};
  events::Loop loop;
  Memory memory{store, [] {}};
  RunningBridge::Told told{.counted = [](auto, auto const &, auto const &) {},
                           .moved = [](auto, auto) {},
                           .altered = [](auto const &) {},
                           .strayed = [] {},
                           .lived = [] {},
                           .heard = [](auto, auto const &) {},
                           .disturbed = [](auto const &) {}};
  RunningBridge running{loop,  {.folder = relay.folder(), .lives = {}}, memory, told, wanted({}),
                        soon()};
};

TEST_F(ARunningBridge, IsAsBeforeWhenOpenVswitchRefusesOneOfTheChanges) {
  std::vector<std::uint64_t> forgotten;
  auto const forget = [&](auto const &, std::uint64_t generation) {
    forgotten.push_back(generation);
    return true;
  };
  running.apply(wanted({numbered(1, 1)}), 1, {}, forget, soon());
  running.apply(wanted({numbered(1, 2), numbered(2, 2)}), 2, {}, forget, soon());
  auto const before = bridge.flows();
  ASSERT_EQ(before.size(), 3);
  forgotten.clear();
  // Of forms that it has taken, so that the others of them are made.
  EXPECT_THROW(
      running.apply(wanted({numbered(1, 3), numbered(2, 2), numbered(3, 3), numbered(kSpoiled, 3)}),
                    3, {}, forget, soon()),
      openflow::HalfMade);
  EXPECT_EQ(bridge.flows(), before);
  EXPECT_THAT(forgotten, testing::ElementsAre(3, 2));
}

struct ALargeBridge : ARunningBridge {
  static std::vector<Flow> many_flows() {
    constexpr std::uint64_t kMany = 1500;
    std::vector<Flow> flows;
    for (std::uint64_t number = 1; number <= kMany; ++number) {
      flows.push_back(numbered(number, number));
    }
    std::ranges::sort(flows);
    return flows;
  }

  std::unique_ptr<RunningBridge> running_as(WantedBridge const &wanted) {
    return std::make_unique<RunningBridge>(
        loop, Place{.folder = bridge.socket().parent_path(), .lives = {}}, memory, told, wanted,
        soon());
  }

  static std::vector<std::string> texts_of(std::vector<Flow> flows, std::uint64_t generation) {
    flows.push_back(openvswitch::generation_marker(generation));
    std::vector<std::string> texts;
    for (auto const &flow : flows) {
      texts.push_back(to_text(flow));
    }
    std::ranges::sort(texts);
    return texts;
  }
};

TEST_F(ALargeBridge, IsToldEachFlowOnce) {
  auto const all = wanted(many_flows());
  auto const large = running_as(all);
  EXPECT_EQ(large->apply(all, 1, {}, nullptr, soon()), many_flows().size());
  EXPECT_EQ(bridge.flows(), texts_of(many_flows(), 1));
  EXPECT_EQ(large->apply(all, 1, {}, nullptr, soon()), 0U);
}

// Of two at one place Open vSwitch has one, as if somebody had taken a flow away.
TEST_F(ALargeBridge, IsPutRightIfItHasFewerFlowsThanItWasTold) {
  auto flows = many_flows();
  flows.insert(flows.begin(), flows.front());
  auto const all = wanted(flows);
  running_as(all)->apply(all, 1, {}, nullptr, soon());
  EXPECT_EQ(bridge.flows(), texts_of(many_flows(), 1));
}

struct Asked {
  char const *what;
  void (*ask)(RunningBridge &);

  friend void PrintTo(Asked const &asked, std::ostream *out) { *out << asked.what; }
};

struct ARunningBridgeThatIsAsked : ARunningBridge, testing::WithParamInterface<Asked> {};

// Which leaves nothing to read for whoever waits for more.
TEST_P(ARunningBridgeThatIsAsked, TellsWhatCameBeforeTheReply) {
  std::vector<std::string> altered;
  told.altered = [&](auto const &name) { altered.push_back(name); };
  running.apply(wanted({numbered(1, 1)}), 1, {}, nullptr, soon());
  openvswitch::Lab::shared().ovs_ofctl(
      {"-OOpenFlow15", "add-flow", "unix:" + bridge.socket().string(), "table=1,actions=drop"});
  GetParam().ask(running);
  loop.turn({});
  EXPECT_THAT(altered, testing::ElementsAre(bridge.name()));
}

INSTANTIATE_TEST_SUITE_P(
    All, ARunningBridgeThatIsAsked,
    testing::Values(
        Asked{"Send", [](RunningBridge &running) { running.send({}, soon()); }},
        Asked{"Count", [](RunningBridge &running) { running.count(Devices::always, soon()); }},
        Asked{"Strays", [](RunningBridge &running) { running.look_for_strays(soon()); }},
        Asked{"Learned", [](RunningBridge &running) { std::ignore = running.learned(soon()); }},
        Asked{"Age", [](RunningBridge &running) { std::ignore = running.age(soon()); }}),
    [](auto const &asked) { return asked.param.what; });

}  // namespace
}  // namespace simhost::daemon
