// Devices that an ovs-vswitchd made, and leaves behind for as long as the kernel closes what it had
// open.
#pragma once

#include <filesystem>
#include <set>
#include <string>

namespace simhost::openvswitch {

/// The names of all network devices of this namespace.
std::set<std::string> network_devices();

/// Those that no ovs-vswitchd left which ran in this folder. The data path's device may be of any:
/// it is held to be another one's as long as one runs, or if none had a bridge here.
std::set<std::string> devices_of_others(std::filesystem::path const &folder);

/// Removes those that are the data path's and the bridges' own, so that another ovs-vswitchd can
/// make them anew, and the sockets in its folder that nobody serves any more. `of_others` stay.
/// What cannot be removed is left: it goes by itself, a little later.
void remove_left(std::filesystem::path const &folder, std::set<std::string> const &of_others);

/// Whether an ovs-vswitchd runs in this network namespace. One that is taken down does not; where
/// processes cannot be seen, one may.
bool is_switch_running();

}  // namespace simhost::openvswitch
