// Groups and their sources in SQL.
#include "storage/running/multicast.h"

#include "qexapi/protocols.h"
#include "storage/query.h"
#include "vswitch/mcast_filters.h"

namespace simhost::storage {
namespace {

constexpr std::int64_t kLatestProtocol = 3;

#define GROUP_COLUMNS "address, version, source_mode, vni, updated"

// Of Ethernet, IPv4 or IPv6.
AddressBytes address_at(Query const &row) {
  auto address = row.bytes(0);
  if (address.size() != sizeof(qex_EthAddress) && address.size() != sizeof(qex_IPv4Address) &&
      address.size() != sizeof(qex_IPv6Address)) {
    row.refuse(0, "an address of " + std::to_string(address.size()) + " bytes");
  }
  return address;
}

McastGroup group_at(Query const &row) {
  return {.address = address_at(row),
          .version = static_cast<std::uint32_t>(row.integer(1, 0, kLatestProtocol)),
          .source_mode = row.choice(2, std::uint32_t{VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE}),
          .vni = row.number<std::uint32_t>(3),
          .updated = row.time(4),
          .sources = {}};
}

std::vector<AddressBytes> sources_of(Transaction &transaction, std::int64_t group,
                                     std::size_t length) {
  Query select(transaction,
               "SELECT address FROM mcast_source WHERE mcast_group = ? ORDER BY position");
  return select.with(group).all([&](Query const &row) { return row.bytes(0, length); });
}

}  // namespace

void insert_group(ChangingTransaction &transaction, PortNumber port, McastGroup const &group) {
  Change insert(transaction,
                "INSERT INTO mcast_group (" GROUP_COLUMNS ", port) VALUES (?, ?, ?, ?, ?, ?)");
  insert.with(group.address).with(group.version).with(group.source_mode).with(group.vni);
  insert.with(group.updated.count()).with(port).run();
  auto const key = transaction.last_key();
  for (auto const &source : group.sources) {
    Change(transaction, "INSERT INTO mcast_source (mcast_group, address) VALUES (?, ?)")
        .with(key)
        .with(source)
        .run();
  }
}

bool remove_group(ChangingTransaction &transaction, PortNumber port, AddressBytes const &address) {
  Change erase(transaction, "DELETE FROM mcast_group WHERE port = ? AND address = ?");
  return erase.with(port).with(address).run() != 0;
}

std::optional<McastGroup> find_group(Transaction &transaction, PortNumber port,
                                     AddressBytes const &address) {
  Query select(transaction,
               "SELECT " GROUP_COLUMNS ", key FROM mcast_group WHERE port = ? AND address = ?");
  return select.with(port).with(address).first([&](Query const &row) {
    auto group = group_at(row);
    group.sources = sources_of(transaction, row.integer(5), address.size());
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

void remove_groups(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM mcast_group").run();
}

}  // namespace simhost::storage
