// Port and uplink rows in SQL.
#include "storage/ports.h"

#include <limits>
#include <utility>

#include "storage/store.h"

namespace simhost::storage {
namespace {

PortNumber number_at(Query const &query, int column) {
  auto const number = query.integer(column, 1, std::numeric_limits<std::uint32_t>::max());
  return PortNumber(static_cast<std::uint32_t>(number));
}

// What port_at() reads; a macro, so that a statement is one literal.
#define SELECT_PORT "SELECT number, switch, identifier, is_uplink FROM port"

Port port_at(Query const &query) {
  return {.number = number_at(query, 0),
          .switch_key = SwitchKey{query.integer(1)},
          .identifier = query.text(2),
          .kind = query.flag(3) ? PortKind::uplink : PortKind::client};
}

std::optional<Port> port_from(Query &select) {
  return select.next() ? std::optional(port_at(select)) : std::nullopt;
}

std::vector<Port> ports_from(Query &select) {
  std::vector<Port> ports;
  while (select.next()) {
    ports.push_back(port_at(select));
  }
  return ports;
}

// Of a row of name, port.
Uplink uplink_at(Query const &query) {
  Uplink uplink{.name = query.text(0), .port = std::nullopt};
  if (!query.is_null(1)) {
    uplink.port = number_at(query, 1);
  }
  return uplink;
}

}  // namespace

std::optional<PortNumber> add_port(Transaction &transaction, SwitchKey switch_key,
                                   std::string_view identifier, PortKind kind) {
  auto insert = transaction.query(
      "INSERT INTO port (switch, identifier, is_uplink) VALUES (?, ?, ?)"
      " ON CONFLICT DO NOTHING");
  insert.with(std::int64_t(switch_key)).with(identifier);
  insert.with(std::int64_t{kind == PortKind::uplink});
  if (insert.run() == 0) {
    return std::nullopt;
  }
  return PortNumber(static_cast<std::uint32_t>(transaction.last_key()));
}

std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key,
                              std::string_view identifier) {
  auto select = transaction.query(SELECT_PORT " WHERE switch = ? AND identifier = ?");
  return port_from(select.with(std::int64_t(switch_key)).with(identifier));
}

std::optional<Port> find_port(Transaction &transaction, PortNumber number) {
  auto select = transaction.query(SELECT_PORT " WHERE number = ?");
  return port_from(select.with(std::int64_t(number)));
}

std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key, PortNumber number) {
  auto port = find_port(transaction, number);
  return port && port->switch_key == switch_key ? std::move(port) : std::nullopt;
}

std::optional<Port> find_port_by_external_id(Transaction &transaction, SwitchKey switch_key,
                                             std::string_view external_id) {
  auto select = transaction.query(SELECT_PORT " WHERE switch = ? AND external_id = ?");
  return port_from(select.with(std::int64_t(switch_key)).with(external_id));
}

std::optional<Port> next_port(Transaction &transaction, SwitchKey switch_key, PortNumber number) {
  auto select =
      transaction.query(SELECT_PORT " WHERE switch = ? AND number > ? ORDER BY number LIMIT 1");
  return port_from(select.with(std::int64_t(switch_key)).with(std::int64_t(number)));
}

std::string external_id_of(Transaction &transaction, PortNumber number) {
  auto select = transaction.query("SELECT ifnull(external_id, '') FROM port WHERE number = ?");
  return select.with(std::int64_t(number)).next() ? select.text(0) : std::string();
}

bool set_external_id(Transaction &transaction, PortNumber number, std::string_view external_id) {
  auto update = transaction.query("UPDATE OR IGNORE port SET external_id = ? WHERE number = ?");
  return update.with(external_id).with(std::int64_t(number)).run() != 0;
}

void remove_port(Transaction &transaction, PortNumber number) {
  transaction.query("DELETE FROM port WHERE number = ?").with(std::int64_t(number)).run();
}

std::vector<Port> ports_of(Transaction &transaction, SwitchKey switch_key) {
  auto select = transaction.query(SELECT_PORT " WHERE switch = ? ORDER BY number");
  return ports_from(select.with(std::int64_t(switch_key)));
}

std::vector<PortNumber> client_numbers(Transaction &transaction, SwitchKey switch_key) {
  auto select = transaction.query("SELECT number FROM port WHERE switch = ? AND NOT is_uplink");
  select.with(std::int64_t(switch_key));
  std::vector<PortNumber> numbers;
  while (select.next()) {
    numbers.push_back(number_at(select, 0));
  }
  return numbers;
}

std::uint32_t count_ports(Transaction &transaction, SwitchKey switch_key, PortKind kind) {
  auto select = transaction.query(kind == PortKind::client
                                      ? "SELECT clients FROM switch WHERE key = ?"
                                      : "SELECT count(*) FROM port WHERE switch = ? AND is_uplink");
  select.with(std::int64_t(switch_key));
  return select.next() ? select.number<std::uint32_t>(0) : 0;
}

std::optional<Uplink> find_uplink(Transaction &transaction, std::string_view name) {
  auto select = transaction.query("SELECT name, port FROM uplink WHERE name = ?");
  if (!select.with(name).next()) {
    return std::nullopt;
  }
  return uplink_at(select);
}

std::vector<Uplink> all_uplinks(Transaction &transaction) {
  auto select = transaction.query("SELECT name, port FROM uplink ORDER BY position");
  std::vector<Uplink> uplinks;
  while (select.next()) {
    uplinks.push_back(uplink_at(select));
  }
  return uplinks;
}

void add_uplink(Transaction &transaction, std::string_view name) {
  transaction.query("INSERT INTO uplink (name) VALUES (?)").with(name).run();
}

std::vector<std::string> free_uplinks(Transaction &transaction) {
  auto select = transaction.query("SELECT name FROM uplink WHERE port IS NULL ORDER BY position");
  std::vector<std::string> names;
  while (select.next()) {
    names.push_back(select.text(0));
  }
  return names;
}

void attach_uplink(Transaction &transaction, std::string_view name, PortNumber port) {
  auto update = transaction.query("UPDATE uplink SET port = ? WHERE name = ?");
  update.with(std::int64_t(port)).with(name).run();
}

std::vector<Port> uplink_ports_of(Transaction &transaction, SwitchKey switch_key) {
  auto select = transaction.query(SELECT_PORT " WHERE switch = ? AND is_uplink ORDER BY number");
  return ports_from(select.with(std::int64_t(switch_key)));
}

std::optional<std::string> uplink_at(Transaction &transaction, PortNumber number) {
  auto select = transaction.query("SELECT name FROM uplink WHERE port = ?");
  if (!select.with(std::int64_t(number)).next()) {
    return std::nullopt;
  }
  return select.text(0);
}

std::vector<AttachedUplink> uplinks_of(Transaction &transaction, SwitchKey switch_key) {
  auto select = transaction.query(
      "SELECT uplink.name, port.number FROM port JOIN uplink ON uplink.port = port.number"
      " WHERE port.switch = ? AND port.is_uplink ORDER BY port.number");
  select.with(std::int64_t(switch_key));
  std::vector<AttachedUplink> attached;
  while (select.next()) {
    attached.push_back({.name = select.text(0), .port = number_at(select, 1)});
  }
  return attached;
}

}  // namespace simhost::storage
