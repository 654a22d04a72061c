// Policies of switches and ports as documents describe them, and as their properties hold them.
#pragma once

#include "base/bytes.h"
#include "scenario/document.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/teaming.h"

namespace simhost::scenario {

VSTeamPolicy teaming_from(Node const &node);
Json described(VSTeamPolicy const &policy);

VSMACLearning switch_learning_from(Node const &node);
Json described(VSMACLearning const &learning);

VSPMACManagement port_learning_from(Node const &node);
Json described(VSPMACManagement const &management);

/// A whole mirror session table.
Bytes mirror_sessions_from(Node const &node);
Json mirror_sessions_to_json(BytesView table);

}  // namespace simhost::scenario
