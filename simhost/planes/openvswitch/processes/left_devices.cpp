// Bridges are known by their sockets; a device of the kernel's that has no process any more may be
// removed like any other.
#include "planes/openvswitch/processes/left_devices.h"

#include <net/if.h>
#include <sys/stat.h>

#include <fstream>
#include <memory>
#include <stdexcept>
#include <system_error>
#include <vector>

#include "events/netlink_request.h"
#include "events/process.h"

namespace simhost::openvswitch {
namespace {

// Of the data path in ovs-vswitchd itself.
constexpr auto *kDatapath = "ovs-netdev";

bool is_of_bridge(std::filesystem::path const &socket) {
  return socket.extension() == ".mgmt" || socket.extension() == ".snoop";
}

std::vector<std::filesystem::path> sockets_of_bridges(std::filesystem::path const &folder) {
  std::vector<std::filesystem::path> sockets;
  std::error_code error;
  for (auto const &entry : std::filesystem::directory_iterator(folder, error)) {
    if (is_of_bridge(entry.path())) {
      sockets.push_back(entry.path());
    }
  }
  return sockets;
}

void remove_device(std::string const &name) {
  ifinfomsg device{};
  device.ifi_index = static_cast<int>(if_nametoindex(name.c_str()));
  if (device.ifi_index != 0) {
    try {
      events::NetlinkRequest(RTM_DELLINK, NLM_F_ACK, device).exchanged();
    } catch (std::runtime_error const &) {
      // It goes with the last process that has it open.
    }
  }
}

// What tells its network namespace from others; 0 for a process that is gone. Its ns/net is not for
// everybody to read.
ino_t network_of(std::filesystem::path const &process) {
  struct stat found {};
  return stat((process / "net/dev").c_str(), &found) == 0 ? found.st_ino : 0;
}

bool is_switch(std::filesystem::path const &process) {
  std::string name;
  std::getline(std::ifstream(process / "comm"), name);
  return name == "ovs-vswitchd";
}

}  // namespace

std::set<std::string> network_devices() {
  std::unique_ptr<struct if_nameindex, decltype(&if_freenameindex)> const all(if_nameindex(),
                                                                              if_freenameindex);
  std::set<std::string> names;
  for (auto const *one = all.get(); one != nullptr && one->if_name != nullptr; ++one) {
    names.emplace(one->if_name);
  }
  return names;
}

std::set<std::string> devices_of_others(std::filesystem::path const &folder) {
  auto names = network_devices();
  auto const sockets = sockets_of_bridges(folder);
  for (auto const &socket : sockets) {
    names.erase(socket.stem());
  }
  if (!sockets.empty() && !is_switch_running()) {
    names.erase(kDatapath);
  }
  return names;
}

void remove_left(std::filesystem::path const &folder, std::set<std::string> const &of_others) {
  std::set<std::string> devices{kDatapath};
  for (auto const &socket : sockets_of_bridges(folder)) {
    devices.insert(socket.stem());
    std::error_code error;
    std::filesystem::remove(socket, error);
  }
  for (auto const &device : devices) {
    if (!of_others.contains(device)) {
      remove_device(device);
    }
  }
}

bool is_switch_running() {
  auto const own = network_of("/proc/self");
  std::error_code error;
  for (auto const &entry : std::filesystem::directory_iterator("/proc", error)) {
    auto const &process = entry.path();
    if (is_switch(process) && network_of(process) == own &&
        !events::is_ending(std::stoi(process.filename().native()))) {
      return true;
    }
  }
  return static_cast<bool>(error);
}

}  // namespace simhost::openvswitch
