// The rows of the faults that wait for calls.
#pragma once

#include <chrono>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "qexapi/status.h"

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

/// One or more of a delay, and a status or an exception. A call that several faults hit waits for
/// all their delays and ends with the first status or exception.
struct Fault {
  static constexpr std::int64_t kForever = std::numeric_limits<std::int64_t>::max();

  std::string function;
  std::int64_t first = 1;  ///< the first call that is hit, counted from the next one as 1
  std::int64_t last = 1;   ///< the last one
  std::chrono::milliseconds delay{0};  ///< in real time
  QEX_ReturnStatus status = QEX_OK;    ///< QEX_OK for none
  std::string exception = {};          ///< such as "OSError"; empty for none
  std::string message = {};            ///< of the exception
};

struct WaitingFault {
  Fault fault;
  std::int64_t seen;  ///< calls since it was added
};

void insert_fault(ChangingTransaction &transaction, Fault const &fault);
/// All faults, in the order in which they were added.
std::vector<WaitingFault> all_faults(Transaction &transaction);
/// Whether a function has a fault.
bool has_fault(Transaction &transaction, std::string_view function);
/// Counts a call of a function for its faults. Returns those that hit the call, in the order in
/// which they were added; a fault that hits no further call is gone.
std::vector<Fault> count_for_faults(ChangingTransaction &transaction, std::string_view function);
/// Removes the faults of a function.
void remove_faults(ChangingTransaction &transaction, std::string_view function);
void remove_all_faults(ChangingTransaction &transaction);

}  // namespace simhost::storage
