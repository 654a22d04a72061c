// Settings of the host as a whole. None outlasts a restart of the host.
#pragma once

#include "base/api.h"
#include "vswitch/mac_tables.h"

namespace simhost::storage {
class Transaction;
}

namespace simhost {

/// MAC learning of the switches that have no setting of their own.
SIMHOST_API VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction);
/// Refuses an ageing time of 0 or more than VS_MAC_LEARNING_AGING_TIME_MAX (QEX_BAD_PARAM).
SIMHOST_API void set_global_mac_learning(storage::Transaction &transaction,
                                         VSMACLearningGlobalProps const &props);

}  // namespace simhost
