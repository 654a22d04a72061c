// Port and uplink rows in SQL.
#include "store/ports.h"

#include "store/store.h"

namespace simhost::store {

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

std::uint32_t count_ports(Transaction &transaction, SwitchKey switch_key, PortKind kind) {
  auto select = transaction.query("SELECT count(*) FROM port WHERE switch = ? AND is_uplink = ?");
  select.with(std::int64_t(switch_key)).with(std::int64_t{kind == PortKind::uplink});
  select.next();
  return static_cast<std::uint32_t>(select.integer(0));
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

std::vector<AttachedUplink> uplinks_of(Transaction &transaction, SwitchKey switch_key) {
  auto select = transaction.query(
      "SELECT uplink.name, port.number FROM port JOIN uplink ON uplink.port = port.number"
      " WHERE port.switch = ? AND port.is_uplink ORDER BY port.number");
  select.with(std::int64_t(switch_key));
  std::vector<AttachedUplink> attached;
  while (select.next()) {
    attached.push_back({.name = select.text(0),
                        .port = PortNumber(static_cast<std::uint32_t>(select.integer(1)))});
  }
  return attached;
}

}  // namespace simhost::store
