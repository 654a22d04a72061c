// Links and link-aggregation groups in SQL.
#include "planes/stored/links.h"

#include <algorithm>

#include "base/outcomes.h"
#include "clock/clock.h"
#include "model/lookup.h"
#include "storage/store.h"
#include "vswitch/lags.h"

namespace simhost::stored {
namespace {

std::optional<std::int64_t> find_lag(storage::Transaction &transaction,
                                     storage::SwitchKey switch_key, std::string_view name) {
  auto select = transaction.query("SELECT id FROM lag WHERE switch = ? AND name = ?");
  if (!select.with(std::int64_t(switch_key)).with(name).next()) {
    return std::nullopt;
  }
  return select.integer(0);
}

std::int64_t add_lag(storage::Transaction &transaction, storage::SwitchKey switch_key,
                     std::string_view name) {
  if (lags_of(transaction, switch_key).size() >= VS_MAX_LAGS) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  auto insert = transaction.query("INSERT INTO lag (switch, name) VALUES (?, ?)");
  insert.with(std::int64_t(switch_key)).with(name).run();
  return transaction.last_key();
}

std::vector<Lag::Member> members_of(storage::Transaction &transaction, std::int64_t lag) {
  auto select = transaction.query("SELECT uplink FROM lag_uplink WHERE lag = ? ORDER BY position");
  select.with(lag);
  std::vector<Lag::Member> members;
  while (select.next()) {
    members.push_back({.uplink = select.text(0), .up = false});
  }
  for (auto &member : members) {
    auto const link = link_of(transaction, member.uplink);
    member.up = link.up() && link.partner;
  }
  return members;
}

}  // namespace

Link link_of(storage::Transaction &transaction, std::string_view uplink) {
  auto select = transaction.query(
      "SELECT carrier, admin, partner, speed, full_duplex, up_since, beacons, errors, driver"
      " FROM link WHERE uplink = ?");
  if (!select.with(uplink).next()) {
    return {};
  }
  return {.carrier = select.integer(0) != 0,
          .admin = select.integer(1) != 0,
          .partner = select.integer(2) != 0,
          .speed = static_cast<std::uint32_t>(select.integer(3)),
          .full_duplex = select.integer(4) != 0,
          .beacons = select.integer(6) != 0,
          .error_percent = static_cast<std::uint32_t>(select.integer(7)),
          .driver = select.integer(8) != 0,
          .up_since = ClockTime(select.integer(5))};
}

void put_link(storage::Transaction &transaction, std::string_view uplink, Link const &link) {
  auto const before = link_of(transaction, uplink);
  auto const up_since = link.up() && !before.up() ? clock_now(transaction) : before.up_since;
  auto upsert = transaction.query(
      "INSERT INTO link (uplink, carrier, admin, partner, speed, full_duplex, up_since, beacons,"
      " errors, driver) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"
      " ON CONFLICT (uplink) DO UPDATE SET carrier = excluded.carrier, admin = excluded.admin,"
      " partner = excluded.partner, speed = excluded.speed, full_duplex = excluded.full_duplex,"
      " up_since = excluded.up_since, beacons = excluded.beacons, errors = excluded.errors,"
      " driver = excluded.driver");
  upsert.with(uplink).with(std::int64_t{link.carrier}).with(std::int64_t{link.admin});
  upsert.with(std::int64_t{link.partner}).with(std::int64_t{link.speed});
  upsert.with(std::int64_t{link.full_duplex}).with(up_since.count());
  upsert.with(std::int64_t{link.beacons}).with(std::int64_t{link.error_percent});
  upsert.with(std::int64_t{link.driver}).run();
}

std::vector<Lag> lags_of(storage::Transaction &transaction, storage::SwitchKey switch_key) {
  auto select = transaction.query("SELECT id, name FROM lag WHERE switch = ? ORDER BY id");
  select.with(std::int64_t(switch_key));
  std::vector<Lag> lags;
  while (select.next()) {
    lags.push_back({.id = static_cast<std::uint32_t>(select.integer(0)),
                    .name = select.text(1),
                    .members = {}});
  }
  for (auto &lag : lags) {
    lag.members = members_of(transaction, lag.id);
  }
  return lags;
}

bool is_aggregated(storage::Transaction &transaction, std::string_view uplink) {
  return transaction.query("SELECT 1 FROM lag_uplink WHERE uplink = ?").with(uplink).next();
}

void put_lag(storage::Transaction &transaction, storage::SwitchKey switch_key,
             std::string_view name, std::vector<std::string> const &uplinks) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (name.size() >= VS_LACP_LAG_NAME_LENGTH) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  if (uplinks.size() > VS_MAX_UPLINKS_IN_LAG) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  auto lag = find_lag(transaction, switch_key, name);
  if (!lag) {
    if (lags_of(transaction, switch_key).size() >= VS_MAX_LAGS) {
      throw Refused(QEX_LIMIT_EXCEEDED);
    }
    lag = add_lag(transaction, switch_key, name);
  }
  transaction.query("DELETE FROM lag_uplink WHERE lag = ?").with(*lag).run();
  for (auto const &uplink : uplinks) {
    get_uplink(transaction, switch_key, uplink);
    if (is_aggregated(transaction, uplink)) {
      throw Refused(QEX_BUSY);
    }
    transaction.query("INSERT INTO lag_uplink (lag, uplink) VALUES (?, ?)")
        .with(*lag)
        .with(uplink)
        .run();
  }
}

}  // namespace simhost::stored
