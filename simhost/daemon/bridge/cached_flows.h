// What the data path of an Open vSwitch remembers of its flows, so that not every frame is looked
// up.
#pragma once

#include <filesystem>

namespace simhost::daemon {

/// Makes the Open vSwitch whose database has its socket in `folder` forget that, so that the next
/// frame of each kind is looked up. Throws std::runtime_error.
///
/// By itself it looks at what it remembers when flows change, but passes over some of it where that
/// is much: frames went on for up to 1.5 s as they had before.
void forget_cached_flows(std::filesystem::path const &folder);

}  // namespace simhost::daemon
