// Switch rows in SQL.
#include "store/switches.h"

#include "store/store.h"

namespace simhost::store {
namespace {

std::string_view query_by(SwitchName kind) {
  switch (kind) {
    case SwitchName::alias:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent"
             " FROM switch WHERE alias = ?";
    case SwitchName::identifier:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent"
             " FROM switch WHERE identifier = ?";
    case SwitchName::portset:
      return "SELECT key, alias, identifier, portset, max_ports, version, persistent"
             " FROM switch WHERE portset = ?";
  }
  __builtin_unreachable();
}

}  // namespace

std::optional<SwitchKey> add_switch(Transaction &transaction, Switch const &row) {
  auto insert = transaction.query(
      "INSERT INTO switch (alias, identifier, portset, max_ports, version, persistent)"
      " VALUES (?, ?, ?, ?, ?, ?) ON CONFLICT DO NOTHING");
  insert.with(row.alias).with(row.identifier).with(row.portset);
  insert.with(row.max_ports).with(row.version).with(std::int64_t{row.persistent});
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
  return FoundSwitch{.key = SwitchKey{select.integer(0)},
                     .row = {.alias = select.text(1),
                             .identifier = select.text(2),
                             .portset = select.text(3),
                             .max_ports = static_cast<std::uint32_t>(select.integer(4)),
                             .version = static_cast<std::uint32_t>(select.integer(5)),
                             .persistent = select.integer(6) != 0}};
}

void remove_switch(Transaction &transaction, SwitchKey key) {
  transaction.query("DELETE FROM switch WHERE key = ?").with(std::int64_t(key)).run();
}

}  // namespace simhost::store
