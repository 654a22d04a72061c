// Flows and groups with each field and each action, such as a switch accepts.
#pragma once

#include <vector>

#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openflow {

/// Each in a table or with a priority of its own. They lead to the groups below.
std::vector<Flow> sample_flows();
std::vector<Group> sample_groups();

}  // namespace simhost::openflow
