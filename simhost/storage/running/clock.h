// The row of the host's clock.
#pragma once

#include <chrono>

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

struct ClockRow {
  bool stopped;
  /// What it shows if it is stopped, else how far it is ahead of real time.
  std::chrono::milliseconds value;
};

ClockRow get_clock(Transaction &transaction);
void put_clock(ChangingTransaction &transaction, ClockRow const &row);

}  // namespace simhost::storage
