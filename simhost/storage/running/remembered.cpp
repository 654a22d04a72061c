// Remembered addresses in SQL.
#include "storage/running/remembered.h"

#include <algorithm>
#include <limits>

#include "storage/query.h"

namespace simhost::storage {
namespace {

constexpr std::int64_t kAllVlans = -1;
constexpr std::int64_t kLastVlan = 4095;
constexpr SeenAt kNeverSeen{-1};

std::int64_t vlan_of(Remembered const &address) {
  return address.vlan ? std::int64_t{*address.vlan} : kAllVlans;
}

Remembered remembered_at(Query const &row) {
  Remembered address{.as = row.choice(0, RememberedAs::counted),
                     .vlan = std::nullopt,
                     .mac = {},
                     .port = std::nullopt,
                     .seen = std::nullopt};
  if (auto const vlan = row.integer(1, kAllVlans, kLastVlan); vlan != kAllVlans) {
    address.vlan = static_cast<std::uint16_t>(vlan);
  }
  std::ranges::copy(row.bytes(2, address.mac.size()), address.mac.begin());
  if (!row.is_null(3)) {
    address.port = PortNumber(
        static_cast<std::uint32_t>(row.integer(3, 1, std::numeric_limits<std::uint32_t>::max())));
  }
  if (!row.is_null(4)) {
    address.seen = row.time(4);
  }
  return address;
}

}  // namespace

std::vector<Remembered> remembered_of(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT kind, vlan, mac, port, seen FROM remembered WHERE switch = ?");
  return select.with(key).all(remembered_at);
}

void remember(ChangingTransaction &transaction, SwitchKey key, Remembered const &address) {
  auto const port = address.port.value_or(PortNumber{});
  Change(transaction,
         "INSERT OR REPLACE INTO remembered (kind, vlan, mac, port, seen, switch)"
         " SELECT ?, ?, ?, nullif(?, 0), nullif(?, -1), key FROM switch"
         " WHERE key = ? AND ? IN (SELECT 0 UNION ALL SELECT port FROM device)")
      .with(address.as)
      .with(vlan_of(address))
      .with(std::span<std::byte const>(address.mac))
      .with(port)
      .with(std::int64_t{address.seen.value_or(kNeverSeen).count()})
      .with(key)
      .with(port)
      .run();
}

void remove_remembered(ChangingTransaction &transaction, SwitchKey key, Remembered const &address) {
  Change(transaction,
         "DELETE FROM remembered WHERE switch = ? AND kind = ? AND vlan = ? AND mac = ?")
      .with(key)
      .with(address.as)
      .with(vlan_of(address))
      .with(std::span<std::byte const>(address.mac))
      .run();
}

void remove_remembered(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM remembered").run();
}

}  // namespace simhost::storage
