// The host's clock: real until it is touched, exact from then on.
#include "clock/clock.h"

#include <chrono>
#include <cstdint>
#include <thread>

#include "memory_state.h"
#include "storage/running/clock.h"

namespace {

using simhost::ClockTime;
using std::chrono::milliseconds;
using std::chrono::seconds;

struct Clock : MemoryState {
  simhost::storage::ChangingTransaction transaction{store};
};

ClockTime real_time() {
  return std::chrono::duration_cast<ClockTime>(std::chrono::system_clock::now().time_since_epoch());
}

TEST_F(Clock, ShowsRealTimeAtFirst) {
  auto const before = real_time();
  auto const shown = simhost::clock_now(transaction);
  EXPECT_LE(before, shown);
  EXPECT_LE(shown, real_time());
  EXPECT_FALSE(simhost::clock_is_stopped(transaction));
}

TEST_F(Clock, StandsStillWhenStopped) {
  simhost::stop_clock(transaction);
  auto const shown = simhost::clock_now(transaction);
  std::this_thread::sleep_for(milliseconds(5));
  EXPECT_EQ(simhost::clock_now(transaction), shown);
  EXPECT_TRUE(simhost::clock_is_stopped(transaction));
}

TEST_F(Clock, StepsExactly) {
  simhost::stop_clock(transaction);
  simhost::set_clock(transaction, seconds(7));
  simhost::step_clock(transaction, milliseconds(1));
  EXPECT_EQ(simhost::clock_now(transaction), milliseconds(7001));
}

TEST_F(Clock, StepsWhileItRuns) {
  auto const before = real_time();
  simhost::step_clock(transaction, seconds(1000));
  EXPECT_GE(simhost::clock_now(transaction), before + seconds(1000));
  EXPECT_LE(simhost::clock_now(transaction), real_time() + seconds(1000));
}

TEST_F(Clock, RunsOnFromWhatItShows) {
  simhost::stop_clock(transaction);
  simhost::set_clock(transaction, seconds(7));
  auto const before = real_time();
  simhost::run_clock(transaction);
  std::this_thread::sleep_for(milliseconds(5));
  auto const shown = simhost::clock_now(transaction);
  EXPECT_GE(shown, seconds(7) + milliseconds(5));
  EXPECT_LE(shown, seconds(7) + (real_time() - before) + milliseconds(1));
}

TEST_F(Clock, NeverStepsBack) {
  EXPECT_EQ(status_of([&] { simhost::step_clock(transaction, milliseconds(-1)); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::step_clock(transaction, ClockTime::max()); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::set_clock(transaction, milliseconds(-1)); }), QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] { simhost::set_clock(transaction, ClockTime::max()); }), QEX_BAD_PARAM);
}

TEST_F(Clock, ShowsNothingThatCannotBeSet) {
  using simhost::storage::put_clock;
  constexpr std::chrono::hours kLong{24 * 365 * 1000};
  for (bool const stopped : {false, true}) {
    put_clock(transaction, {.stopped = stopped, .value = -kLong});
    EXPECT_EQ(simhost::clock_now(transaction), ClockTime::zero());
    put_clock(transaction, {.stopped = stopped, .value = ClockTime(std::int64_t{3} << 60)});
    auto const end = simhost::clock_now(transaction);
    EXPECT_EQ(status_of([&] { simhost::set_clock(transaction, end); }), QEX_OK);
    EXPECT_EQ(status_of([&] { simhost::step_clock(transaction, milliseconds(1)); }), QEX_BAD_PARAM);
  }
}

}  // namespace
