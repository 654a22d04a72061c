// A difference as changes that a bridge is told in one bundle.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/reconcile/difference.h"

namespace simhost::daemon {

/// Whether a flow says which generation of the bridge is in force, and nothing else.
bool is_marker(openflow::FlowEntry const &entry);
/// In the order in which nothing refers to what is not there.
void add_changes(openvswitch::Difference const &difference, openflow::Changes &changes);
/// These go, if they are there.
void add_removals(std::vector<openflow::Flow> const &flows, openflow::Changes &changes);
/// All that the bridge learned goes: before anything that teaches it otherwise.
void add_forgetting(openflow::Changes &changes);
/// The meter that a flow sends frames through.
std::optional<std::uint32_t> meter_of(openflow::Flow const &flow);
/// Whether flows go, or begin anew, that count for others.
bool ends_counting(openvswitch::Difference const &difference);
/// How many flows and groups it changes, those not counted that are forgotten.
std::size_t size_of(openvswitch::Difference const &difference);

}  // namespace simhost::daemon
