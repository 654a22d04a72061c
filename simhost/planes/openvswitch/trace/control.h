// The control socket of ovs-vswitchd, of which ovs-appctl(8) asks as well.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "planes/openvswitch/transport/system.h"

namespace simhost::openvswitch {

/// The one of the ovs-vswitchd whose database has its socket in `folder`. Throws std::runtime_error
/// if there is none.
std::filesystem::path find_control_socket(std::filesystem::path const &folder);

/// What it says to a command. Throws std::runtime_error with its reason if it refuses it, and what
/// Stream does.
std::string ask_control(std::filesystem::path const &socket, std::string const &command,
                        std::vector<std::string> const &words, Deadline deadline);

}  // namespace simhost::openvswitch
