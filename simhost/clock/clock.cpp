// One row of the state says all about the clock.
#include "clock/clock.h"

#include <algorithm>
#include <cstdint>

#include "base/outcomes.h"
#include "storage/running/clock.h"
#include "storage/store.h"

namespace simhost {
namespace {

// What a clock may show: far enough from the edge that no sum of two such times overflows.
constexpr ClockTime kEnd{std::int64_t{1} << 61};

ClockTime real_time() {
  return std::chrono::duration_cast<ClockTime>(std::chrono::system_clock::now().time_since_epoch());
}

// At its end a clock stands, and before its beginning: it shows nothing that cannot be set.
ClockTime shown_by(storage::ClockRow const &row) {
  return std::clamp(row.stopped ? row.value : real_time() + row.value, ClockTime::zero(), kEnd);
}

}  // namespace

ClockTime clock_now(storage::Transaction &transaction) {
  return shown_by(storage::get_clock(transaction));
}

bool clock_is_stopped(storage::Transaction &transaction) {
  return storage::get_clock(transaction).stopped;
}

void stop_clock(storage::ChangingTransaction &transaction) {
  storage::put_clock(transaction, {.stopped = true, .value = clock_now(transaction)});
}

void run_clock(storage::ChangingTransaction &transaction) {
  storage::put_clock(transaction,
                     {.stopped = false, .value = clock_now(transaction) - real_time()});
}

void reset_clock(storage::ChangingTransaction &transaction) {
  storage::put_clock(transaction, {.stopped = false, .value = ClockTime::zero()});
}

void step_clock(storage::ChangingTransaction &transaction, ClockTime by) {
  auto row = storage::get_clock(transaction);
  if (by < ClockTime::zero() || by > kEnd - shown_by(row)) {
    throw Refused(QEX_BAD_PARAM);
  }
  row.value += by;
  storage::put_clock(transaction, row);
}

void set_clock(storage::ChangingTransaction &transaction, ClockTime to) {
  if (to < ClockTime::zero() || to > kEnd) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const row = storage::get_clock(transaction);
  storage::put_clock(transaction,
                     {.stopped = row.stopped, .value = row.stopped ? to : to - real_time()});
}

}  // namespace simhost
