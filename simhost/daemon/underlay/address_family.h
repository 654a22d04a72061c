// How the kernel calls the two kinds of addresses.
#pragma once

#include <sys/socket.h>

#include <cstdint>

#include "storage/tunnels/fabrics.h"

namespace simhost::daemon {

inline std::uint8_t family_of(storage::AddressBytes const &address) {
  return address.size() == 4 ? AF_INET : AF_INET6;
}

}  // namespace simhost::daemon
