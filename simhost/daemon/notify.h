// Telling a service manager how this process is, by systemd's protocol (sd_notify(3)).
#pragma once

#include <string>

namespace simhost::daemon {

/// Sends assignments such as "READY=1\nSTATUS=..." to the manager that NOTIFY_SOCKET names; nothing
/// without one.
void notify(std::string const &assignments);

}  // namespace simhost::daemon
