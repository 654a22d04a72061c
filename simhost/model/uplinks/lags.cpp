// The rules of groups; whether they are up, the plane knows.
#include "model/uplinks/lags.h"

#include <algorithm>
#include <utility>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"
#include "vswitch/lags.h"

namespace simhost {

bool Lag::up() const {
  return std::ranges::any_of(members, &Member::up);
}

std::vector<Lag> lags_of(storage::Transaction &transaction, storage::SwitchKey key) {
  std::vector<Lag> lags;
  for (auto const &row : storage::all_lags(transaction, key)) {
    Lag lag{.id = static_cast<std::uint32_t>(row.id),
            .name = row.name,
            .is_fast = row.is_fast,
            .members = {}};
    for (auto const &uplink : row.uplinks) {
      lag.members.push_back(
          {.uplink = uplink, .up = running_plane().lacp_is_up(transaction, uplink)});
    }
    lags.push_back(std::move(lag));
  }
  return lags;
}

void put_lag(storage::ChangingTransaction &transaction, storage::SwitchKey key,
             std::string_view name, std::vector<std::string> const &uplinks, bool is_fast) {
  if (name.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (name.size() >= VS_LACP_LAG_NAME_LENGTH) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  if (uplinks.size() > VS_MAX_UPLINKS_IN_LAG) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  auto lag = storage::find_lag(transaction, key, name);
  if (!lag) {
    if (storage::count_lags(transaction, key) >= VS_MAX_LAGS) {
      throw Refused(QEX_LIMIT_EXCEEDED);
    }
    lag = storage::insert_lag(transaction, key, name);
  }
  storage::set_lag_rate(transaction, *lag, is_fast);
  storage::empty_lag(transaction, *lag);
  for (auto const &uplink : uplinks) {
    get_uplink(transaction, key, uplink);
    if (storage::is_in_lag(transaction, uplink)) {
      throw Refused(QEX_BUSY);
    }
    if (storage::fabric_of(transaction, uplink)) {
      throw Refused(QEX_NOT_SUPPORTED, "tunnels are aggregated with nothing");
    }
    storage::add_to_lag(transaction, *lag, uplink);
  }
}

}  // namespace simhost
