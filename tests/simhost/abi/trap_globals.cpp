// A call trap as the module would have it, and stand-ins for the interpreter's exception types.
#include "trap_globals.h"

namespace {
_object runtime_error{"RuntimeError"};
_object os_error{"OSError"};
_object value_error{"ValueError"};
}  // namespace

extern "C" {
jmp_buf exception_buffer;
int exception_status;
_object *exceptionType;
char *exceptionMsg;

_object *PyExc_RuntimeError = &runtime_error;
_object *PyExc_OSError = &os_error;
_object *PyExc_ValueError = &value_error;
}
