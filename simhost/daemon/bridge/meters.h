// The meters of a bridge: how much of what comes in its flows may send up to this process.
#pragma once

#include <cstdint>
#include <set>
#include <vector>

#include "planes/openvswitch/openflow/connection.h"
#include "planes/openvswitch/openflow/flows/flow_parts.h"

namespace simhost::daemon {

class Meters {
 public:
  /// The bridge has those of these flows from now on, and none that others made.
  void replace(openflow::Connection &connection, openflow::FlowParts const &flows,
               openvswitch::Deadline deadline);
  /// Likewise those of flows that come, before they do. All stay: another device will have the
  /// number.
  void add(openflow::Connection &connection, std::vector<openflow::Flow> const &flows,
           openvswitch::Deadline deadline);

 private:
  std::set<std::uint32_t> present_;
};

}  // namespace simhost::daemon
