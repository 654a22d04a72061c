// What is there is read: of what was to be changed nobody knows which half is.
#include "daemon/bridge/restoring.h"

#include "daemon/bridge/changes.h"
#include "planes/openvswitch/reconcile/difference.h"
#include "planes/openvswitch/reconcile/present.h"

namespace simhost::daemon {

void restore(openflow::Connection &connection, openvswitch::Compiled const &before,
             std::uint64_t generation, openvswitch::Deadline deadline) {
  auto flows = connection.flows({}, deadline);
  std::erase_if(flows, is_marker);
  auto const present = openvswitch::present_of(flows, connection.groups(deadline));
  openflow::Changes changes;
  add_changes(openvswitch::difference(present.flows, present.groups, before.flows, before.groups),
              changes);
  changes.emplace_back(openflow::FlowChange{.flow = openvswitch::generation_marker(generation)});
  connection.change(changes, deadline);
}

}  // namespace simhost::daemon
