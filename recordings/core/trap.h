// What a trace tells of a call that trapped.
#pragma once

#include "recordings/core/line.h"

struct _object;

namespace recordings {

/// A member: the type and the text that the call left, if any, and the value of its jump.
void write_trap(Line &line, _object *type, char const *text, int value) noexcept;

}  // namespace recordings
