// Devices by ioctl, and their changes by netlink: both are of the namespace, as files in /sys need
// not be.
#include "daemon/network_devices.h"

#include <linux/ethtool.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <array>
#include <utility>

namespace simhost::daemon {
namespace {

using events::Descriptor;

Descriptor any_socket() {
  return events::owned(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0), "socket");
}

ifreq request_for(std::string_view name) {
  ifreq request{};
  name.copy(static_cast<char *>(request.ifr_name), sizeof request.ifr_name - 1);
  return request;
}

void add_speed(Descriptor const &socket, std::string_view name, NetworkDevice &device) {
  ethtool_cmd settings{};
  settings.cmd = ETHTOOL_GSET;
  auto request = request_for(name);
  request.ifr_data = reinterpret_cast<char *>(&settings);
  if (ioctl(socket.number(), SIOCETHTOOL, &request) != 0) {
    return;
  }
  auto const speed = ethtool_cmd_speed(&settings);
  if (speed != 0 && speed != static_cast<std::uint32_t>(SPEED_UNKNOWN)) {
    device.speed = speed;
  }
  device.full_duplex = settings.duplex != DUPLEX_HALF;
}

Descriptor link_events() {
  auto socket_ = events::owned(
      socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE), "socket");
  sockaddr_nl address{};
  address.nl_family = AF_NETLINK;
  address.nl_groups = RTMGRP_LINK;
  if (bind(socket_.number(), reinterpret_cast<sockaddr const *>(&address), sizeof address) != 0) {
    events::fail_with_errno("netlink");
  }
  return socket_;
}

}  // namespace

std::optional<NetworkDevice> find_network_device(std::string_view name) {
  auto const socket = any_socket();
  auto request = request_for(name);
  if (name.size() >= sizeof request.ifr_name ||
      ioctl(socket.number(), SIOCGIFINDEX, &request) != 0) {
    return std::nullopt;
  }
  NetworkDevice device{.index = static_cast<unsigned>(request.ifr_ifindex),
                       .is_up = false,
                       .has_link = false,
                       .mtu = 0,
                       .speed = std::nullopt,
                       .full_duplex = true};
  if (ioctl(socket.number(), SIOCGIFFLAGS, &request) != 0) {
    return std::nullopt;
  }
  auto const flags = static_cast<unsigned short>(request.ifr_flags);
  device.is_up = (flags & IFF_UP) != 0;
  device.has_link = (flags & IFF_RUNNING) != 0;
  if (ioctl(socket.number(), SIOCGIFMTU, &request) == 0) {
    device.mtu = static_cast<std::uint32_t>(request.ifr_mtu);
  }
  add_speed(socket, name, device);
  return device;
}

void switch_network_device(std::string_view name, bool up) {
  auto const socket = any_socket();
  auto request = request_for(name);
  if (ioctl(socket.number(), SIOCGIFFLAGS, &request) != 0) {
    events::fail_with_errno(std::string(name));
  }
  auto const flags = static_cast<unsigned short>(request.ifr_flags);
  auto const wanted = static_cast<unsigned short>(up ? flags | IFF_UP : flags & ~IFF_UP);
  request.ifr_flags = static_cast<short>(wanted);
  if (flags != wanted && ioctl(socket.number(), SIOCSIFFLAGS, &request) != 0) {
    events::fail_with_errno(std::string(name));
  }
}

NetworkDeviceWatch::NetworkDeviceWatch(events::Loop &loop, std::function<void()> changed)
    : socket_(link_events()),
      changed_(std::move(changed)),
      watch_(loop.watch(socket_.number(), [this] {
        // What they say is looked up when it is needed, so that none can be missed.
        std::array<char, 16384> part{};
        while (recv(socket_.number(), part.data(), part.size(), 0) > 0) {
        }
        changed_();
      })) {}

}  // namespace simhost::daemon
