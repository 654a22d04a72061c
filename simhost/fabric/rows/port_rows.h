// The rows of ports by what hosts call them, so that a change costs no look at all of them.
#pragma once

#include <vector>

#include "fabric/rows/rows.h"

namespace simhost::fabric {

class PortRows {
 public:
  /// Of a replica of which nobody told before.
  void begin(ovsdb::Replica const &replica);
  void follow(ovsdb::Replica const &replica, std::vector<ovsdb::RowChange> const &changes);
  /// The UUIDs of those ports that become other by changes, as far as they are known.
  [[nodiscard]] RowNames of(ovsdb::Replica const &replica,
                            std::vector<Change> const &changes) const;

 private:
  RowNames uuids_;
};

}  // namespace simhost::fabric
