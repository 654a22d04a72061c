// The rows of the counters: numbers under names; one that has counted nothing has no row.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "storage/ports.h"

namespace simhost::storage {

/// What counts: a switch, one of its ports, or one of its mirror sessions.
struct CounterOwner {
  SwitchKey switch_key;
  std::optional<PortNumber> port = std::nullopt;
  std::string session = {};
};

struct CounterRow {
  std::string name;
  std::uint64_t value;
};

/// The counters of an owner, in the order of their names.
std::vector<CounterRow> all_counters(Transaction &transaction, CounterOwner const &owner);
/// Those of all ports of a switch that have counted, likewise.
std::map<PortNumber, std::vector<CounterRow>> counters_of_ports(Transaction &transaction,
                                                                SwitchKey key);
std::optional<std::uint64_t> find_counter(Transaction &transaction, CounterOwner const &owner,
                                          std::string_view name);
/// Sets a counter, whether or not it was there.
void put_counter(ChangingTransaction &transaction, CounterOwner const &owner, std::string_view name,
                 std::uint64_t value);
/// The mirror sessions of a switch that have counted, in the order of their names.
std::vector<std::string> sessions_with_counters(Transaction &transaction, SwitchKey key);
/// What the data path had counted is forgotten with them.
void remove_counters(ChangingTransaction &transaction);

}  // namespace simhost::storage
