// One daemon for each state: a lock on a file beside it, which goes with the process that holds it.
#pragma once

#include <filesystem>

#include "events/descriptor.h"

namespace simhost::daemon {

/// Throws std::runtime_error, which says who holds it, if another process does.
events::Descriptor lock(std::filesystem::path const &file);

}  // namespace simhost::daemon
