// The call trap's globals: the module arms the buffer, the host's libraries fill in the rest and
// jump.

#include "vswitch/call_trap.h"

#include "helpers/exported.h"

extern "C" {

EXPORTED jmp_buf exception_buffer;
EXPORTED int exception_status;
EXPORTED struct _object *exceptionType;
EXPORTED char *exceptionMsg;

}  // extern "C"
