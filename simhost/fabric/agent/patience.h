// How long a request of a host's own to its fabric is waited for.
#pragma once

#include <chrono>

#include "fabric/cluster/cluster.h"

namespace simhost::fabric {

inline constexpr std::chrono::seconds kPatience{4};

inline Deadline from_now(std::chrono::milliseconds time) {
  return Deadline::clock::now() + time;
}

}  // namespace simhost::fabric
