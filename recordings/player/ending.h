// How a call that is played ends. Plain memory: it lies in frames that jumps cross.
#pragma once

#include <cstdint>

namespace recordings {

struct Ending {
  enum class Way : std::uint8_t { returns, traps, fails };

  Way way;
  std::uint64_t word;      ///< what is returned
  int value;               ///< of the jump
  char const *class_name;  ///< of what is raised, which stays; null for none
};

}  // namespace recordings
