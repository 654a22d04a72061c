// Whether a device can do it is known when it has done it: what limits it may be another device.
#include "daemon/devices/packet_sizes.h"

#include <fmt/format.h>

#include <algorithm>
#include <map>
#include <optional>
#include <span>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "model/properties/properties.h"
#include "model/switches/properties.h"
#include "storage/running/devices.h"

namespace simhost::daemon {
namespace {

std::string refusal(std::string const &device, std::uint32_t size, std::system_error const &error) {
  return fmt::format("the device {} cannot carry packets of {} bytes: {}", device, size,
                     error.code().message());
}

// One that is gone meanwhile has no size, and keeps no other from getting its own.
void put_back(std::string const &name, std::uint32_t size) {
  try {
    set_network_device_mtu(name, size);
  } catch (std::system_error const &) {
    // What stands in the way of the whole is told.
  }
}

// Those that carry less.
std::vector<std::pair<std::string, NetworkDevice>> too_small(PacketSizes const &sizes,
                                                             NetworkDevices const &devices) {
  std::vector<std::pair<std::string, NetworkDevice>> found;
  for (auto const &[name, size] : sizes) {
    if (auto const device = devices.find(name); device && device->mtu < size) {
      found.emplace_back(name, *device);
    }
  }
  return found;
}

std::optional<storage::SwitchKey> find_switch_at(storage::Transaction &transaction,
                                                 std::string_view device) {
  auto const holder = storage::find_device(transaction, device);
  if (!holder) {
    return std::nullopt;
  }
  auto port = holder->port;
  if (holder->uplink) {
    auto const uplink = storage::find_uplink(transaction, *holder->uplink);
    port = uplink ? uplink->port : std::nullopt;
  }
  return port ? std::optional(storage::get_port_row(transaction, *port).switch_key) : std::nullopt;
}

// 0 if it is at none.
std::uint32_t size_of_switch_at(storage::Transaction &transaction, std::string_view device) {
  auto const key = find_switch_at(transaction, device);
  return key ? effective(transaction, switches::mtu, storage::PropertyOwner::global(*key)) : 0;
}

}  // namespace

void add_packet_sizes(storage::Transaction &transaction, storage::SwitchKey key, std::uint32_t size,
                      PacketSizes &sizes) {
  for (auto const &[port, device] : storage::port_devices(transaction, key)) {
    sizes[device.name] = size;
  }
  for (auto const &uplink : storage::uplinks_of(transaction, key)) {
    if (auto const device = storage::device_of(transaction, uplink.name)) {
      sizes[device->name] = size;
    }
  }
}

PacketSizes sizes_to_raise(storage::Transaction &transaction, NetworkDevices const &devices) {
  std::map<storage::SwitchKey, std::uint32_t> of_switches;
  std::uint32_t greatest = 0;
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    auto const size = effective(transaction, switches::mtu, storage::PropertyOwner::global(key));
    of_switches[key] = size;
    greatest = std::max<std::uint32_t>(greatest, size);
  }
  PacketSizes sizes;
  for (auto const &[name, present] : devices.smaller_than(greatest)) {
    auto const key = find_switch_at(transaction, name);
    if (key && of_switches.at(*key) > present) {
      sizes[name] = of_switches.at(*key);
    }
  }
  return sizes;
}

void raise_packet_sizes(PacketSizes const &sizes, NetworkDevices const &devices,
                        std::function<void(std::string const &)> const &say) {
  for (auto const &[name, device] : too_small(sizes, devices)) {
    try {
      set_network_device_mtu(name, sizes.at(name));
    } catch (std::system_error const &error) {
      say(refusal(name, sizes.at(name), error));
    }
  }
}

std::optional<std::string> raise_all_packet_sizes(storage::Transaction &before,
                                                  PacketSizes const &sizes,
                                                  NetworkDevices const &devices) {
  auto raised = too_small(sizes, devices);
  std::erase_if(raised, [&](auto const &one) {
    return size_of_switch_at(before, one.first) >= sizes.at(one.first);
  });
  for (std::size_t at = 0; at < raised.size(); ++at) {
    auto const &name = raised[at].first;
    try {
      set_network_device_mtu(name, sizes.at(name));
    } catch (std::system_error const &error) {
      for (auto const &[before, device] : std::span(raised).first(at)) {
        put_back(before, device.mtu);
      }
      return refusal(name, sizes.at(name), error);
    }
  }
  return std::nullopt;
}

}  // namespace simhost::daemon
