// A bridge that Open vSwitch changed in part, against its word.
#pragma once

#include <cstdint>

#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// It has these flows and groups, and tells that generation, again; what it had learned may be
/// gone. Throws what a Connection does.
void restore(openflow::Connection &connection, openvswitch::Compiled const &before,
             std::uint64_t generation, openvswitch::Deadline deadline);

}  // namespace simhost::daemon
