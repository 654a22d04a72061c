// What a restart of the host leaves of its configuration.
#pragma once

#include "base/api.h"

namespace simhost::storage {
class ChangingTransaction;
}

namespace simhost {

/// Drops what does not outlast a restart: switches that are neither persistent nor shared, and
/// runtime and volatile properties. Ports keep their numbers.
SIMHOST_API void restart_configuration(storage::ChangingTransaction &transaction);

}  // namespace simhost
