// A frame as the command line gives it.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace simhost::cli {

/// Its bytes in hexadecimal, or words: dst=, src=, vlan= and priority= for a tag, type=, size=.
/// Throws Failure for what is neither.
std::vector<std::uint8_t> frame_from(std::vector<std::string> const &words);

}  // namespace simhost::cli
