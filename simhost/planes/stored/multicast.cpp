// Groups and their sources in SQL.
#include "planes/stored/multicast.h"

#include <algorithm>

#include "base/outcomes.h"
#include "model/options/runtime_options.h"
#include "qexapi/protocols.h"
#include "storage/store.h"
#include "vswitch/mcast_filters.h"

namespace simhost::stored {
namespace {

constexpr std::size_t kIPv4Length = sizeof(qex_IPv4Address);
constexpr std::size_t kIPv6Length = sizeof(qex_IPv6Address);
constexpr std::size_t kEthernetLength = sizeof(qex_EthAddress);
constexpr std::size_t kIgmpVersions = 3;
constexpr std::size_t kMldVersions = 2;

bool is_multicast(AddressBytes const &address) {
  auto const first = address.empty() ? 0U : std::to_integer<unsigned>(address.front());
  switch (address.size()) {
    case kEthernetLength:
      return (first & 1U) != 0;
    case kIPv4Length:
      return (first & 0xF0U) == 0xE0U;
    case kIPv6Length:
      return first == 0xFFU;
    default:
      return false;
  }
}

void check(storage::Transaction &transaction, McastGroup const &group) {
  auto const length = group.address.size();
  bool const ethernet = length == kEthernetLength;
  bool const alike = std::all_of(group.sources.begin(), group.sources.end(),
                                 [&](auto const &source) { return source.size() == length; });
  if (!is_multicast(group.address) || !alike || (ethernet && !group.sources.empty())) {
    throw Refused(QEX_INVALID_ADDRESS);
  }
  // A filter of Ethernet addresses comes from no protocol.
  auto const versions = ethernet ? 0 : length == kIPv4Length ? kIgmpVersions : kMldVersions;
  if (group.version > versions || group.source_mode > VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const most =
      length == kIPv4Length ? VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM : VS_RT_OPT_MLD_V2_MAX_SRC_IP_NUM;
  if (group.sources.size() > static_cast<std::size_t>(runtime_number(transaction, most))) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
}

bool forget(storage::Transaction &transaction, storage::PortNumber port,
            AddressBytes const &address) {
  auto erase = transaction.query("DELETE FROM mcast_group WHERE port = ? AND address = ?");
  return erase.with(std::int64_t(port)).with(address).run() != 0;
}

std::vector<AddressBytes> sources_of(storage::Transaction &transaction, std::int64_t key) {
  auto select =
      transaction.query("SELECT address FROM mcast_source WHERE mcast_group = ? ORDER BY position");
  select.with(key);
  std::vector<AddressBytes> sources;
  while (select.next()) {
    sources.push_back(select.bytes(0));
  }
  return sources;
}

}  // namespace

void join(storage::Transaction &transaction, storage::PortNumber port, McastGroup const &group) {
  check(transaction, group);
  forget(transaction, port, group.address);
  auto insert = transaction.query(
      "INSERT INTO mcast_group (port, address, version, source_mode, vni, updated)"
      " VALUES (?, ?, ?, ?, ?, ?)");
  insert.with(std::int64_t(port)).with(group.address).with(std::int64_t{group.version});
  insert.with(std::int64_t{group.source_mode}).with(std::int64_t{group.vni});
  insert.with(clock_now(transaction).count()).run();
  auto const key = transaction.last_key();
  for (auto const &source : group.sources) {
    transaction.query("INSERT INTO mcast_source (mcast_group, address) VALUES (?, ?)")
        .with(key)
        .with(source)
        .run();
  }
}

void leave(storage::Transaction &transaction, storage::PortNumber port,
           AddressBytes const &address) {
  if (!forget(transaction, port, address)) {
    throw Refused(QEX_NOT_FOUND);
  }
}

std::vector<AddressBytes> groups(storage::Transaction &transaction, storage::PortNumber port,
                                 std::size_t length) {
  auto select = transaction.query(
      "SELECT address FROM mcast_group WHERE port = ? AND length(address) = ? ORDER BY address");
  select.with(std::int64_t(port)).with(static_cast<std::int64_t>(length));
  std::vector<AddressBytes> addresses;
  while (select.next()) {
    addresses.push_back(select.bytes(0));
  }
  return addresses;
}

std::optional<McastGroup> group(storage::Transaction &transaction, storage::PortNumber port,
                                AddressBytes const &address) {
  auto select = transaction.query(
      "SELECT key, version, source_mode, vni, updated FROM mcast_group"
      " WHERE port = ? AND address = ?");
  if (!select.with(std::int64_t(port)).with(address).next()) {
    return std::nullopt;
  }
  return McastGroup{.address = address,
                    .version = static_cast<std::uint32_t>(select.integer(1)),
                    .source_mode = static_cast<std::uint32_t>(select.integer(2)),
                    .vni = static_cast<std::uint32_t>(select.integer(3)),
                    .updated = ClockTime(select.integer(4)),
                    .sources = sources_of(transaction, select.integer(0))};
}

void forget_groups(storage::Transaction &transaction) {
  transaction.query("DELETE FROM mcast_group").run();
}

}  // namespace simhost::stored
