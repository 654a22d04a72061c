// What a restart of the host leaves of its configuration.
#pragma once

#include "core/api.h"

namespace simhost::store {
class Transaction;
}

namespace simhost {

/// Drops what does not outlast a restart: switches that are not persistent, and runtime and
/// volatile properties. Ports keep their numbers.
SIMHOST_API void restart_configuration(store::Transaction &transaction);

}  // namespace simhost
