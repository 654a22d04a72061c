// Whether Open vSwitch made a bridge that its database has.
#pragma once

#include <filesystem>

#include "daemon/wanted.h"

namespace simhost::daemon {

/// `socket` is the bridge's own. Throws std::runtime_error, which says what it may want for.
void require_made(WantedBridge const &wanted, std::filesystem::path const &socket);

}  // namespace simhost::daemon
