// What becomes of links and link-aggregation groups.
#include "planes/stored/links.h"

#include <utility>

#include "base/outcomes.h"
#include "clock/clock.h"
#include "model/lookup.h"
#include "vswitch/lags.h"

namespace simhost::stored {
namespace {

Lag::Member member_of(storage::Transaction &transaction, std::string const &uplink) {
  auto const link = link_of(transaction, uplink);
  return {.uplink = uplink, .up = link.up() && link.partner};
}

}  // namespace

Link link_of(storage::Transaction &transaction, std::string_view uplink) {
  return storage::find_link(transaction, uplink).value_or(Link{});
}

void set_link(storage::Transaction &transaction, std::string_view uplink, Link const &link) {
  auto const before = link_of(transaction, uplink);
  auto changed = link;
  changed.up_since = link.up() && !before.up() ? clock_now(transaction) : before.up_since;
  storage::put_link(transaction, uplink, changed);
}

std::vector<Lag> lags_of(storage::Transaction &transaction, storage::SwitchKey switch_key) {
  std::vector<Lag> lags;
  for (auto const &row : storage::all_lags(transaction, switch_key)) {
    Lag lag{.id = static_cast<std::uint32_t>(row.id), .name = row.name, .members = {}};
    for (auto const &uplink : row.uplinks) {
      lag.members.push_back(member_of(transaction, uplink));
    }
    lags.push_back(std::move(lag));
  }
  return lags;
}

bool is_aggregated(storage::Transaction &transaction, std::string_view uplink) {
  return storage::is_in_lag(transaction, uplink);
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
  auto lag = storage::find_lag(transaction, switch_key, name);
  if (!lag) {
    if (storage::count_lags(transaction, switch_key) >= VS_MAX_LAGS) {
      throw Refused(QEX_LIMIT_EXCEEDED);
    }
    lag = storage::insert_lag(transaction, switch_key, name);
  }
  storage::empty_lag(transaction, *lag);
  for (auto const &uplink : uplinks) {
    get_uplink(transaction, switch_key, uplink);
    if (is_aggregated(transaction, uplink)) {
      throw Refused(QEX_BUSY);
    }
    storage::add_to_lag(transaction, *lag, uplink);
  }
}

}  // namespace simhost::stored
