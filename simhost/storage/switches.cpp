// Switch rows in SQL.
#include "storage/switches.h"

#include "storage/store.h"

namespace simhost::storage {
namespace {

std::string_view query_by(SwitchName kind) {
  switch (kind) {
    case SwitchName::alias:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent,"
             " associated FROM switch WHERE alias = ?";
    case SwitchName::identifier:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent,"
             " associated FROM switch WHERE identifier = ?";
    case SwitchName::portset:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent,"
             " associated FROM switch WHERE portset = ?";
  }
  __builtin_unreachable();
}

// Of a row with the columns that query_by() selects.
FoundSwitch switch_at(Query const &query) {
  return {.key = SwitchKey{query.integer(0)},
          .row = {.alias = query.text(1),
                  .identifier = query.text(2),
                  .portset = query.text(3),
                  .max_ports = query.number<std::uint32_t>(4),
                  .version = query.number<std::uint32_t>(5),
                  .persistent = query.flag(6),
                  .associated = query.flag(7)}};
}

}  // namespace

std::optional<SwitchKey> add_switch(Transaction &transaction, Switch const &row) {
  auto insert = transaction.query(
      "INSERT INTO switch (alias, identifier, portset, max_ports, version, persistent, associated)"
      " VALUES (?, ?, ?, ?, ?, ?, ?) ON CONFLICT DO NOTHING");
  insert.with(row.alias).with(row.identifier).with(row.portset);
  insert.with(row.max_ports).with(row.version).with(std::int64_t{row.persistent});
  insert.with(std::int64_t{row.associated});
  if (insert.run() == 0) {
    return std::nullopt;
  }
  return SwitchKey{transaction.last_key()};
}

std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchName kind,
                                       std::string_view name) {
  auto select = transaction.query(query_by(kind));
  if (!select.with(name).next()) {
    return std::nullopt;
  }
  return switch_at(select);
}

std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchKey key) {
  auto select = transaction.query(
      "SELECT key, alias, identifier, portset, max_ports, version, persistent, associated"
      " FROM switch WHERE key = ?");
  if (!select.with(std::int64_t(key)).next()) {
    return std::nullopt;
  }
  return switch_at(select);
}

std::optional<FoundSwitch> next_switch(Transaction &transaction, SwitchKey key) {
  auto select = transaction.query(
      "SELECT key, alias, identifier, portset, max_ports, version, persistent, associated"
      " FROM switch WHERE key > ? ORDER BY key LIMIT 1");
  if (!select.with(std::int64_t(key)).next()) {
    return std::nullopt;
  }
  return switch_at(select);
}

std::vector<FoundSwitch> all_switches(Transaction &transaction) {
  auto select = transaction.query(
      "SELECT key, alias, identifier, portset, max_ports, version, persistent, associated"
      " FROM switch ORDER BY key");
  std::vector<FoundSwitch> all;
  while (select.next()) {
    all.push_back(switch_at(select));
  }
  return all;
}

bool rename_switch(Transaction &transaction, SwitchKey key, std::string_view alias) {
  auto update = transaction.query("UPDATE OR IGNORE switch SET alias = ? WHERE key = ?");
  return update.with(alias).with(std::int64_t(key)).run() != 0;
}

void set_version(Transaction &transaction, SwitchKey key, std::uint32_t version) {
  auto update = transaction.query("UPDATE switch SET version = ? WHERE key = ?");
  update.with(version).with(std::int64_t(key)).run();
}

void set_max_ports(Transaction &transaction, SwitchKey key, std::uint32_t max_ports) {
  auto update = transaction.query("UPDATE switch SET max_ports = ? WHERE key = ?");
  update.with(max_ports).with(std::int64_t(key)).run();
}

void set_associated(Transaction &transaction, SwitchKey key, bool associated) {
  auto update = transaction.query("UPDATE switch SET associated = ? WHERE key = ?");
  update.with(std::int64_t{associated}).with(std::int64_t(key)).run();
}

void remove_switch(Transaction &transaction, SwitchKey key) {
  transaction.query("DELETE FROM switch WHERE key = ?").with(std::int64_t(key)).run();
}

}  // namespace simhost::storage
