// How old addresses are, by what Open vSwitch says and by what was known before.
#include "daemon/learned/ageing.h"

#include <gtest/gtest.h>

#include <array>

namespace {

using namespace simhost::daemon;
using namespace std::chrono_literals;
using simhost::openflow::FlowEntry;
using simhost::storage::SeenAt;

constexpr SeenAt kNow = 1000000s;

FlowEntry flow(std::uint64_t packets, std::chrono::seconds age, std::chrono::seconds unused) {
  FlowEntry entry;
  entry.traffic.packets = packets;
  entry.age = age;
  entry.unused = unused;
  return entry;
}

TEST(Unseen, IsWhatAFlowSaysThatCountedFrames) {
  Sighting const before{.seen = kNow - 500s, .flow_age = 90s, .unseen = 80s};
  EXPECT_EQ(unseen(flow(1, 100s, 3s), before, kNow), 3s);
  EXPECT_EQ(unseen(flow(1, 100s, 65534s), before, kNow), 65534s);
}

TEST(Unseen, GoesOnWhereAFlowSaysNoMore) {
  Sighting const before{.seen = std::nullopt, .flow_age = 70000s, .unseen = 60000s};
  EXPECT_EQ(unseen(flow(1, 80000s, 65535s), before, kNow), 70000s);
  // Likewise of one that has counted nothing yet.
  EXPECT_EQ(unseen(flow(0, 70010s, 10s), before, kNow), 60010s);
}

TEST(Unseen, BeganBeforeAFlowThatWasMadeAnew) {
  Sighting const before{.seen = kNow - 500s, .flow_age = 90s, .unseen = 80s};
  EXPECT_EQ(unseen(flow(0, 5s, 5s), before, kNow), 500s);
  EXPECT_EQ(unseen(flow(0, 5s, 5s), Sighting{}, kNow), 5s);
  // A clock that was set back makes nothing younger than its flow.
  EXPECT_EQ(unseen(flow(0, 5s, 5s), Sighting{.seen = kNow + 1h}, kNow), 5s);
}

TEST(Aged, IsWhatWasNotSeenForTheTimeThatIsSet) {
  EXPECT_FALSE(is_aged(299s, 300s));
  EXPECT_TRUE(is_aged(300s, 300s));
}

TEST(NextLook, IsBeforeAnythingIsTooOld) {
  auto const after = [](std::chrono::seconds aging, Unseen oldest) {
    return next_look(
        std::array{Source{.flow = {}, .unseen = 0s}, Source{.flow = {}, .unseen = oldest}}, aging);
  };
  EXPECT_EQ(after(100s, 0s), 10s);
  EXPECT_EQ(after(100s, 93s), 7s);
  EXPECT_EQ(after(70000s, 0s), 30s);
  // However little time is left.
  EXPECT_EQ(after(100s, 99900ms), 1s);
}

}  // namespace
