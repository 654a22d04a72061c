// Addresses of IPv4 and IPv6 as people write them.
#pragma once

#include <cstddef>
#include <span>
#include <string>

namespace simhost {

/// Of 4 or 16 bytes.
std::string ip_text(std::span<std::byte const> address);

}  // namespace simhost
