// What is shared, in SQL.
#include "storage/shared.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

Shared shared_at(Query const &row) {
  return {.name = {.switch_identifier = row.name(0), .port = row.text(1)},
          .fabric = row.text(2),
          .image = row.is_null(3) ? std::nullopt : std::optional(row.bytes(3)),
          .fits = row.flag(4)};
}

void forget_touched(ChangingTransaction &transaction, SharedName const &name) {
  Change(transaction, "DELETE FROM touched WHERE switch = ? AND port = ?")
      .with(std::string_view(name.switch_identifier))
      .with(std::string_view(name.port))
      .run();
}

}  // namespace

std::optional<Membership> find_membership(Transaction &transaction) {
  return Query(transaction, "SELECT host, state FROM membership").first([](Query const &row) {
    return Membership{.host = row.name(0), .state = row.name(1)};
  });
}

void put_membership(ChangingTransaction &transaction, Membership const &membership) {
  Change(transaction, "DELETE FROM membership").run();
  Change(transaction, "INSERT INTO membership (host, state) VALUES (?, ?)")
      .with(std::string_view(membership.host))
      .with(std::string_view(membership.state))
      .run();
}

std::vector<Shared> all_shared(Transaction &transaction) {
  return Query(transaction,
               "SELECT switch, port, fabric, image, fits FROM shared"
               " ORDER BY switch, port")
      .all(shared_at);
}

std::optional<Shared> find_shared(Transaction &transaction, SharedName const &name) {
  return Query(transaction,
               "SELECT switch, port, fabric, image, fits FROM shared WHERE switch = ? AND port = ?")
      .with(std::string_view(name.switch_identifier))
      .with(std::string_view(name.port))
      .first(shared_at);
}

void put_shared(ChangingTransaction &transaction, Shared const &shared) {
  Change(transaction,
         "INSERT OR REPLACE INTO shared (switch, port, fabric, fits) VALUES (?, ?, ?, ?)")
      .with(std::string_view(shared.name.switch_identifier))
      .with(std::string_view(shared.name.port))
      .with(std::string_view(shared.fabric))
      .with(std::int64_t{shared.fits})
      .run();
  if (shared.image) {
    Change(transaction, "UPDATE shared SET image = ? WHERE switch = ? AND port = ?")
        .with(std::span<std::byte const>(*shared.image))
        .with(std::string_view(shared.name.switch_identifier))
        .with(std::string_view(shared.name.port))
        .run();
  }
  forget_touched(transaction, shared.name);
}

void remove_shared(ChangingTransaction &transaction, SharedName const &name) {
  Change(transaction, "DELETE FROM shared WHERE switch = ? AND port = ?")
      .with(std::string_view(name.switch_identifier))
      .with(std::string_view(name.port))
      .run();
  forget_touched(transaction, name);
}

void remove_shared_switch(ChangingTransaction &transaction, std::string_view identifier) {
  Change(transaction, "DELETE FROM shared WHERE switch = ?").with(identifier).run();
  Change(transaction, "DELETE FROM touched WHERE switch = ?").with(identifier).run();
}

bool is_shared(Transaction &transaction, std::string_view switch_identifier) {
  return Query(transaction, "SELECT 1 FROM shared WHERE switch = ? AND port = ''")
      .with(switch_identifier)
      .next();
}

std::vector<SharedName> touched(Transaction &transaction) {
  return Query(transaction, "SELECT switch, port FROM touched ORDER BY switch, port")
      .all([](Query const &row) {
        return SharedName{.switch_identifier = row.name(0), .port = row.text(1)};
      });
}

void touch(ChangingTransaction &transaction, SharedName const &name) {
  Change(transaction, "INSERT OR IGNORE INTO touched (switch, port) VALUES (?, ?)")
      .with(std::string_view(name.switch_identifier))
      .with(std::string_view(name.port))
      .run();
}

void touch(ChangingTransaction &transaction, std::string_view switch_identifier) {
  Change(transaction,
         "INSERT OR IGNORE INTO touched SELECT switch, port FROM shared WHERE switch = ?")
      .with(switch_identifier)
      .run();
  Change(transaction,
         "INSERT OR IGNORE INTO touched SELECT switch.identifier, port.identifier FROM switch"
         " JOIN port ON port.switch = switch.key AND NOT port.is_uplink"
         " WHERE switch.identifier = ?")
      .with(switch_identifier)
      .run();
}

void forget_touched(ChangingTransaction &transaction) {
  // What is empty would be written all the same.
  if (Query(transaction, "SELECT 1 FROM touched LIMIT 1").next()) {
    Change(transaction, "DELETE FROM touched").run();
  }
}

CountedByHost counted_of(Transaction &transaction, PortNumber number) {
  CountedByHost counted;
  Query select(transaction, "SELECT host, counters FROM counted WHERE port = ?");
  select.with(number);
  while (select.next()) {
    counted.emplace(select.text(0), select.text(1));
  }
  return counted;
}

std::map<PortNumber, CountedByHost> counted_of_ports(Transaction &transaction, SwitchKey key) {
  std::map<PortNumber, CountedByHost> counted;
  Query select(transaction,
               "SELECT counted.port, host, counters FROM counted"
               " JOIN port ON port.number = counted.port WHERE port.switch = ?");
  select.with(key);
  while (select.next()) {
    counted[select.port_number(0)].emplace(select.text(1), select.text(2));
  }
  return counted;
}

void put_counted(ChangingTransaction &transaction, PortNumber number, std::string_view host,
                 std::string_view counters) {
  Change(transaction, "INSERT OR REPLACE INTO counted (port, host, counters) VALUES (?, ?, ?)")
      .with(number)
      .with(host)
      .with(counters)
      .run();
}

}  // namespace simhost::storage
