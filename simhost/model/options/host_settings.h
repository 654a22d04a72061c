// Settings of the host as a whole. None outlasts a restart of the host.
#pragma once

#include <array>
#include <cstdint>

#include "base/api.h"
#include "model/properties/form.h"
#include "vswitch/mac_learning.h"
#include "vswitch/mac_tables.h"

namespace simhost::storage {
class ChangingTransaction;
class Transaction;
}  // namespace simhost::storage

namespace simhost {

/// MAC learning of the switches that have no setting of their own: what there is to set, and what
/// it is on a fresh host.
inline constexpr std::array kGlobalLearningMembers{
    form::member(
        "aging_time",
        form::number<&VSMACLearningGlobalProps::agingTime>(1, VS_MAC_LEARNING_AGING_TIME_MAX),
        "seconds until a learned address goes"),
    form::member("limit", form::number<&VSMACLearningGlobalProps::macLimit>(0, UINT32_MAX),
                 "learned addresses of a switch"),
    form::member("learn_static", form::boolean<&VSMACLearningGlobalProps::learnStatic>(),
                 "whether a static address moves when it is seen elsewhere"),
};
inline constexpr VSMACLearningGlobalProps kGlobalLearning{
    .agingTime = VS_MAC_LEARNING_AGING_TIME_DEFAULT,
    .macLimit = VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT,
    .learnStatic = VS_MAC_LEARNING_LEARN_STATIC_DEFAULT};

SIMHOST_API VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction);
/// Refuses an ageing time of 0 or more than VS_MAC_LEARNING_AGING_TIME_MAX (QEX_BAD_PARAM).
SIMHOST_API void set_global_mac_learning(storage::ChangingTransaction &transaction,
                                         VSMACLearningGlobalProps const &given);

}  // namespace simhost
