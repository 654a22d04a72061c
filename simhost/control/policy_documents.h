// Policies of switches and ports as documents describe them, and as their properties hold them.
#pragma once

#include "control/document.h"
#include "core/bytes.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/teaming.h"

namespace simhost::control {

VSTeamPolicy teaming_from(Node const &node);
Json described(VSTeamPolicy const &policy);

VSMACLearning switch_learning_from(Node const &node);
Json described(VSMACLearning const &learning);

VSPMACManagement port_learning_from(Node const &node);
Json described(VSPMACManagement const &management);

/// A whole mirror session table.
Bytes mirror_sessions_from(Node const &node);
Json described_mirror_sessions(BytesView table);

}  // namespace simhost::control
