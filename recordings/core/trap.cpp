#include "recordings/core/trap.h"

#include <cstdint>

// Weak: there is an interpreter only in the module's processes.
// NOLINTNEXTLINE(readability-identifier-naming): the interpreter's own name
extern "C" char const *PyExceptionClass_Name(struct _object *type) __attribute__((weak));

namespace recordings {
namespace {

void write_text_or_null(Line &line, char const *text) {
  if (text != nullptr) {
    line.text(text);
  } else {
    line.raw("null");
  }
}

}  // namespace

void write_trap(Line &line, _object *type, char const *text, int value) noexcept {
  bool const has_name = type != nullptr && PyExceptionClass_Name != nullptr;
  line.member("trap").raw("{").member("type");
  write_text_or_null(line, has_name ? PyExceptionClass_Name(type) : nullptr);
  line.member("text");
  write_text_or_null(line, text);
  line.member("value").number(std::int64_t{value}).raw("}");
}

}  // namespace recordings
