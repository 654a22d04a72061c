// MAC learning of a switch, whoever does it.
#pragma once

#include "base/api.h"
#include "storage/switches.h"
#include "vswitch/mac_learning.h"

namespace simhost::mac {

/// The switch's own setting, or the host's for a switch without one.
SIMHOST_API VSMACLearning learning_of(storage::Transaction &transaction, storage::SwitchKey key);

}  // namespace simhost::mac
