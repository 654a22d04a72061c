// What was learned by a flow, as another one would have learned it: so that a change of what is
// learned does not make a switch forget whom it knows.
#pragma once

#include <optional>
#include <span>
#include <vector>

#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/reconcile/difference.h"

namespace simhost::openvswitch {

/// The one way in which some of the flows teach those, whatever their limits; nothing if there are
/// several.
std::optional<openflow::Learn> how_learned(std::span<openflow::Flow const> flows,
                                           LearnedFlows const &learned);

/// The flow that `learn` would have made of the frame of which `before` was made; nothing if that
/// does not tell enough of it.
std::optional<openflow::Flow> relearned(openflow::Learn const &learn, openflow::Flow const &before);

}  // namespace simhost::openvswitch
