// The text of a status, from a table that the build makes of the status header, and Panic.
#include "vswitch/status_text.h"

#include <cstdio>

extern "C" {

char const *QEX_ReturnStatusToString(QEX_ReturnStatus status) {
  // As a number: callers pass any, and the enumeration does not hold them all.
  switch (static_cast<int>(status)) {
#define STATUS_TEXT(status, text) \
  case status:                    \
    return text;
#include "status_texts.inc"
#undef STATUS_TEXT
    default:
      return nullptr;
  }
}

// The arguments are left alone: a format that comes from outside must never reach a formatter.
void Panic(char const *format, ...) {
  if (format == nullptr) {
    return;
  }
  std::fprintf(stderr, "%s\n", format);
}

}  // extern "C"
