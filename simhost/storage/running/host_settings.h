// The rows of the settings of the host as a whole: numbers and texts under names. One that was
// never set has no row.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace simhost::storage {

class ChangingTransaction;
class Transaction;

/// Throws UnusableState, which names the setting, for what is no number within these bounds.
std::optional<std::int64_t> find_host_number(Transaction &transaction, std::string_view name,
                                             std::int64_t least, std::int64_t greatest);
/// Likewise for what is no text, and for one that `is_one` does not take.
std::optional<std::string> find_host_text(Transaction &transaction, std::string_view name,
                                          bool (*is_one)(std::string const &text));
void put_host_number(ChangingTransaction &transaction, std::string_view name, std::int64_t value);
void put_host_text(ChangingTransaction &transaction, std::string_view name, std::string_view value);
void remove_host_settings(ChangingTransaction &transaction);

}  // namespace simhost::storage
