// What the kernel tells by netlink, and what can only be asked by ioctl: both are of the namespace,
// as files in /sys need not be.
#include "daemon/devices/network_devices.h"

#include <linux/ethtool.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <net/if_arp.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>
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

Descriptor told_of_links() {
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

// The counters of each are not asked for.
struct QuestionForAll {
  nlmsghdr header{.nlmsg_len = sizeof(QuestionForAll),
                  .nlmsg_type = RTM_GETLINK,
                  .nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP,
                  .nlmsg_seq = 0,
                  .nlmsg_pid = 0};
  ifinfomsg info{};
  rtattr mask{.rta_len = RTA_LENGTH(sizeof(std::uint32_t)), .rta_type = IFLA_EXT_MASK};
  std::uint32_t filter = RTEXT_FILTER_SKIP_STATS;
};

unsigned short flags_of(Descriptor const &socket, std::string_view name) {
  auto request = request_for(name);
  if (ioctl(socket.number(), SIOCGIFFLAGS, &request) != 0) {
    events::fail_with_errno(std::string(name));
  }
  return static_cast<unsigned short>(request.ifr_flags);
}

void set_flag(std::string_view name, unsigned flag, bool is_set) {
  auto const socket = any_socket();
  auto const flags = flags_of(socket, name);
  auto const wanted = static_cast<unsigned short>(is_set ? flags | flag : flags & ~flag);
  auto request = request_for(name);
  request.ifr_flags = static_cast<short>(wanted);
  if (flags != wanted && ioctl(socket.number(), SIOCSIFFLAGS, &request) != 0) {
    events::fail_with_errno(std::string(name));
  }
}

void wait_to_receive(Descriptor const &socket) {
  pollfd polled{.fd = socket.number(), .events = POLLIN, .revents = 0};
  poll(&polled, 1, -1);
}

}  // namespace

NetworkDevices::NetworkDevices(events::Loop &loop, std::function<void()> changed)
    : socket_(told_of_links()),
      changed_(std::move(changed)),
      watch_(loop.watch(socket_.number(), [this] {
        try {
          refresh();
        } catch (std::runtime_error const &) {
          changed_();  // who looks asks again, and hears what is wrong
        }
      })) {
  ask_for_all();
  take_told();
}

void NetworkDevices::ask_for_all() {
  devices_.clear();
  names_.clear();
  QuestionForAll const question;
  if (send(socket_.number(), &question, sizeof question, 0) < 0) {
    events::fail_with_errno("netlink");
  }
  is_asked_ = true;
}

void NetworkDevices::refresh() {
  if (take_told()) {
    changed_();
  }
}

bool NetworkDevices::take_told() {
  bool has_changed = false;
  if (!is_asked_ && std::exchange(is_to_be_asked_again_, false)) {
    ask_for_all();
    has_changed = true;
  }
  alignas(nlmsghdr) std::array<char, 65536> part;
  while (true) {
    auto const size = recv(socket_.number(), part.data(), part.size(), 0);
    if (size >= 0) {
      has_changed |= take({part.data(), static_cast<std::size_t>(size)});
    } else if (errno == ENOBUFS) {
      // Some were lost.
      has_changed = true;
      ask_for_all_again();
    } else if (errno == EAGAIN && is_asked_) {
      wait_to_receive(socket_);
    } else if (errno == EAGAIN) {
      return has_changed;
    } else if (errno != EINTR) {
      events::fail_with_errno("netlink");
    }
  }
}

// The kernel replies to one question after the other.
void NetworkDevices::ask_for_all_again() {
  if (is_asked_) {
    is_to_be_asked_again_ = true;
  } else {
    ask_for_all();
  }
}

bool NetworkDevices::take(std::span<char const> messages) {
  bool has_changed = false;
  auto size = messages.size();
  for (auto const *header = reinterpret_cast<nlmsghdr const *>(messages.data());
       NLMSG_OK(header, size); header = NLMSG_NEXT(header, size)) {
    if ((header->nlmsg_flags & NLM_F_DUMP_INTR) != 0) {
      is_to_be_asked_again_ = true;
    }
    if (header->nlmsg_type == NLMSG_DONE) {
      is_asked_ = false;
      if (std::exchange(is_to_be_asked_again_, false)) {
        ask_for_all();
      }
    } else if (header->nlmsg_type == NLMSG_ERROR) {
      is_asked_ = false;
      is_to_be_asked_again_ = true;
      throw std::runtime_error("the kernel does not tell its network devices");
    } else {
      has_changed |= take_device(*header);
    }
  }
  return has_changed;
}

