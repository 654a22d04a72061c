// What the plane counts by itself, and what was put there from outside.
#pragma once

#include <cstdint>

#include "model/counters/counters.h"

namespace simhost::stored {

Counters counters_of(storage::Transaction &transaction, CounterOwner const &owner);
void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                 Counter const &counter, std::uint64_t value);
/// Counts on; a counter that is full stays full.
void add_to_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                    Counter const &counter, std::uint64_t more);

}  // namespace simhost::stored
