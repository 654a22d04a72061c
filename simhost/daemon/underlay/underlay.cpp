// The kernel knows the routes, and Open vSwitch reads them there.
#include "daemon/underlay/underlay.h"

#include <fmt/format.h>

#include <optional>
#include <stdexcept>
#include <system_error>
#include <utility>

#include "base/ip_text.h"
#include "daemon/underlay/network_routes.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

// In front of a packet within a tunnel: the headers of Ethernet with two tags, of VXLAN or of
// Geneve without options, and of UDP.
constexpr std::uint32_t kWrapping = 14 + 4 + 4 + 8 + 8;

// Until Open vSwitch has heard of an address.
constexpr events::Clock::duration kUntilKnown = 500ms;

std::optional<std::string> obstacle(WantedBridge const &bridge, storage::AddressBytes const &peer,
                                    NetworkDevices const &devices,
                                    std::function<bool(std::string const &)> const &is_at_bridge) {
  auto const route = find_route(peer);
  auto const whose = fmt::format("the peer {} of the switch '{}'", ip_text(peer), bridge.alias);
  if (!route) {
    return fmt::format("there is no route to {}", whose);
  }
  if (route->is_local) {
    return fmt::format("{} is this host", whose);
  }
  if (!is_at_bridge(route->device)) {
    return fmt::format(
        "{} is beyond the device {}, which is at no bridge of Open vSwitch: the host has no "
        "underlay",
        whose, route->device);
  }
  auto const most = mtu_within(mtu_of(*route, devices), peer.size());
  if (bridge.mtu > most) {
    return fmt::format("the way to {} bears an MTU of {}, and the switch has {}", whose, most,
                       bridge.mtu);
  }
  return std::nullopt;
}

}  // namespace

Underlay::Underlay(events::Loop &loop, int file, std::function<void()> forget, Say say)
    : loop_(loop), forget_(std::move(forget)), say_(std::move(say)), silent_(file) {}

// Returns whether it was not so before. Throws std::system_error.
bool Underlay::put(WantedUnderlay const &wanted, NetworkDevices const &devices) {
  for (auto const &[name, number] : wanted.row.devices) {
    switch_network_device(name, true);
    // Or whoever asks for the address of the bridge may be told that of the device, past which
    // tunnels would not be seen.
    if (resolves(name)) {
      silent_.add(name);
      let_resolve(name, false);
    }
  }
  auto const bridge = devices.find(wanted.row.name);
  if (!bridge) {
    return false;  // which is told when it comes
  }
  switch_network_device(wanted.row.name, true);
  bool is_new = put_address(bridge->index, wanted.address.address, wanted.address.prefix);
  if (!wanted.address.gateway.empty()) {
    is_new |= put_default_route(bridge->index, wanted.address.gateway);
  }
  return is_new;
}

// At devices that carry no tunnels any more.
void Underlay::let_others_resolve(WantedUnderlay const *wanted, NetworkDevices const &devices) {
  auto const names = silent_.all();
  std::optional<std::system_error> first;
  for (auto const &name : names) {
    if (wanted != nullptr && wanted->row.devices.contains(name)) {
      continue;
    }
    try {
      if (devices.find(name)) {
        let_resolve(name, true);
      }
      silent_.remove(name);
    } catch (std::system_error const &error) {
      first = first.value_or(error);
    }
  }
  if (first) {
    throw std::system_error(*first);
  }
}

std::vector<std::string> Underlay::follow(
    Wanted const &wanted, NetworkDevices const &devices,
    std::function<bool(std::string const &)> const &is_at_bridge) {
  std::vector<std::string> obstacles;
  try {
    if (wanted.underlay && put(*wanted.underlay, devices)) {
      forget_ways_soon();
    }
    let_others_resolve(wanted.underlay ? &*wanted.underlay : nullptr, devices);
  } catch (std::runtime_error const &error) {
    obstacles.emplace_back(error.what());
  }
  auto const is_seen = [&](std::string const &device) {
    return is_at_bridge(device) || (wanted.underlay && wanted.underlay->row.name == device);
  };
  for (auto const &bridge : wanted.bridges) {
    if (bridge.fabric) {
      for (auto const &tunnel : bridge.fabric->tunnels) {
        if (auto one = obstacle(bridge, tunnel.peer, devices, is_seen)) {
          obstacles.push_back(*std::move(one));
        }
      }
    }
  }
  return obstacles;
}

// Open vSwitch goes on handing frames of tunnels to the machine if they came before it knew the
// address: that it knows it makes it look at nothing again.
void Underlay::forget_ways_soon() {
  next_forgetting_ = loop_.after(kUntilKnown, [this] {
    try {
      forget_();
    } catch (std::runtime_error const &error) {
      say_(error.what());
    }
  });
}

std::uint32_t mtu_of(Route const &route, NetworkDevices const &devices) {
  auto const device = devices.find(route.device);
  return route.mtu.value_or(device ? device->mtu : 0);
}

std::uint32_t mtu_within(std::uint32_t route_mtu, std::size_t address_bytes) {
  auto const taken = kWrapping + (address_bytes == 4 ? 20U : 40U);
  return route_mtu > taken ? route_mtu - taken : 0;
}

}  // namespace simhost::daemon
