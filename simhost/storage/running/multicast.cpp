// Groups and their sources in SQL.
#include "storage/running/multicast.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

#define GROUP_COLUMNS "address, version, source_mode, vni, updated"

AddressBytes address_at(Query const &row) {
  return row.bytes(0);
}

McastGroup group_at(Query const &row) {
  return {.address = address_at(row),
          .version = row.number<std::uint32_t>(1),
          .source_mode = row.number<std::uint32_t>(2),
          .vni = row.number<std::uint32_t>(3),
          .updated = std::chrono::milliseconds(row.integer(4)),
          .sources = {}};
}

std::vector<AddressBytes> sources_of(Transaction &transaction, std::int64_t group) {
  Query select(transaction,
               "SELECT address FROM mcast_source WHERE mcast_group = ? ORDER BY position");
  return select.with(group).all(address_at);
}

}  // namespace

void insert_group(Transaction &transaction, PortNumber port, McastGroup const &group) {
  Query insert(transaction,
               "INSERT INTO mcast_group (" GROUP_COLUMNS ", port) VALUES (?, ?, ?, ?, ?, ?)");
  insert.with(group.address).with(group.version).with(group.source_mode).with(group.vni);
  insert.with(group.updated.count()).with(port).run();
  auto const key = transaction.last_key();
  for (auto const &source : group.sources) {
    Query(transaction, "INSERT INTO mcast_source (mcast_group, address) VALUES (?, ?)")
        .with(key)
        .with(source)
        .run();
  }
}

bool remove_group(Transaction &transaction, PortNumber port, AddressBytes const &address) {
  Query erase(transaction, "DELETE FROM mcast_group WHERE port = ? AND address = ?");
  return erase.with(port).with(address).run() != 0;
}

std::optional<McastGroup> find_group(Transaction &transaction, PortNumber port,
                                     AddressBytes const &address) {
  Query select(transaction,
               "SELECT " GROUP_COLUMNS ", key FROM mcast_group WHERE port = ? AND address = ?");
  return select.with(port).with(address).first([&](Query const &row) {
    auto group = group_at(row);
    group.sources = sources_of(transaction, row.integer(5));
    return group;
  });
}

std::vector<AddressBytes> group_addresses(Transaction &transaction, PortNumber port,
                                          std::size_t length) {
  Query select(
      transaction,
      "SELECT address FROM mcast_group WHERE port = ? AND length(address) = ? ORDER BY address");
  return select.with(port).with(static_cast<std::int64_t>(length)).all(address_at);
}

void remove_groups(Transaction &transaction) {
  Query(transaction, "DELETE FROM mcast_group").run();
}

}  // namespace simhost::storage
