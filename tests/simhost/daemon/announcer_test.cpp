// Who is announced, of more than there is room for.
#include "daemon/announcer.h"

#include <gmock/gmock.h>

#include <cstddef>
#include <cstdint>
#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "memory_state.h"

namespace {

using simhost::daemon::Announcer;
using simhost::daemon::Memory;
using simhost::daemon::Wanted;
using simhost::daemon::WantedBridge;
using simhost::openvswitch::Announced;
using simhost::storage::SwitchKey;
using testing::Each;
using testing::Field;
using testing::SizeIs;

constexpr SwitchKey kSwitch{1};

/// A trunk of all VLANs with a client, whose frames leave over a link.
simhost::daemon::Carried trunk(std::uint32_t number, std::uint32_t link) {
  simhost::daemon::Carried carried{.number = number,
                                   .device = "c" + std::to_string(number),
                                   .links = {link},
                                   .slots = {{link}, {link + 1}},
                                   .is_announced = true,
                                   .client = {.port = number, .number = number},
                                   .vlan = {}};
  carried.client.address = {
      2, 0, 0, 0, static_cast<std::uint8_t>(number >> 8U), static_cast<std::uint8_t>(number)};
  carried.vlan.carried.emplace().set();
  return carried;
}

struct AnAnnouncer : MemoryState {
  void follow(std::uint32_t ports, std::uint32_t link) {
    Wanted wanted;
    wanted.most_announced = 1;
    WantedBridge bridge{};
    bridge.key = kSwitch;
    for (std::uint32_t number = 1; number <= ports; ++number) {
      bridge.carried.push_back(trunk(number, link));
    }
    wanted.bridges.push_back(bridge);
    announcer.follow(wanted, memory, [this](SwitchKey key, std::uint32_t port) {
      return key == kSwitch && !dead.contains(port);
    });
  }

  simhost::events::Loop loop;
  Memory memory{store, [] {}};
  std::set<std::uint32_t> dead;  // links that Open vSwitch does not see
  std::vector<Announced> sent;
  Announcer announcer{loop, [this](SwitchKey, std::vector<Announced> const &some) {
                        sent.insert(sent.end(), some.begin(), some.end());
                      }};
};

TEST_F(AnAnnouncer, TellsOfEachPortBeforeItTellsOfAnyInAnotherVlan) {
  follow(2, 1);
  ASSERT_THAT(sent, SizeIs(0));
  follow(2, 2);
  EXPECT_THAT(sent, SizeIs(1));
  EXPECT_THAT(sent, Each(Field(&Announced::vlan, 0)));
}

TEST_F(AnAnnouncer, WaitsForOpenVSwitchToSeeALink) {
  follow(1, 1);
  dead = {3};
  follow(1, 2);
  EXPECT_THAT(sent, SizeIs(0));
  dead = {};
  follow(1, 2);
  EXPECT_THAT(sent, SizeIs(1));
}

TEST_F(AnAnnouncer, TellsNothingOfALinkThatGoesBeforeItIsSeen) {
  follow(1, 1);
  dead = {2};
  follow(1, 2);
  dead = {};
  follow(1, 1);
  EXPECT_THAT(sent, SizeIs(0));
}

// In kB; the most since it was asked to forget that.
std::size_t most_memory() {
  std::ifstream status("/proc/self/status");
  std::string word;
  std::size_t size = 0;
  while (status >> word && word != "VmHWM:") {
  }
  status >> size;
  return size;
}

TEST_F(AnAnnouncer, LooksForNoMoreThanThereIsRoomFor) {
  constexpr std::uint32_t kPorts = 1000;
  follow(kPorts, 1);
  ASSERT_TRUE(std::ofstream("/proc/self/clear_refs") << "5" << std::flush);
  auto const before = most_memory();
  ASSERT_GT(before, 0U);
  follow(kPorts, 2);
  EXPECT_THAT(sent, SizeIs(1));
  // The names of the VLANs alone would be 8 MB.
  EXPECT_LT(most_memory(), before + std::size_t{64} * 1024);
}

}  // namespace
