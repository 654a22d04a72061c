// What becomes of a bridge that is told changes, as Open vSwitch has it then.
#include "daemon/bridge/running_bridge.h"

#include <gmock/gmock.h>

#include "events/loop.h"
#include "lab.h"
#include "memory_state.h"
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

}  // namespace
}  // namespace simhost::daemon
