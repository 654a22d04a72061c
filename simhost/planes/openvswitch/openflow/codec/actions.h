// Lists of actions on the wire.
#pragma once

#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/codec/wire.h"

namespace simhost::openflow {

/// Throws std::invalid_argument for what has no form on the wire: parts of fields that only an
/// experimenter numbers, bits that are no bit.
void put_actions(Writer &out, Actions const &actions);

/// All that there is. Throws Malformed, and Foreign for an action that has no value here.
Actions take_actions(Reader &in);

}  // namespace simhost::openflow
