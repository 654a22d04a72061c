// The host's clock: real until it is touched, exact from then on.
#include "core/clock.h"

#include <chrono>
#include <thread>

#include "memory_state.h"

namespace {

using simhost::ClockTime;
using std::chrono::milliseconds;
using std::chrono::seconds;

struct Clock : MemoryState {
  simhost::store::Transaction work{store, simhost::store::Access::write};
};

ClockTime real_time() {
  return std::chrono::duration_cast<ClockTime>(std::chrono::system_clock::now().time_since_epoch());
}

TEST_F(Clock, ShowsRealTimeAtFirst) {
  auto const before = real_time();
  auto const shown = simhost::clock_now(work);
  EXPECT_LE(before, shown);
  EXPECT_LE(shown, real_time());
  EXPECT_FALSE(simhost::clock_is_stopped(work));
}

TEST_F(Clock, StandsStillWhenStopped) {
  simhost::stop_clock(work);
  auto const shown = simhost::clock_now(work);
  std::this_thread::sleep_for(milliseconds(5));
  EXPECT_EQ(simhost::clock_now(work), shown);
  EXPECT_TRUE(simhost::clock_is_stopped(work));
}

TEST_F(Clock, StepsExactly) {
  simhost::stop_clock(work);
  simhost::set_clock(work, seconds(7));
  simhost::step_clock(work, milliseconds(1));
  EXPECT_EQ(simhost::clock_now(work), milliseconds(7001));
}

TEST_F(Clock, StepsWhileItRuns) {
  auto const before = real_time();
  simhost::step_clock(work, seconds(1000));
  EXPECT_GE(simhost::clock_now(work), before + seconds(1000));
  EXPECT_LE(simhost::clock_now(work), real_time() + seconds(1000));
}

TEST_F(Clock, RunsOnFromWhatItShows) {
  simhost::stop_clock(work);
  simhost::set_clock(work, seconds(7));
  auto const before = real_time();
  simhost::run_clock(work);
  std::this_thread::sleep_for(milliseconds(5));
  auto const shown = simhost::clock_now(work);
  EXPECT_GE(shown, seconds(7) + milliseconds(5));
  EXPECT_LE(shown, seconds(7) + (real_time() - before) + milliseconds(1));
}

TEST_F(Clock, NeverGoesBackByAStep) {
  EXPECT_EQ(status_of([&] { simhost::step_clock(work, milliseconds(-1)); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::step_clock(work, ClockTime::max()); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::set_clock(work, milliseconds(-1)); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::set_clock(work, ClockTime::max()); }), QEX_BAD_PARAM);
}

}  // namespace
