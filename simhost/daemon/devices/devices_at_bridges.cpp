// The kernel's index tells a device from the one that had its name before.
#include "daemon/devices/devices_at_bridges.h"

#include <algorithm>
#include <utility>

namespace simhost::daemon {

void DevicesAtBridges::follow(Wanted const &wanted, NetworkDevices const &devices) {
  std::erase_if(switches_, [&](auto const &known) {
    return std::ranges::find(wanted.unfit, known.first, &Unfit::key) == wanted.unfit.end();
  });
  for (auto const &bridge : wanted.bridges) {
    OfSwitch now;
    for (auto const &[name, number] : bridge.row.devices) {
      leave(name);
      if (auto const device = devices.find(name)) {
        now.indexes[name] = device->index;
      }
      if (!bridge.ports.contains(name)) {
        now.uplinks.insert(name);
      }
    }
    switches_[bridge.key] = std::move(now);
  }
}

// It may have come from another switch.
void DevicesAtBridges::leave(std::string const &name) {
  for (auto &[key, known] : switches_) {
    known.indexes.erase(name);
    known.uplinks.erase(name);
  }
}

bool DevicesAtBridges::contains(std::string const &device) const {
  return std::ranges::any_of(
      switches_, [&](auto const &known) { return known.second.indexes.contains(device); });
}

std::set<std::string> DevicesAtBridges::uplinks() const {
  std::set<std::string> all;
  for (auto const &[key, known] : switches_) {
    all.insert(known.uplinks.begin(), known.uplinks.end());
  }
  return all;
}

bool DevicesAtBridges::is_new(std::string const &name, NetworkDevices const &devices) const {
  auto const device = devices.find(name);
  return device && std::ranges::any_of(switches_, [&](auto const &known) {
           auto const before = known.second.indexes.find(name);
           return before != known.second.indexes.end() && before->second != device->index;
         });
}

std::optional<Wanted> DevicesAtBridges::without_new(Wanted const &wanted,
                                                    NetworkDevices const &devices) const {
  auto const is_it = [&](auto const &device) { return is_new(device.first, devices); };
  if (std::ranges::none_of(wanted.bridges, [&](WantedBridge const &bridge) {
        return std::ranges::any_of(bridge.row.devices, is_it);
      })) {
    return std::nullopt;
  }
  auto others = wanted;
  for (auto &bridge : others.bridges) {
    std::erase_if(bridge.row.devices, is_it);
  }
  return others;
}

}  // namespace simhost::daemon