bool NetworkDevices::take_device(nlmsghdr const &header) {
  auto const &info = *static_cast<ifinfomsg const *>(NLMSG_DATA(&header));
  // Others are of a bridge, about one of its ports.
  if (info.ifi_family != AF_UNSPEC) {
    return false;
  }
  auto const index = static_cast<unsigned>(info.ifi_index);
  if (header.nlmsg_type == RTM_DELLINK) {
    return remove(index);
  }
  NetworkDevice device{.index = index,
                       .is_up = (info.ifi_flags & IFF_UP) != 0,
                       .has_link = false,
                       .mtu = 0,
                       .has_ethernet = info.ifi_type == ARPHRD_ETHER};
  std::string name;
  auto size = IFLA_PAYLOAD(&header);
  for (auto const *attribute = IFLA_RTA(&info); RTA_OK(attribute, size);
       attribute = RTA_NEXT(attribute, size)) {
    if (attribute->rta_type == IFLA_IFNAME) {
      name = static_cast<char const *>(RTA_DATA(attribute));
    } else if (attribute->rta_type == IFLA_MTU) {
      std::memcpy(&device.mtu, RTA_DATA(attribute), sizeof device.mtu);
    } else if (attribute->rta_type == IFLA_CARRIER) {
      // At once, where IFF_RUNNING may follow a second later.
      device.has_link =
          device.is_up && *static_cast<std::uint8_t const *>(RTA_DATA(attribute)) != 0;
    } else if (attribute->rta_type == IFLA_MASTER) {
      std::memcpy(&device.master, RTA_DATA(attribute), sizeof device.master);
    }
  }
  return put(name, device);
}

bool NetworkDevices::put(std::string const &name, NetworkDevice const &device) {
  auto const known = names_.find(device.index);
  bool const is_new = known == names_.end() || known->second != name;
  if (is_new) {
    remove(device.index);
    names_[device.index] = name;
  }
  auto &present = devices_[name];
  return std::exchange(present, device) != device || is_new;
}

bool NetworkDevices::remove(unsigned index) {
  auto const name = names_.find(index);
  if (name == names_.end()) {
    return false;
  }
  auto const device = devices_.find(name->second);
  if (device != devices_.end() && device->second.index == index) {
    devices_.erase(device);
  }
  names_.erase(name);
  return true;
}

std::optional<NetworkDevice> NetworkDevices::find(std::string_view name) const {
  auto const found = devices_.find(name);
  return found == devices_.end() ? std::nullopt : std::optional(found->second);
}

std::map<std::string, std::uint32_t> NetworkDevices::smaller_than(std::uint32_t bytes) const {
  std::map<std::string, std::uint32_t> found;
  for (auto const &[name, device] : devices_) {
    if (device.mtu < bytes) {
      found.emplace(name, device.mtu);
    }
  }
  return found;
}

std::vector<std::string> NetworkDevices::switched_off() const {
  std::vector<std::string> names;
  for (auto const &[name, device] : devices_) {
    if (!device.is_up) {
      names.push_back(name);
    }
  }
  return names;
}

std::string NetworkDevices::master_of(std::string_view name) const {
  auto const device = devices_.find(name);
  auto const master = device == devices_.end() ? names_.end() : names_.find(device->second.master);
  return master == names_.end() ? std::string() : master->second;
}

WireSpeed wire_speed(std::string_view device) {
  WireSpeed speed{.mbits = std::nullopt, .full_duplex = true};
  ethtool_cmd settings{};
  settings.cmd = ETHTOOL_GSET;
  auto request = request_for(device);
  request.ifr_data = reinterpret_cast<char *>(&settings);
  if (ioctl(any_socket().number(), SIOCETHTOOL, &request) == 0) {
    auto const mbits = ethtool_cmd_speed(&settings);
    if (mbits != 0 && mbits != static_cast<std::uint32_t>(SPEED_UNKNOWN)) {
      speed.mbits = mbits;
    }
    speed.full_duplex = settings.duplex != DUPLEX_HALF;
  }
  return speed;
}

void set_network_device_mtu(std::string_view name, std::uint32_t bytes) {
  auto request = request_for(name);
  request.ifr_mtu = static_cast<int>(bytes);
  if (ioctl(any_socket().number(), SIOCSIFMTU, &request) != 0) {
    events::fail_with_errno(std::string(name));
  }
}

void switch_network_device(std::string_view name, bool up) {
  set_flag(name, IFF_UP, up);
}

bool resolves(std::string_view name) {
  return (flags_of(any_socket(), name) & IFF_NOARP) == 0;
}

void let_resolve(std::string_view name, bool resolves) {
  set_flag(name, IFF_NOARP, !resolves);
}

}  // namespace simhost::daemon
