// How long a call waits for the daemon.
#pragma once

#include <chrono>

namespace simhost::openvswitch {

/// For its change to be in force, and for replies to its questions.
inline constexpr std::chrono::milliseconds kPatience{2000};

}  // namespace simhost::openvswitch
