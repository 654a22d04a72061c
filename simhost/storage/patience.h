// How long the host waits for other processes on one state.
#pragma once

#include <chrono>

namespace simhost::storage {

inline constexpr std::chrono::seconds kPatience{10};

}  // namespace simhost::storage
