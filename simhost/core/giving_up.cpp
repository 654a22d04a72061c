// Out of line, so that what is thrown is thrown in the library that catches it.
#include "core/giving_up.h"

namespace simhost {

std::optional<PanicKind> find_panic_kind(std::string_view type) {
#define SIMHOST_KIND(kind, name) \
  if (type == #name) {           \
    return PanicKind::kind;      \
  }
  SIMHOST_PANIC_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
  return std::nullopt;
}

std::string panic_types() {
  std::string types;
#define SIMHOST_KIND(kind, name) types += types.empty() ? #name : ", " #name;
  SIMHOST_PANIC_KINDS(SIMHOST_KIND)
#undef SIMHOST_KIND
  return types;
}

void refuse(QEX_ReturnStatus status) {
  throw Refused(status);
}

}  // namespace simhost
