// Which of the copies of a frame that the network floods to all uplinks is taken.
#pragma once

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// What takes a frame from an uplink for the ports of a way, to kDispatch with kWay; nothing where
/// the way does not use the uplink. The network floods to all uplinks but what it has one receiver
/// for.
Actions receive_by(Way const &way, Uplink const &uplink, bool has_one_receiver);

}  // namespace simhost::openvswitch
