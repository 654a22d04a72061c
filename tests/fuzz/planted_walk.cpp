// A walk over options that does not know where the list ends, in place of the module's own.

#include <cstdint>

#include "helpers/runtime_options.h"

extern "C" VSRuntimeOptionHeader *__wrap_runtime_options_next(VSRuntimeOptions * /*list*/,
                                                              VSRuntimeOptionHeader *option) {
  return reinterpret_cast<VSRuntimeOptionHeader *>(reinterpret_cast<std::uintptr_t>(option) +
                                                   option->length);
}
