// Honest answers instead of made-up ones.
#include "core/unmodelled.h"

#include "core/giving_up.h"

namespace simhost {

void refuse_unmodelled() {
  throw Refused(QEX_NOT_IMPLEMENTED);
}

void give_up_unmodelled() {
  throw HostPanic(PanicKind::runtime_error, "the simulated host does not model this call yet");
}

}  // namespace simhost
