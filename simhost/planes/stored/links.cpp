// What becomes of links.
#include "planes/stored/links.h"

#include "clock/clock.h"
#include "model/teaming/team.h"
#include "storage/store.h"

namespace simhost::stored {

Link link_of(storage::Transaction &transaction, std::string_view uplink) {
  return storage::find_link(transaction, uplink).value_or(Link{});
}

void set_link(storage::ChangingTransaction &transaction, std::string_view uplink,
              Link const &link) {
  auto const before = link_of(transaction, uplink);
  auto changed = link;
  changed.up_since = link.up() && !before.up() ? clock_now(transaction) : before.up_since;
  storage::put_link(transaction, uplink, changed);
}

bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) {
  return teaming::would_aggregate(link_of(transaction, uplink)) &&
         storage::is_in_lag(transaction, uplink);
}

}  // namespace simhost::stored
