// How many of a hundred frames came in damaged, by what a device has counted.
#include "daemon/devices/damaged_frames.h"

#include <gtest/gtest.h>

namespace {

using namespace std::chrono_literals;
using simhost::daemon::DamagedFrames;
using simhost::events::Clock;

class TheDamagedFrames : public testing::Test {
 protected:
  void count(Clock::duration at, std::uint64_t whole, std::uint64_t damaged) {
    frames.count(Clock::time_point(1h) + at, {.whole = whole, .damaged = damaged});
  }

  DamagedFrames frames;
};

TEST_F(TheDamagedFrames, AreOfWhatCameSinceTheyAreCounted) {
  EXPECT_EQ(frames.percent(), std::nullopt);
  count(0s, 1000, 1000);
  EXPECT_EQ(frames.percent(), std::nullopt);
  count(2s, 1095, 1005);
  EXPECT_EQ(frames.percent(), 5U);
  count(4s, 1095, 1100);
  EXPECT_EQ(frames.percent(), 52U);  // 100 of 195
}

TEST_F(TheDamagedFrames, AreMoreThanALimitIfOneMoreIs) {
  count(0s, 0, 0);
  count(2s, 94'999, 5'001);
  EXPECT_EQ(frames.percent(), 6U);
}

TEST_F(TheDamagedFrames, MayBeAllOrNone) {
  count(0s, 0, 0);
  count(2s, 0, 3);
  EXPECT_EQ(frames.percent(), 100U);
  count(20s, 7, 3);
  EXPECT_EQ(frames.percent(), 0U);
}

TEST_F(TheDamagedFrames, AreThoseOfTenSeconds) {
  count(0s, 0, 0);
  count(2s, 0, 10);
  for (int second = 4; second <= 10; second += 2) {
    count(second * 1s, 10, 10);
    EXPECT_EQ(frames.percent(), 50U);
  }
  count(12s, 20, 10);
  EXPECT_EQ(frames.percent(), 0U);
}

TEST_F(TheDamagedFrames, AreAsManyAsBeforeWhileNoneCome) {
  count(0s, 0, 0);
  count(2s, 90, 10);
  for (int second = 4; second < 60; second += 2) {
    count(second * 1s, 90, 10);
  }
  EXPECT_EQ(frames.percent(), 10U);
}

TEST_F(TheDamagedFrames, BeginAnewWithTheirDevice) {
  count(0s, 500, 0);
  count(2s, 500, 100);
  count(4s, 10, 0);
  EXPECT_EQ(frames.percent(), 100U);
  count(6s, 20, 0);
  EXPECT_EQ(frames.percent(), 0U);
}

}  // namespace
