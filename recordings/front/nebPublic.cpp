// libnebPublic.so of the recorder: every call of the host's, forwarded.

#include <dlfcn.h>

#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "recordings/front/forward.h"

extern "C" {
#include "nebPublic_calls.inc"
}
