// Flows and groups as ovs-ofctl(8) prints them with -O OpenFlow15 --no-stats, one to a line,
// without the space that its lines begin with.
#pragma once

#include <string>

#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"
#include "planes/openvswitch/openflow/match.h"

namespace simhost::openflow {

/// "table=3, priority=100,in_port=1 actions=resubmit(,4)"
std::string to_text(Flow const &flow);
/// "group_id=1,type=all,bucket=bucket_id:0,actions=output:1"
std::string to_text(Group const &group);
/// "ip,in_port=1,nw_dst=10.0.0.0/8"; nothing for all frames.
std::string to_text(Match const &match);
/// "set_field:0x1->reg0,resubmit(,1)"; "drop" for none.
std::string to_text(Actions const &actions);

}  // namespace simhost::openflow
