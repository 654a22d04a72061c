// The functions of the host, and calls of them that may trap.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "recordings/core/values.h"

struct _object;

namespace recordings {

/// How a call ended.
struct Ended {
  std::uint64_t result = 0;
  int trap = 0;  ///< the value of the jump, or 0
  _object *trap_type = nullptr;
  char const *trap_text = nullptr;
};

/// Finds all functions, and the trap, as a module has them that is loaded; what is lacking.
std::string find_host(char const *module);

/// Whether there is such a function, and all that it takes is in a trace.
bool has_function(std::size_t number) noexcept;

/// Makes a call with its arguments in 64 bits each.
Ended make_call(std::size_t number, Words words) noexcept;

}  // namespace recordings
