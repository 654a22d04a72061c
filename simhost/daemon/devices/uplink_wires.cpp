// One question for each wire: there are few, and of a thousand ports nobody asks.
#include "daemon/devices/uplink_wires.h"

#include <fmt/format.h>
#include <linux/if_link.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <stdexcept>
#include <system_error>

#include "events/netlink_request.h"

namespace simhost::daemon {

using events::NetlinkRequest;

void UplinkWires::follow(std::set<std::string> const &devices) {
  std::erase_if(wires_, [&](auto const &wire) { return !devices.contains(wire.first); });
  for (auto const &device : devices) {
    wires_.try_emplace(device);
  }
}

void UplinkWires::leave_lost(NetworkDevices const &devices) {
  for (auto &[name, wire] : wires_) {
    auto const device = devices.find(name);
    auto const index = device && device->has_link ? device->index : 0;
    if (wire.index != index) {
      wire = {.index = index};
    }
  }
}

bool UplinkWires::look_at(Wire &wire, Ask const &ask) {
  auto const arrived = wire.index != 0 ? ask(wire.index) : std::nullopt;
  if (!arrived) {
    return false;
  }
  auto const before = wire.frames.percent();
  wire.frames.count(events::Clock::now(), *arrived);
  return wire.frames.percent() != before;
}

bool UplinkWires::look(NetworkDevices const &devices,
                       std::function<void(std::string const &)> const &say) {
  leave_lost(devices);
  bool any = false;
  for (auto &[name, wire] : wires_) {
    try {
      any |= look_at(wire, ask_);
    } catch (std::runtime_error const &error) {
      say(fmt::format("what came in at the device {} is not known: {}", name, error.what()));
    }
  }
  return any;
}

std::optional<std::uint32_t> UplinkWires::damaged_percent(std::string_view device) const {
  auto const found = wires_.find(device);
  return found == wires_.end() ? std::nullopt : found->second.frames.percent();
}

std::optional<Arrived> arrived_at(unsigned device) {
  if_stats_msg asked{};
  asked.ifindex = device;
  asked.filter_mask = IFLA_STATS_FILTER_BIT(IFLA_STATS_LINK_64);
  NetlinkRequest request(RTM_GETSTATS, 0, asked);
  auto &reply = request.exchanged();
  auto const error = events::error_in(reply);
  if (error == ENODEV) {
    return std::nullopt;
  }
  if (error != 0) {
    throw std::system_error(error, std::generic_category(), "the counters of devices");
  }
  auto const *const head = static_cast<if_stats_msg const *>(NLMSG_DATA(&reply));
  auto const *const attribute = reinterpret_cast<rtattr const *>(
      reinterpret_cast<char const *>(head) + NLMSG_ALIGN(sizeof *head));
  auto const size = NLMSG_PAYLOAD(&reply, sizeof *head);
  rtnl_link_stats64 counted{};
  if (!RTA_OK(attribute, size) || attribute->rta_type != IFLA_STATS_LINK_64) {
    return std::nullopt;
  }
  std::memcpy(&counted, RTA_DATA(attribute),
              std::min<std::size_t>(sizeof counted, RTA_PAYLOAD(attribute)));
  return Arrived{.whole = counted.rx_packets, .damaged = counted.rx_errors};
}

}  // namespace simhost::daemon
