// Counters are rows of the state, by their names.
#include "planes/stored/counters.h"
#include "storage/store.h"

#include <algorithm>

namespace simhost::stored {

Counters counters_of(storage::Transaction &transaction, CounterOwner const &owner) {
  auto const kind = kind_of(owner);
  Counters counters;
  for (auto const &[name, value] : storage::all_counters(transaction, owner)) {
    // A state that somebody else wrote may hold any name and number.
    if (auto const *const counter = find_counter(kind, name)) {
      counters.set(*counter, std::min(value, counter->greatest));
    }
  }
  return counters;
}

void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                 Counter const &counter, std::uint64_t value) {
  storage::put_counter(transaction, owner, counter.name, value);
}

void add_to_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                    Counter const &counter, std::uint64_t more) {
  auto const value = std::min(storage::find_counter(transaction, owner, counter.name).value_or(0),
                              counter.greatest);
  set_counter(transaction, owner, counter, value + std::min(more, counter.greatest - value));
}

}  // namespace simhost::stored
