// Faults on demand: what is to happen to chosen calls of a function instead of what they do. They
// wait in the state, so that processes that share it share them and their counts.
#pragma once

#include <chrono>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "storage/running/faults.h"

namespace simhost {

using storage::Fault;
using storage::WaitingFault;

/// The most that a fault, or all that hit one call, may delay it.
inline constexpr std::chrono::milliseconds kLongestDelay = std::chrono::hours(1);

/// Refuses a function that the host does not have (QEX_NOT_FOUND); Panic, and a status for a call
/// that returns none (QEX_NOT_SUPPORTED); an unknown exception, both a status and an exception, no
/// effect at all, calls that are none, and a delay that is negative or longer
/// than kLongestDelay (QEX_BAD_PARAM).
void add_fault(storage::ChangingTransaction &transaction, Fault const &fault);
std::vector<WaitingFault> waiting_faults(storage::Transaction &transaction);
/// Removes the faults of a function, or all if it is empty. Refuses a function that no fault can
/// hit, as add_fault does.
void clear_faults(storage::ChangingTransaction &transaction, std::string_view function);

/// Whether a fault waits for calls of a function.
bool any_fault_waits(storage::Transaction &transaction, std::string_view function);
/// Counts a call of a function that is being made. Returns the faults that hit it.
std::vector<Fault> count_call(storage::ChangingTransaction &transaction, std::string_view function);
/// How long a call waits that they hit: for all of them, but kLongestDelay at most.
std::chrono::milliseconds delay_of(std::vector<Fault> const &hits);
/// Does to a call what the faults that hit it say: throws Refused or Trapped.
void inject(std::vector<Fault> const &hits);

}  // namespace simhost
