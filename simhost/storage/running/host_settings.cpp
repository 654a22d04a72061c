// Host settings in SQL.
#include "storage/running/host_settings.h"

#include <fmt/format.h>

#include "storage/query.h"

namespace simhost::storage {
namespace {

template <typename Value>
void put_value(ChangingTransaction &transaction, std::string_view name, Value const &value) {
  Change(transaction,
         "INSERT INTO host_setting (name, value) VALUES (?, ?)"
         " ON CONFLICT (name) DO UPDATE SET value = excluded.value")
      .with(name)
      .with(value)
      .run();
}

template <typename Read>
auto find_value(Transaction &transaction, std::string_view name, Read const &read) {
  return Query(transaction, "SELECT value FROM host_setting WHERE name = ?")
      .with(name)
      .of_setting(name)
      .first(read);
}

}  // namespace

std::optional<std::int64_t> find_host_number(Transaction &transaction, std::string_view name,
                                             std::int64_t least, std::int64_t greatest) {
  return find_value(transaction, name,
                    [&](Query const &row) { return row.integer(0, least, greatest); });
}

std::optional<std::string> find_host_text(Transaction &transaction, std::string_view name,
                                          bool (*is_one)(std::string const &text)) {
  return find_value(transaction, name, [&](Query const &row) {
    auto text = row.text(0);
    if (!is_one(text)) {
      row.refuse(0, fmt::format("'{}'", text));
    }
    return text;
  });
}

void put_host_number(ChangingTransaction &transaction, std::string_view name, std::int64_t value) {
  put_value(transaction, name, value);
}

void put_host_text(ChangingTransaction &transaction, std::string_view name,
                   std::string_view value) {
  put_value(transaction, name, value);
}

void remove_host_settings(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM host_setting").run();
}

}  // namespace simhost::storage
