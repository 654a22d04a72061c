// Out of line, so that what is thrown is thrown in the library that catches it.
#include "core/giving_up.h"

namespace simhost {

void refuse(QEX_ReturnStatus status) {
  throw Refused(status);
}

}  // namespace simhost
