// How long this process waits for an Open vSwitch before it gives it up.
#pragma once

#include <chrono>
#include <cstddef>

#include "planes/openvswitch/transport/system.h"

namespace simhost::daemon {

/// For what is asked of it now, of bridges with so many devices.
inline openvswitch::Deadline soon(std::size_t devices = 0) {
  constexpr auto kPatience = std::chrono::seconds(5);
  // More for each device: a machine that has other work to do takes so long, and another attempt
  // would begin at the beginning.
  constexpr auto kPatienceForEach = std::chrono::milliseconds(10);
  return openvswitch::Deadline::clock::now() + kPatience + devices * kPatienceForEach;
}

}  // namespace simhost::daemon
