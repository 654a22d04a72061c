// Announcements are counted at the time that the host's clock showed when they went out.
#include "daemon/counting/announced.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <thread>

#include "clock/clock.h"
#include "memory_state.h"
#include "named_switch.h"
#include "planes/stored/counters.h"
#include "storage/running/counters.h"
#include "storage/running/readings.h"

namespace {

using namespace std::chrono_literals;
using simhost::ClockTime;
using simhost::counter_in;
using simhost::daemon::AnnouncedCounts;
using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::SwitchKey;

struct Announcements : MemoryState {
  Announcements() {
    ChangingTransaction transaction(store);
    key = simhost::storage::add_switch(transaction, named("s")).value();
    simhost::storage::put_readings(transaction, key, {});
    transaction.commit();
  }

  void set_clock(ClockTime to, bool stops) {
    ChangingTransaction transaction(store);
    // One that runs would go on between the two.
    if (stops) {
      simhost::stop_clock(transaction);
    }
    simhost::set_clock(transaction, to);
    transaction.commit();
  }

  simhost::Counters counters() {
    ReadingTransaction transaction(store);
    return simhost::stored::counters_of(transaction, {.switch_key = key});
  }

  SwitchKey key{};
  AnnouncedCounts announced{store};
};

TEST_F(Announcements, WentOutWhenTheStoppedClockSays) {
  constexpr ClockTime kStopped = 5s;
  set_clock(kStopped, true);
  announced.add(key, 3);
  std::this_thread::sleep_for(10ms);
  ASSERT_TRUE(announced.save());
  EXPECT_EQ(counters().of(counter_in(&VSRARPStats::rarpPktsSent)), 3U);
  EXPECT_EQ(counters().of(counter_in(&VSRARPStats::rarpTime)),
            static_cast<std::uint64_t>(kStopped.count()));
}

TEST_F(Announcements, AreNoneOfASwitchThatBeganAnew) {
  announced.add(key, 3);
  {
    ChangingTransaction transaction(store);
    simhost::storage::remove_counters(transaction);
    transaction.commit();
  }
  ASSERT_TRUE(announced.save());
  EXPECT_EQ(counters().of(counter_in(&VSRARPStats::rarpPktsSent)), 0U);
}

TEST_F(Announcements, AreNoneOfASwitchThatHasNewReadingsByNow) {
  announced.add(key, 3);
  {
    ChangingTransaction transaction(store);
    simhost::storage::remove_counters(transaction);
    announced.follow(transaction);
    simhost::storage::put_readings(transaction, key, {});
    transaction.commit();
  }
  ASSERT_TRUE(announced.save());
  EXPECT_EQ(counters().of(counter_in(&VSRARPStats::rarpPktsSent)), 0U);
}

TEST_F(Announcements, WentOutNoEarlierThanTheClockBegins) {
  announced.add(key, 1);
  std::this_thread::sleep_for(100ms);
  set_clock(ClockTime::zero(), false);
  ASSERT_TRUE(announced.save());
  EXPECT_LE(counters().of(counter_in(&VSRARPStats::rarpTime)), std::uint64_t{60'000});
}

}  // namespace
