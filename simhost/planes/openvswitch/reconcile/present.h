// What a switch has, in the form in which it is compared with what it is to have.
#pragma once

#include <span>
#include <vector>

#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/reconcile/difference.h"

namespace simhost::openvswitch {

/// Flows and groups that say more than the values here can are like none that is wanted.
struct Present {
  std::vector<openflow::Flow> flows;
  std::vector<openflow::Group> groups;  ///< in their order
  /// Flows among which some cannot be told by their places: to be removed by their cookies, of
  /// which no other flow is among `flows`.
  std::vector<LearnedFlows> unplaced;
};

Present present_of(std::span<openflow::FlowEntry const> flows,
                   std::span<openflow::GroupEntry const> groups);

}  // namespace simhost::openvswitch
