// Links and link-aggregation groups in SQL.
#include "storage/running/links.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

// What a link is written and read with; a macro, so that a statement is one literal.
#define LINK_COLUMNS \
  "carrier, admin, partner, speed, full_duplex, beacons, errors, driver, up_since"

constexpr std::int64_t kGreatestPercent = 100;

Link link_at(Query const &row) {
  return {.carrier = row.flag(0),
          .admin = row.flag(1),
          .partner = row.flag(2),
          .speed = row.number<std::uint32_t>(3),
          .full_duplex = row.flag(4),
          .beacons = row.flag(5),
          .error_percent = static_cast<std::uint32_t>(row.integer(6, 0, kGreatestPercent)),
          .driver = row.flag(7),
          .up_since = row.time(8)};
}

LagId lag_id_at(Query const &row) {
  return LagId(row.number<std::uint32_t>(0));
}

std::vector<std::string> uplinks_in(Transaction &transaction, LagId lag) {
  Query select(transaction, "SELECT uplink FROM lag_uplink WHERE lag = ? ORDER BY position");
  return select.with(lag).all([](Query const &row) { return row.text(0); });
}

}  // namespace

std::optional<Link> find_link(Transaction &transaction, std::string_view uplink) {
  Query select(transaction, "SELECT " LINK_COLUMNS " FROM link WHERE uplink = ?");
  return select.with(uplink).first(link_at);
}

void put_link(ChangingTransaction &transaction, std::string_view uplink, Link const &link) {
  Change replace(transaction, "INSERT OR REPLACE INTO link (uplink, " LINK_COLUMNS
                              ") VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
  replace.with(uplink).with(link.carrier).with(link.admin).with(link.partner).with(link.speed);
  replace.with(link.full_duplex).with(link.beacons).with(link.error_percent).with(link.driver);
  replace.with(link.up_since.count()).run();
}

std::vector<LagRow> all_lags(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT id, name, is_fast FROM lag WHERE switch = ? ORDER BY id");
  auto lags = select.with(key).all([](Query const &row) {
    return LagRow{.id = lag_id_at(row), .name = row.text(1), .is_fast = row.flag(2)};
  });
  for (auto &lag : lags) {
    lag.uplinks = uplinks_in(transaction, lag.id);
  }
  return lags;
}

std::optional<LagId> find_lag(Transaction &transaction, SwitchKey key, std::string_view name) {
  Query select(transaction, "SELECT id FROM lag WHERE switch = ? AND name = ?");
  return select.with(key).with(name).first(lag_id_at);
}

LagId insert_lag(ChangingTransaction &transaction, SwitchKey key, std::string_view name) {
  Change insert(transaction, "INSERT INTO lag (switch, name) VALUES (?, ?)");
  insert.with(key).with(name).run();
  return LagId(static_cast<std::uint32_t>(transaction.last_key()));
}

void set_lag_rate(ChangingTransaction &transaction, LagId lag, bool is_fast) {
  Change(transaction, "UPDATE lag SET is_fast = ? WHERE id = ?").with(is_fast).with(lag).run();
}

std::uint32_t count_lags(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT count(*) FROM lag WHERE switch = ?");
  select.with(key).next();
  return select.number<std::uint32_t>(0);
}

bool is_in_lag(Transaction &transaction, std::string_view uplink) {
  return Query(transaction, "SELECT 1 FROM lag_uplink WHERE uplink = ?").with(uplink).next();
}

void add_to_lag(ChangingTransaction &transaction, LagId lag, std::string_view uplink) {
  Change insert(transaction, "INSERT INTO lag_uplink (lag, uplink) VALUES (?, ?)");
  insert.with(lag).with(uplink).run();
}

void empty_lag(ChangingTransaction &transaction, LagId lag) {
  Change(transaction, "DELETE FROM lag_uplink WHERE lag = ?").with(lag).run();
}

}  // namespace simhost::storage
