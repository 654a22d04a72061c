// Out of line, so that what is thrown is thrown in the library that catches it.
#include "base/outcomes.h"

namespace simhost {

std::optional<TrapKind> find_trap_kind(std::string_view type) {
#define SIMHOST_KIND(kind, name) \
  if (type == #name) {           \
    return TrapKind::kind;       \
  }
  SIMHOST_TRAP_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
  return std::nullopt;
}

std::string trap_types() {
  std::string types;
#define SIMHOST_KIND(kind, name) types += types.empty() ? #name : ", " #name;
  SIMHOST_TRAP_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
  return types;
}

void refuse(QEX_ReturnStatus status) {
  throw Refused(status);
}

}  // namespace simhost
