// Which frames are those of groups, and which of them say who wants what.
#pragma once

#include <vector>

#include "planes/openvswitch/compile/program.h"
#include "planes/openvswitch/multicast/address.h"

namespace simhost::openvswitch {

/// Frames without a tag inside, of all groups of a family.
Match group_frames(multicast::Family family);
/// Those of hosts and routers that membership is known by.
std::vector<Match> group_messages(multicast::Family family);

}  // namespace simhost::openvswitch
