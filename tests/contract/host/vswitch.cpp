// libvswitch.so of the recording host: a line for each call.

#include <cstdarg>

#include "recording.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include "vswitch/status_text.h"

CALL(VSDVS_CreateVSwitch);
CALL(VSDVS_DestroyVSwitch);
CALL(VSDVS_GetMTU);
CALL(VSDVS_SetMTU);
CALL(VSDVS_FreeMemory);

CALL(VSQEX_GetVSInfo);
CALL(VSQEX_FreeMemory);

CALL(QEX_ReturnStatusToString);

// The one call with variable arguments: the first of them is recorded as a pointer.
using PanicCall = recording::Call<"Panic", void(char const *, void *)>;
static recording::Declaration const declare_Panic{PanicCall{}};

[[gnu::visibility("default")]] void Panic(char const *format, ...) {
  va_list variable;
  va_start(variable, format);
  PanicCall::call(format, va_arg(variable, void *));
  va_end(variable);
}
