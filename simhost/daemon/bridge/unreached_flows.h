// What a bridge is told while no frame can come to it yet.
#pragma once

#include <cstddef>
#include <filesystem>

#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// Drops whatever comes in.
openflow::Flow gate();

/// Adds all groups and flows, and gate(), to a bridge that has neither flows nor groups and is to
/// have many; `socket` is the bridge's own. So nothing passes until the gate goes, which is no
/// matter of this. Returns how many it added, the gate not counted: all or none, unless it throws
/// std::runtime_error: then some may be there, kept from frames by the gate. For `lives` see
/// openvswitch::Stream.
std::size_t add_unreached(openflow::Connection &connection, std::filesystem::path const &socket,
                          openvswitch::Compiled const &wanted, openvswitch::Deadline deadline,
                          openvswitch::Lives const &lives = {});

}  // namespace simhost::daemon
