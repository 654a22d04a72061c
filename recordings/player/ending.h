// How a call that is played ends. Plain memory: it lies in frames that jumps cross.
#pragma once

#include <cstdint>

struct _object;

namespace recordings {

struct Ending {
  enum class Way : std::uint8_t { returns, traps, fails };

  Way way;
  std::uint64_t word;  ///< what is returned
  int value;           ///< of the jump
  _object *type;       ///< of what is raised; borrowed
};

}  // namespace recordings
