// The rows of the settings of the host as a whole: numbers and texts under names. One that was
// never set has no row.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace simhost::storage {

class Transaction;

std::optional<std::int64_t> find_host_number(Transaction &transaction, std::string_view name);
std::optional<std::string> find_host_text(Transaction &transaction, std::string_view name);
void put_host_number(Transaction &transaction, std::string_view name, std::int64_t value);
void put_host_text(Transaction &transaction, std::string_view name, std::string_view value);
void remove_host_settings(Transaction &transaction);

}  // namespace simhost::storage
