// The numbers of VLANs, for every layer that holds one.
#pragma once

#include <cstdint>

namespace simhost {

/// 0 is "untagged", and 4095 is reserved.
inline constexpr std::uint16_t kGreatestVlan = 4094;

}  // namespace simhost
