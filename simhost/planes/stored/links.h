// The physical side of the uplinks: cables, the switch at the other end, aggregation.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "model/plane.h"
#include "storage/running/links.h"

namespace simhost::stored {

using storage::Link;

Link link_of(storage::Transaction &transaction, std::string_view uplink);
/// Changes a link. Its up_since is kept by the clock, whatever `link` says.
void set_link(storage::Transaction &transaction, std::string_view uplink, Link const &link);

std::vector<Lag> lags_of(storage::Transaction &transaction, storage::SwitchKey switch_key);
/// Whether an uplink is in a group.
bool is_aggregated(storage::Transaction &transaction, std::string_view uplink);
/// Makes a group of a switch, or gives one other uplinks. Refuses a name without a letter or too
/// long for a VSLAGStatus (QEX_BAD_PARAM, QEX_NAME_TOO_LONG), more groups or uplinks than there may
/// be (QEX_LIMIT_EXCEEDED), an uplink that is not the switch's (QEX_NOT_FOUND) and one that is in
/// another group (QEX_BUSY).
void put_lag(storage::Transaction &transaction, storage::SwitchKey switch_key,
             std::string_view name, std::vector<std::string> const &uplinks);

}  // namespace simhost::stored
