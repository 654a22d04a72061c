// How long tests wait at most.
#pragma once

#include <chrono>

#include "planes/openvswitch/transport/system.h"

namespace simhost::openvswitch {

/// Long after anything should be done.
inline Deadline soon() {
  return Deadline::clock::now() + std::chrono::seconds(20);
}

}  // namespace simhost::openvswitch
