// The host's own clock: everything on the host that ages reads it. It shows real time until someone
// sets it, and can be stopped and stepped. Processes that share a state share its clock.
#pragma once

#include <chrono>

namespace simhost::storage {
class ChangingTransaction;
class Transaction;
}  // namespace simhost::storage

namespace simhost {

/// Since the beginning of 1970, for a clock that nobody has set.
using ClockTime = std::chrono::milliseconds;

ClockTime clock_now(storage::Transaction &transaction);
bool clock_is_stopped(storage::Transaction &transaction);
/// Stops the clock at what it shows.
void stop_clock(storage::ChangingTransaction &transaction);
/// Lets the clock run on from what it shows.
void run_clock(storage::ChangingTransaction &transaction);
/// Makes the clock a real one again.
void reset_clock(storage::ChangingTransaction &transaction);
/// Moves the clock forward, whether or not it runs. Refuses to move it back, or further than a time
/// of 64 bits reaches (QEX_BAD_PARAM).
void step_clock(storage::ChangingTransaction &transaction, ClockTime by);
/// Sets what the clock shows; refuses times before 1970 (QEX_BAD_PARAM).
void set_clock(storage::ChangingTransaction &transaction, ClockTime to);

}  // namespace simhost
