// The row of the clock in SQL.
#include "storage/running/clock.h"

#include "storage/query.h"

namespace simhost::storage {

ClockRow get_clock(Transaction &transaction) {
  Query select(transaction, "SELECT stopped, value FROM clock");
  select.require_row();
  return {.stopped = select.flag(0), .value = select.time(1)};
}

void put_clock(ChangingTransaction &transaction, ClockRow const &row) {
  Change update(transaction, "UPDATE clock SET stopped = ?, value = ?");
  update.with(row.stopped).with(row.value.count()).run();
}

}  // namespace simhost::storage
