// Sources of frames that may come back over another uplink.
#pragma once

#include <cstdint>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/openflow/action.h"

namespace simhost::openvswitch {

/// Remembers that the source of a frame in kDomain sent from a port just before.
openflow::Learn recent_source(std::uint32_t number, Recent recent);

}  // namespace simhost::openvswitch
