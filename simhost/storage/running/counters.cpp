// Counters in SQL, whose integers are signed: the greatest ones are negative there.
#include "storage/running/counters.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

#define OF_OWNER "WHERE switch = ? AND ifnull(port, 0) = ? AND session = ?"

// 0 stands for "no port" in the index as well: no port has that number.
void bind_owner(Query &query, CounterOwner const &owner) {
  query.with(owner.switch_key).with(owner.port.value_or(PortNumber{})).with(owner.session);
}

std::uint64_t value_at(Query const &row, int column) {
  return static_cast<std::uint64_t>(row.integer(column));
}

}  // namespace

std::vector<CounterRow> all_counters(Transaction &transaction, CounterOwner const &owner) {
  Query select(transaction, "SELECT name, value FROM counter " OF_OWNER " ORDER BY name");
  bind_owner(select, owner);
  return select.all(
      [](Query const &row) { return CounterRow{.name = row.text(0), .value = value_at(row, 1)}; });
}

std::map<PortNumber, std::vector<CounterRow>> counters_of_ports(Transaction &transaction,
                                                                SwitchKey key) {
  std::map<PortNumber, std::vector<CounterRow>> counters;
  Query select(transaction,
               "SELECT port, name, value FROM counter"
               " WHERE switch = ? AND port IS NOT NULL AND session = '' ORDER BY port, name");
  select.with(key);
  while (select.next()) {
    counters[select.port_number(0)].push_back(
        {.name = select.text(1), .value = value_at(select, 2)});
  }
  return counters;
}

std::optional<std::uint64_t> find_counter(Transaction &transaction, CounterOwner const &owner,
                                          std::string_view name) {
  Query select(transaction, "SELECT value FROM counter " OF_OWNER " AND name = ?");
  bind_owner(select, owner);
  return select.with(name).first([](Query const &row) { return value_at(row, 0); });
}

void put_counter(ChangingTransaction &transaction, CounterOwner const &owner, std::string_view name,
                 std::uint64_t value) {
  Change upsert(
      transaction,
      "INSERT INTO counter (switch, port, session, name, value) VALUES (?, nullif(?, 0), ?, ?, ?)"
      " ON CONFLICT (switch, ifnull(port, 0), session, name) DO UPDATE SET value = excluded.value");
  bind_owner(upsert, owner);
  upsert.with(name).with(static_cast<std::int64_t>(value)).run();
}

std::vector<std::string> sessions_with_counters(Transaction &transaction, SwitchKey key) {
  Query select(
      transaction,
      "SELECT DISTINCT session FROM counter WHERE switch = ? AND session <> '' ORDER BY session");
  return select.with(key).all([](Query const &row) { return row.text(0); });
}

void remove_counters(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM counter").run();
  Change(transaction, "DELETE FROM reading").run();
}

}  // namespace simhost::storage
