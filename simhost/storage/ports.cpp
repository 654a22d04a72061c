// Port and uplink rows in SQL.
#include "storage/ports.h"

#include <utility>

#include "storage/query.h"

namespace simhost::storage {
namespace {

// What a row of a port, and of an uplink, is read with; macros, so that a statement is one literal.
#define SELECT_PORT "SELECT number, switch, identifier, is_uplink FROM port"
#define SELECT_UPLINK "SELECT name, port FROM uplink"

// Of a row that SELECT_PORT finds.
Port port_at(Query const &row) {
  return {.number = row.port_number(0),
          .switch_key = SwitchKey{row.integer(1)},
          .identifier = row.name(2),
          .kind = row.flag(3) ? PortKind::uplink : PortKind::client};
}

// Of a row that SELECT_UPLINK finds.
Uplink any_uplink_at(Query const &row) {
  Uplink uplink{.name = row.name(0), .port = std::nullopt};
  if (!row.is_null(1)) {
    uplink.port = row.port_number(1);
  }
  return uplink;
}

std::string name_at(Query const &row) {
  return row.name(0);
}

}  // namespace

std::optional<PortNumber> add_port(ChangingTransaction &transaction, SwitchKey switch_key,
                                   std::string_view identifier, PortKind kind) {
  Change insert(transaction,
                "INSERT INTO port (switch, identifier, is_uplink) VALUES (?, ?, ?)"
                " ON CONFLICT DO NOTHING");
  insert.with(switch_key).with(identifier);
  insert.with(kind == PortKind::uplink);
  if (insert.run() == 0) {
    return std::nullopt;
  }
  return PortNumber(static_cast<std::uint32_t>(transaction.last_key()));
}

std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key,
                              std::string_view identifier) {
  Query select(transaction, SELECT_PORT " WHERE switch = ? AND identifier = ?");
  return select.with(switch_key).with(identifier).first(port_at);
}

std::optional<Port> find_port(Transaction &transaction, PortNumber number) {
  Query select(transaction, SELECT_PORT " WHERE number = ?");
  return select.with(number).first(port_at);
}

std::optional<Port> find_port(Transaction &transaction, SwitchKey switch_key, PortNumber number) {
  auto port = find_port(transaction, number);
  return port && port->switch_key == switch_key ? std::move(port) : std::nullopt;
}

Port get_port_row(Transaction &transaction, PortNumber number) {
  auto port = find_port(transaction, number);
  if (!port) {
    transaction.refuse("it has no port " + std::to_string(static_cast<std::uint32_t>(number)) +
                       ", which is referred to");
  }
  return std::move(*port);
}

std::optional<Port> find_port_by_external_id(Transaction &transaction, SwitchKey switch_key,
                                             std::string_view external_id) {
  Query select(transaction, SELECT_PORT " WHERE switch = ? AND external_id = ?");
  return select.with(switch_key).with(external_id).first(port_at);
}

std::optional<Port> next_port(Transaction &transaction, SwitchKey switch_key, PortNumber number) {
  Query select(transaction, SELECT_PORT " WHERE switch = ? AND number > ? ORDER BY number LIMIT 1");
  return select.with(switch_key).with(number).first(port_at);
}

std::string external_id_of(Transaction &transaction, PortNumber number) {
  Query select(transaction, "SELECT ifnull(external_id, '') FROM port WHERE number = ?");
  return select.with(number).next() ? select.text(0) : std::string();
}

bool set_external_id(ChangingTransaction &transaction, PortNumber number,
                     std::string_view external_id) {
  Change update(transaction, "UPDATE OR IGNORE port SET external_id = ? WHERE number = ?");
  return update.with(external_id).with(number).run() != 0;
}

void remove_port(ChangingTransaction &transaction, PortNumber number) {
  Change(transaction, "DELETE FROM port WHERE number = ?").with(number).run();
}

std::vector<Port> ports_of(Transaction &transaction, SwitchKey switch_key) {
  Query select(transaction, SELECT_PORT " WHERE switch = ? ORDER BY number");
  return select.with(switch_key).all(port_at);
}

std::vector<PortNumber> client_numbers(Transaction &transaction, SwitchKey switch_key) {
  Query select(transaction, "SELECT number FROM port WHERE switch = ? AND NOT is_uplink");
  return select.with(switch_key).all([](Query const &row) { return row.port_number(0); });
}

std::uint32_t count_ports(Transaction &transaction, SwitchKey switch_key, PortKind kind) {
  Query select(transaction, kind == PortKind::client
                                ? "SELECT clients FROM switch WHERE key = ?"
                                : "SELECT count(*) FROM port WHERE switch = ? AND is_uplink");
  select.with(switch_key);
  return select.next() ? select.number<std::uint32_t>(0) : 0;
}

std::optional<Uplink> find_uplink(Transaction &transaction, std::string_view name) {
  Query select(transaction, SELECT_UPLINK " WHERE name = ?");
  return select.with(name).first(any_uplink_at);
}

std::vector<Uplink> all_uplinks(Transaction &transaction) {
  Query select(transaction, SELECT_UPLINK " ORDER BY position");
  return select.all(any_uplink_at);
}

void add_uplink(ChangingTransaction &transaction, std::string_view name) {
  Change(transaction, "INSERT INTO uplink (name) VALUES (?)").with(name).run();
}

std::vector<std::string> free_uplinks(Transaction &transaction) {
  Query select(transaction,
               "SELECT name FROM uplink WHERE port IS NULL"
               " AND name NOT IN (SELECT uplink FROM fabric) ORDER BY position");
  return select.all(name_at);
}

void remove_uplinks(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM uplink WHERE name NOT IN (SELECT uplink FROM fabric)").run();
}

void attach_uplink(ChangingTransaction &transaction, std::string_view name, PortNumber port) {
  Change update(transaction, "UPDATE uplink SET port = ? WHERE name = ?");
  update.with(port).with(name).run();
}

std::vector<Port> uplink_ports_of(Transaction &transaction, SwitchKey switch_key) {
  Query select(transaction, SELECT_PORT " WHERE switch = ? AND is_uplink ORDER BY number");
  return select.with(switch_key).all(port_at);
}

std::optional<std::string> uplink_at(Transaction &transaction, PortNumber number) {
  Query select(transaction, "SELECT name FROM uplink WHERE port = ?");
  return select.with(number).first(name_at);
}

std::vector<AttachedUplink> uplinks_of(Transaction &transaction, SwitchKey switch_key) {
  Query select(transaction,
               "SELECT uplink.name, port.number FROM port JOIN uplink ON uplink.port = port.number"
               " WHERE port.switch = ? AND port.is_uplink ORDER BY port.number");
  return select.with(switch_key).all([](Query const &row) {
    return AttachedUplink{.name = row.name(0), .port = row.port_number(1)};
  });
}

void restart_numbering(ChangingTransaction &transaction) {
  // Keys of switches, which nobody sees, tell a handle from before.
  Change(transaction, "DELETE FROM sqlite_sequence WHERE name <> 'switch'").run();
}

}  // namespace simhost::storage
