// The call trap's globals: the module arms the buffer, the host's libraries fill in the rest and
// jump.

#include "helpers/call_trap.h"

#include "helpers/exported.h"

extern "C" {

EXPORTED jmp_buf exception_buffer;
EXPORTED int exception_status;
EXPORTED PyObject *exceptionType;
EXPORTED char *exceptionMsg;

PyObject *raise_sprung_trap(void) {
  PyErr_SetString(exceptionType, exceptionMsg);
  return nullptr;
}

}  // extern "C"
