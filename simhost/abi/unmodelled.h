// What a call answers that the simulated host does not model yet.
#pragma once

#include "base/api.h"

namespace simhost {

/// Refuses the call with QEX_NOT_IMPLEMENTED.
[[noreturn]] SIMHOST_API void refuse_unmodelled();
/// Gives up on a call that has no status to answer with: any other answer would be made up.
[[noreturn]] SIMHOST_API void give_up_unmodelled();

}  // namespace simhost
