// Settings of the host as a whole, under names; one that was never set has no row. None outlasts a
// restart of the host.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "base/api.h"
#include "vswitch/mac_tables.h"

namespace simhost::storage {
class Transaction;
}

namespace simhost {

std::optional<std::int64_t> host_number(storage::Transaction &transaction, std::string_view name);
std::optional<std::string> host_text(storage::Transaction &transaction, std::string_view name);
void set_host_number(storage::Transaction &transaction, std::string_view name, std::int64_t value);
void set_host_text(storage::Transaction &transaction, std::string_view name,
                   std::string_view value);
void forget_host_settings(storage::Transaction &transaction);

/// MAC learning of the switches that have no setting of their own.
SIMHOST_API VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction);
/// Refuses an ageing time of 0 or more than VS_MAC_LEARNING_AGING_TIME_MAX (QEX_BAD_PARAM).
SIMHOST_API void set_global_mac_learning(storage::Transaction &transaction,
                                         VSMACLearningGlobalProps const &props);

}  // namespace simhost
