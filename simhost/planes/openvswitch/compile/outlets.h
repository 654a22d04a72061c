// How frames leave by the ways of a switch: over which uplink, or by which group.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "planes/openvswitch/compile/ways.h"
#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openvswitch {

struct Outlets {
  std::map<std::uint32_t, openflow::Actions> actions;  ///< by the numbers of the ways
  std::vector<openflow::Group> groups;                 ///< to which these lead
};

Outlets outlets_of(Ways const &ways);

/// To the wire of an uplink.
openflow::Actions over(openflow::Port uplink);

}  // namespace simhost::openvswitch
