// How long the key of a property may be.
#pragma once

#include <cstddef>

namespace simhost {

/// In bytes.
inline constexpr std::size_t kLongestKey = 255;

}  // namespace simhost
