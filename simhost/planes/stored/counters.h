// What the data plane counts: numbers under the names of the fields in which callers see them.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "model/plane.h"

namespace simhost::stored {

/// A name under which one kind of owner counts, and the largest number its field holds.
struct CounterName {
  std::string_view name;
  std::uint64_t greatest;
};

/// All names under which an owner of this kind counts.
std::span<CounterName const> counter_names(CounterOwner const &owner);

Counters counters_of(storage::Transaction &transaction, CounterOwner const &owner);
/// Refuses a name that the owner does not have (QEX_NOT_FOUND), and a number too large for it
/// (QEX_BAD_PARAM).
void set_counter(storage::Transaction &transaction, CounterOwner const &owner,
                 std::string_view name, std::uint64_t value);
/// Counts on; a counter that is full stays full.
void add_to_counter(storage::Transaction &transaction, CounterOwner const &owner,
                    std::string_view name, std::uint64_t more);
/// The mirror sessions of a switch that have counted.
std::vector<std::string> counting_sessions(storage::Transaction &transaction,
                                           storage::SwitchKey key);
void forget_counters(storage::Transaction &transaction);

}  // namespace simhost::stored
