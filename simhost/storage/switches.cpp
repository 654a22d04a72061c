// Switch rows in SQL.
#include "storage/switches.h"

#include <utility>

#include "storage/query.h"

namespace simhost::storage {
namespace {

// What a row of a switch is written and read with; macros, so that a statement is one literal.
#define SWITCH_COLUMNS "alias, identifier, portset, max_ports, version, persistent, associated"
#define SELECT_SWITCH "SELECT key, " SWITCH_COLUMNS " FROM switch"

std::string_view query_by(SwitchName kind) {
  switch (kind) {
    case SwitchName::alias:
      return SELECT_SWITCH " WHERE alias = ?";
    case SwitchName::identifier:
      return SELECT_SWITCH " WHERE identifier = ?";
    case SwitchName::portset:
      return SELECT_SWITCH " WHERE portset = ?";
  }
  __builtin_unreachable();
}

// Of a row that SELECT_SWITCH finds.
FoundSwitch switch_at(Query const &row) {
  return {.key = SwitchKey{row.integer(0)},
          .row = {.alias = row.name(1),
                  .identifier = row.name(2),
                  .portset = row.name(3),
                  .max_ports = static_cast<std::uint32_t>(row.integer(4, 1, kGreatestMaxPorts)),
                  .version = row.number<std::uint32_t>(5),
                  .persistent = row.flag(6),
                  .associated = row.flag(7)}};
}

}  // namespace

std::optional<SwitchKey> add_switch(ChangingTransaction &transaction, Switch const &row) {
  Change insert(transaction, "INSERT INTO switch (" SWITCH_COLUMNS
                             ") VALUES (?, ?, ?, ?, ?, ?, ?) ON CONFLICT DO NOTHING");
  insert.with(row.alias).with(row.identifier).with(row.portset);
  insert.with(row.max_ports).with(row.version).with(row.persistent);
  insert.with(row.associated);
  if (insert.run() == 0) {
    return std::nullopt;
  }
  return SwitchKey{transaction.last_key()};
}

std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchName kind,
                                       std::string_view name) {
  Query select(transaction, query_by(kind));
  return select.with(name).first(switch_at);
}

std::optional<FoundSwitch> find_switch(Transaction &transaction, SwitchKey key) {
  Query select(transaction, SELECT_SWITCH " WHERE key = ?");
  return select.with(key).first(switch_at);
}

FoundSwitch get_switch_row(Transaction &transaction, SwitchKey key) {
  auto found = find_switch(transaction, key);
  if (!found) {
    transaction.refuse("it has no switch " + std::to_string(static_cast<std::int64_t>(key)) +
                       ", which is referred to");
  }
  return std::move(*found);
}

std::optional<FoundSwitch> next_switch(Transaction &transaction, SwitchKey key) {
  Query select(transaction, SELECT_SWITCH " WHERE key > ? ORDER BY key LIMIT 1");
  return select.with(key).first(switch_at);
}

std::vector<FoundSwitch> all_switches(Transaction &transaction) {
  Query select(transaction, SELECT_SWITCH " ORDER BY key");
  return select.all(switch_at);
}

bool rename_switch(ChangingTransaction &transaction, SwitchKey key, std::string_view alias) {
  Change update(transaction, "UPDATE OR IGNORE switch SET alias = ? WHERE key = ?");
  return update.with(alias).with(key).run() != 0;
}

void set_version(ChangingTransaction &transaction, SwitchKey key, std::uint32_t version) {
  Change update(transaction, "UPDATE switch SET version = ? WHERE key = ?");
  update.with(version).with(key).run();
}

void set_max_ports(ChangingTransaction &transaction, SwitchKey key, std::uint32_t max_ports) {
  Change update(transaction, "UPDATE switch SET max_ports = ? WHERE key = ?");
  update.with(max_ports).with(key).run();
}

void set_associated(ChangingTransaction &transaction, SwitchKey key, bool associated) {
  Change update(transaction, "UPDATE switch SET associated = ? WHERE key = ?");
  update.with(associated).with(key).run();
}

void remove_switch(ChangingTransaction &transaction, SwitchKey key) {
  Change(transaction, "DELETE FROM switch WHERE key = ?").with(key).run();
}

}  // namespace simhost::storage
