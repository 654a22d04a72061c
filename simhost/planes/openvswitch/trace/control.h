// The control socket of ovs-vswitchd, of which ovs-appctl(8) asks as well.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "planes/openvswitch/transport/stream.h"

namespace simhost::openvswitch {

/// The one of the ovs-vswitchd whose database has its socket in `folder`. Throws std::runtime_error
/// if there is none.
std::filesystem::path find_control_socket(std::filesystem::path const &folder);

struct ControlCommand {
  std::string name;
  std::vector<std::string> words;
};

/// What it says to a command, or why it refuses it.
struct ControlReply {
  bool is_refused = false;
  std::string text;
};

/// What it says to several commands, which it takes in their order. Throws std::runtime_error for
/// what is no reply, and what Stream does, as for `lives`.
std::vector<ControlReply> ask_control(std::filesystem::path const &socket,
                                      std::vector<ControlCommand> const &commands,
                                      Deadline deadline, Lives const &lives = {});

/// What it says to one. Throws std::runtime_error with its reason if it refuses it, too.
std::string ask_control(std::filesystem::path const &socket, ControlCommand const &command,
                        Deadline deadline);

}  // namespace simhost::openvswitch
