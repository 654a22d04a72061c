// The physical side of the uplinks: cables, and the switch at the other end.
#pragma once

#include <string_view>

#include "model/plane.h"

namespace simhost::stored {

Link link_of(storage::Transaction &transaction, std::string_view uplink);
/// See Plane::lacp_is_up.
bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink);

}  // namespace simhost::stored
