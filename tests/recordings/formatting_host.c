// libvswitch.so of a host that has but one call, and writes what it is given.

#include <stdarg.h>
#include <stdio.h>

#include "vswitch/status_text.h"

void Panic(char const *format, ...) {
  va_list more;
  va_start(more, format);
  vfprintf(stderr, format, more);
  va_end(more);
}
