// Addresses in SQL.
#include "storage/running/addresses.h"

#include <algorithm>

#include "base/vlan.h"
#include "qexapi/protocols.h"
#include "storage/query.h"

namespace simhost::storage {
namespace {

// What an address is written and read with; a macro, so that a statement is one literal.
#define ADDRESS_COLUMNS "mac, vid, vni, type, ages, seen"

static_assert(VS_MAC_ADDR_TYPE_LEARNED == 2, "the tables count what is of this type");

// What the table of counts has instead of a port for all places of a switch.
constexpr std::int64_t kEverywhere = -1;

// 0 stands for the team in the index as well: no port has that number.
PortNumber port_or_none(Place const &place) {
  return place.port.value_or(PortNumber{});
}

void bind_name(Query &query, AddressName const &name) {
  query.with(name.mac).with(name.vid).with(name.vni);
}

VSMACAddrType type_at(Query const &row, int column) {
  return row.choice(column, VS_MAC_ADDR_TYPE_LEARNED);
}

Address address_at(Query const &row) {
  Address address{
      .name = {.mac = {},
               .vid = static_cast<std::uint16_t>(row.integer(1, 0, kGreatestVlan)),
               .vni = static_cast<std::uint32_t>(row.integer(2, 0, QEX_VIRTUAL_NETWORK_ID_MAX))},
      .type = type_at(row, 3),
      .ages = row.flag(4),
      .seen = row.time(5)};
  std::ranges::copy(row.bytes(0, address.name.mac.size()), address.name.mac.begin());
  return address;
}

std::optional<PortNumber> port_at(Query const &row, int column) {
  auto const port = PortNumber(row.number<std::uint32_t>(column));
  return port == PortNumber{} ? std::nullopt : std::optional(port);
}

FoundAddress found_at(Query const &row) {
  return {.row = AddressRow(row.integer(0)), .port = port_at(row, 1), .type = type_at(row, 2)};
}

std::int64_t count_at(Transaction &transaction, SwitchKey key, std::int64_t place) {
  Query select(transaction, "SELECT addresses FROM learned WHERE switch = ? AND place = ?");
  return select.with(key).with(place).next() ? select.number<std::uint32_t>(0) : 0;
}

}  // namespace

std::vector<Address> addresses_at(Transaction &transaction, Place const &place, VSMACAddrType type,
                                  std::chrono::milliseconds gone) {
  Query select(transaction, "SELECT " ADDRESS_COLUMNS
                            " FROM address"
                            " WHERE switch = ? AND ifnull(port, 0) = ? AND ? IN (type, ?)"
                            " AND NOT (ages AND seen <= ?) ORDER BY mac, vid, vni");
  select.with(place.switch_key).with(port_or_none(place));
  return select.with(type).with(VS_MAC_ADDR_TYPE_ALL).with(gone.count()).all(address_at);
}

std::vector<PlacedAddress> fixed_addresses(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT " ADDRESS_COLUMNS
                            ", ifnull(port, 0) FROM address"
                            " WHERE switch = ? AND type IN (?, ?)"
                            " ORDER BY port IS NULL, port, type, mac, vid, vni");
  select.with(key).with(VS_MAC_ADDR_TYPE_STATIC).with(VS_MAC_ADDR_TYPE_USER);
  return select.all([](Query const &row) {
    return PlacedAddress{.port = port_at(row, 6), .address = address_at(row)};
  });
}

std::vector<Address> fixed_addresses(Transaction &transaction, Place const &place) {
  Query select(transaction, "SELECT " ADDRESS_COLUMNS
                            " FROM address"
                            " WHERE switch = ? AND ifnull(port, 0) = ? AND type IN (?, ?)"
                            " ORDER BY type, mac, vid, vni");
  select.with(place.switch_key).with(port_or_none(place));
  return select.with(VS_MAC_ADDR_TYPE_STATIC).with(VS_MAC_ADDR_TYPE_USER).all(address_at);
}

std::optional<FoundAddress> find_address(Transaction &transaction, SwitchKey key,
                                         AddressName const &name) {
  Query select(transaction,
               "SELECT rowid, ifnull(port, 0), type FROM address"
               " WHERE switch = ? AND mac = ? AND vid = ? AND vni = ?");
  bind_name(select.with(key), name);
  return select.first(found_at);
}

void place_address(ChangingTransaction &transaction, Place const &place, Address const &address) {
  Change upsert(transaction, "INSERT INTO address (switch, port, " ADDRESS_COLUMNS
                             ") VALUES (?, nullif(?, 0), ?, ?, ?, ?, ?, ?)"
                             " ON CONFLICT (switch, mac, vid, vni) DO UPDATE SET"
                             " port = excluded.port, type = excluded.type, ages = excluded.ages,"
                             " seen = excluded.seen");
  bind_name(upsert.with(place.switch_key).with(port_or_none(place)), address.name);
  upsert.with(address.type).with(address.ages).with(address.seen.count()).run();
}

void set_seen(ChangingTransaction &transaction, AddressRow row, std::chrono::milliseconds seen) {
  Change update(transaction, "UPDATE address SET seen = ? WHERE rowid = ?");
  update.with(seen.count()).with(row).run();
}

void remove_address(ChangingTransaction &transaction, AddressRow row) {
  Change(transaction, "DELETE FROM address WHERE rowid = ?").with(row).run();
}

void remove_aged(ChangingTransaction &transaction, SwitchKey key, std::chrono::milliseconds gone) {
  Change remove(transaction, "DELETE FROM address WHERE switch = ? AND ages AND seen <= ?");
  remove.with(key).with(gone.count()).run();
}

void remove_learned(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM address WHERE type = ?").with(VS_MAC_ADDR_TYPE_LEARNED).run();
}

std::int64_t count_learned(Transaction &transaction, Place const &place) {
  return count_at(transaction, place.switch_key, static_cast<std::int64_t>(port_or_none(place)));
}

std::int64_t count_learned(Transaction &transaction, SwitchKey key) {
  return count_at(transaction, key, kEverywhere);
}

std::int64_t count_aged(Transaction &transaction, Place const &place,
                        std::chrono::milliseconds gone) {
  Query select(transaction,
               "SELECT count(*) FROM address WHERE switch = ? AND ages AND seen <= ?"
               " AND ifnull(port, 0) = ? AND type = ?");
  select.with(place.switch_key).with(gone.count());
  select.with(port_or_none(place)).with(VS_MAC_ADDR_TYPE_LEARNED).next();
  return select.integer(0);
}

}  // namespace simhost::storage
