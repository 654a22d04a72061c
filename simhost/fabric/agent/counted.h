// What this host has counted of shared ports, and the fabric has not yet.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "fabric/rows/rows.h"
#include "storage/shared.h"
#include "storage/store.h"

namespace simhost::fabric {

/// Whether a port that was connected at the host is so no longer.
bool lets_any_go(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes,
                 std::string const &host);
/// What the fabric is to be told.
struct Untold {
  std::map<std::string, Json> operations;  ///< by the switch, only of those of which there is any
  std::uint64_t change = 0;                ///< of the state, when that was looked at
};
/// Nothing while somebody else has the state. What the fabric has of this host and the state has
/// not, as one that was restored, comes back first, so that nothing falls.
std::optional<Untold> untold(storage::Store &store, ovsdb::Replica const &replica,
                             storage::Membership const &membership);

}  // namespace simhost::fabric
