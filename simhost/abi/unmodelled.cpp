// Honest answers instead of made-up ones.
#include "abi/unmodelled.h"

#include "base/outcomes.h"

namespace simhost {

void refuse_unmodelled() {
  throw Refused(QEX_NOT_IMPLEMENTED);
}

void give_up_unmodelled() {
  throw Trapped(TrapKind::runtime_error, "the simulated host does not model this call yet");
}

}  // namespace simhost
