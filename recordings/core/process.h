// Which process this is, without a system call each time.
#pragma once

#include <sys/types.h>

namespace recordings {

/// This process; of a child of a fork its own.
pid_t process_id() noexcept;

}  // namespace recordings
