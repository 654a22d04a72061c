// One row of the state says all about the clock.
#include "clock/clock.h"

#include <cstdint>

#include "base/outcomes.h"
#include "storage/store.h"

namespace simhost {
namespace {

// What a clock may show: far enough from the edge that no sum of two such times overflows.
constexpr ClockTime kEnd{std::int64_t{1} << 61};

struct Row {
  bool stopped;
  ClockTime value;  // what it shows if it is stopped, else how far it is ahead of real time
};

Row row_of(storage::Transaction &transaction) {
  auto select = transaction.query("SELECT stopped, value FROM clock");
  select.next();
  return {.stopped = select.integer(0) != 0, .value = ClockTime(select.integer(1))};
}

void keep(storage::Transaction &transaction, Row const &row) {
  auto update = transaction.query("UPDATE clock SET stopped = ?, value = ?");
  update.with(std::int64_t{row.stopped}).with(row.value.count()).run();
}

ClockTime real_time() {
  return std::chrono::duration_cast<ClockTime>(std::chrono::system_clock::now().time_since_epoch());
}

ClockTime shown_by(Row const &row) {
  return row.stopped ? row.value : real_time() + row.value;
}

}  // namespace

ClockTime clock_now(storage::Transaction &transaction) {
  return shown_by(row_of(transaction));
}

bool clock_is_stopped(storage::Transaction &transaction) {
  return row_of(transaction).stopped;
}

void stop_clock(storage::Transaction &transaction) {
  keep(transaction, {.stopped = true, .value = clock_now(transaction)});
}

void run_clock(storage::Transaction &transaction) {
  keep(transaction, {.stopped = false, .value = clock_now(transaction) - real_time()});
}

void reset_clock(storage::Transaction &transaction) {
  keep(transaction, {.stopped = false, .value = ClockTime::zero()});
}

void step_clock(storage::Transaction &transaction, ClockTime by) {
  auto row = row_of(transaction);
  if (by < ClockTime::zero() || by > kEnd - shown_by(row)) {
    throw Refused(QEX_BAD_PARAM);
  }
  row.value += by;
  keep(transaction, row);
}

void set_clock(storage::Transaction &transaction, ClockTime to) {
  if (to < ClockTime::zero() || to > kEnd) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const row = row_of(transaction);
  keep(transaction, {.stopped = row.stopped, .value = row.stopped ? to : to - real_time()});
}

}  // namespace simhost
