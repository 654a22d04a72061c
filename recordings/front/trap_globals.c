// The call trap's globals, for a process that has the host's libraries before the module: these
// look for them when they are loaded, and the module, which comes later, takes the ones that are
// there.

#include "vswitch/call_trap.h"

#define EXPORTED __attribute__((visibility("default")))

EXPORTED jmp_buf exception_buffer;
EXPORTED int exception_status;
EXPORTED struct _object *exceptionType;
EXPORTED char *exceptionMsg;
