// Link-aggregation groups: which uplinks of a switch are one link together.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "storage/running/links.h"

namespace simhost {

/// A group and its uplinks, each with whether aggregation uses it.
struct SIMHOST_API Lag {
  struct Member {
    std::string uplink;
    bool up;
  };

  std::uint32_t id;
  std::string name;
  bool is_fast;  ///< its partner is asked to tell of itself each second, not each 30 seconds
  std::vector<Member> members;

  /// A group carries frames while one of its uplinks does.
  [[nodiscard]] bool up() const;
};

/// The groups of a switch, in the order in which they were made.
SIMHOST_API std::vector<Lag> lags_of(storage::Transaction &transaction, storage::SwitchKey key);
/// Makes a group of a switch, or gives one other uplinks and another rate. Refuses a name without a
/// letter or too long for a VSLAGStatus (QEX_BAD_PARAM, QEX_NAME_TOO_LONG), more groups or uplinks
/// than there may be (QEX_LIMIT_EXCEEDED), an uplink that is not the switch's (QEX_NOT_FOUND) and
/// one that is in another group (QEX_BUSY).
void put_lag(storage::ChangingTransaction &transaction, storage::SwitchKey key,
             std::string_view name, std::vector<std::string> const &uplinks, bool is_fast = false);

}  // namespace simhost
