// What becomes of links.
#include "planes/stored/links.h"

#include "clock/clock.h"
#include "model/teaming/team.h"
#include "storage/store.h"

namespace simhost::stored {

Link link_of(storage::Transaction &transaction, std::string_view uplink) {
  return storage::find_link(transaction, uplink).value_or(Link{});
}

bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) {
  return teaming::would_aggregate(link_of(transaction, uplink)) &&
         storage::is_in_lag(transaction, uplink);
}

}  // namespace simhost::stored
