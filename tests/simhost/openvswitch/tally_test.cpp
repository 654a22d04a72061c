// What counters gain when flows count, begin anew and go.
#include "planes/openvswitch/counting/tally.h"

#include <gmock/gmock.h>

#include "planes/openvswitch/compile/pipeline.h"

namespace {

using namespace simhost::openvswitch;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

auto const kIn = cookie(Counted::in_unicast, 3);
auto const kDamaged = cookie(Counted::in_damaged, 3);
CountingPart const kPort{.port = 3};

// What it gains of those totals alone, with its name.
auto gained(Tally &tally, Totals const &now, CountedSessions const &sessions = {}) {
  tally.drop_gains();
  tally.count(now, sessions);
  std::vector<std::pair<std::string, std::uint64_t>> all;
  for (auto const &[part, counters] : tally.gains()) {
    for (auto const &[name, more] : counters) {
      all.emplace_back(part.session + std::to_string(part.port) + " " + std::string(name), more);
    }
  }
  return all;
}

TEST(Tally, GainsWhatCameSinceTheLastTime) {
  Tally tally(Totals{{kIn, {.packets = 2, .bytes = 120}}});
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 5, .bytes = 300}}}),
              ElementsAre(Pair("3 bytesInUnicast", 180), Pair("3 pktsInUnicast", 3)));
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 5, .bytes = 300}}}), IsEmpty());
}

TEST(Tally, GainsAllOfWhatBeganAnew) {
  Tally tally(Totals{{kIn, {.packets = 5, .bytes = 300}}});
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 2, .bytes = 3000}}}),
              ElementsAre(Pair("3 bytesInUnicast", 3000), Pair("3 pktsInUnicast", 2)));
  EXPECT_THAT(gained(tally, {}), IsEmpty());
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 4, .bytes = 4000}}}),
              ElementsAre(Pair("3 bytesInUnicast", 4000), Pair("3 pktsInUnicast", 4)));
}

TEST(Tally, KnowsNothingOfWhatWasThereFirst) {
  Tally tally;
  EXPECT_FALSE(tally.has_counted());
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 5, .bytes = 300}}}), IsEmpty());
  EXPECT_THAT(gained(tally, {{kIn, {.packets = 6, .bytes = 360}}}),
              ElementsAre(Pair("3 bytesInUnicast", 60), Pair("3 pktsInUnicast", 1)));
}

TEST(Tally, KnowsNothingOfWhatADeviceHadBefore) {
  Tally tally(Totals{});
  EXPECT_THAT(gained(tally, {{kDamaged, {.packets = 5}}}), IsEmpty());
  EXPECT_THAT(gained(tally, {{kDamaged, {.packets = 6}}}),
              ElementsAre(Pair("3 pktsInException", 1)));
}

TEST(Tally, CountsCopiesOfSessionsOrWhatHadNowhereToGo) {
  auto const of_session = cookie(Counted::mirrored, 0x801);
  Tally tally(Totals{});
  EXPECT_THAT(gained(tally, {{of_session, {.packets = 3}}}, {{0x801, {.sid = "s", .copies = 2}}}),
              ElementsAre(Pair("s0 mirrorPktCnt", 6), Pair("s0 mirroredPkts", 3)));
  EXPECT_THAT(gained(tally, {{of_session, {.packets = 4}}}, {{0x801, {.sid = "s", .copies = 0}}}),
              ElementsAre(Pair("s0 discardedPkts", 1)));
  CountedSessions const partly{{0x801, {.sid = "s", .copies = 1, .failed = 2}}};
  EXPECT_THAT(gained(tally, {{of_session, {.packets = 5}}}, partly),
              ElementsAre(Pair("s0 mirrorPktCnt", 1), Pair("s0 mirrorPktFailCnt", 2),
                          Pair("s0 mirroredPkts", 1)));
  CountedSessions const not_at_all{{0x801, {.sid = "s", .copies = 0, .failed = 2}}};
  EXPECT_THAT(gained(tally, {{of_session, {.packets = 6}}}, not_at_all),
              ElementsAre(Pair("s0 failedPkts", 1), Pair("s0 mirrorPktFailCnt", 2)));
  EXPECT_THAT(gained(tally, {{of_session, {.packets = 9}}}), IsEmpty());
}

TEST(Tally, CountsMoves) {
  Tally tally;
  tally.count_move(3);
  tally.count_move(3);
  EXPECT_EQ(tally.gains().at(kPort).of(simhost::counter_in(&VSPMACLearningStats::numMACsMoved)),
            2U);
}

}  // namespace
