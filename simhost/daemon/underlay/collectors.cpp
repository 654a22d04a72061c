// The kernel knows the way to each, and whether the machine that it begins with replies. What is
// beyond a gateway, nobody knows.
#include "daemon/underlay/collectors.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstddef>
#include <stdexcept>
#include <utility>
#include <variant>

#include "base/ip_text.h"
#include "daemon/underlay/neighbors.h"
#include "daemon/underlay/network_routes.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

// Between two looks: a new collector mostly replies at once.
constexpr events::Clock::duration kFirstWait = 20ms;
constexpr events::Clock::duration kLongestWait = 1s;

constexpr std::uint32_t kEthernet = 14;
constexpr std::uint32_t kTwoTags = 8;

storage::AddressBytes bytes_of(openvswitch::Collector const &collector) {
  return std::visit(
      [](auto const &address) {
        auto const bytes = std::as_bytes(std::span(address));
        return storage::AddressBytes(bytes.begin(), bytes.end());
      },
      collector.address);
}

// In front of a copy: the headers of IP, of GRE with a key or a sequence number, and of ERSPAN.
std::uint32_t header_of(openvswitch::Wrapping wrapping, std::size_t address_bytes) {
  std::uint32_t const ip_and_gre = (address_bytes == 4 ? 20 : 40) + 8;
  switch (wrapping) {
    case openvswitch::Wrapping::erspan2:
      return ip_and_gre + 8;
    case openvswitch::Wrapping::erspan3:
      return ip_and_gre + 12;
    default:
      return ip_and_gre;
  }
}

std::uint32_t largest_packet(openvswitch::Network const &network, openvswitch::Mirror const &mirror,
                             std::size_t address_bytes) {
  std::uint32_t const whole = network.mtu + kEthernet + kTwoTags;
  std::uint32_t const copy =
      mirror.most_bytes == 0 ? whole : std::min<std::uint32_t>(whole, mirror.most_bytes + 4);
  return header_of(mirror.wrapping, address_bytes) + copy;
}

bool is_reached(WantedUnderlay const &underlay, NetworkDevices const &devices,
                storage::AddressBytes const &address) {
  for (auto const &[name, number] : underlay.row.devices) {
    auto const device = devices.find(name);
    if (!device || !device->has_link) {
      return false;
    }
  }
  auto const bridge = devices.find(underlay.row.name);
  auto const route = find_route(address);
  return bridge && route && !route->is_local && route->device == underlay.row.name &&
         replies(bridge->index, route->gateway.empty() ? address : route->gateway);
}

}  // namespace

Collectors::Collectors(events::Loop &loop, NetworkDevices const &devices,
                       std::function<void()> changed)
    : loop_(loop), devices_(devices), changed_(std::move(changed)) {}

void Collectors::begin() {
  for (auto &[address, collector] : collectors_) {
    collector.is_wanted = false;
    collector.largest = 0;
  }
}

void Collectors::follow(openvswitch::Network &network) {
  for (auto &mirror : network.mirrors) {
    for (auto &wanted : mirror.collectors) {
      auto const address = bytes_of(wanted);
      auto const [known, is_new] = collectors_.try_emplace(address);
      auto &collector = known->second;
      collector.is_wanted = true;
      collector.largest =
          std::max(collector.largest, largest_packet(network, mirror, address.size()));
      wanted.is_reached = collector.is_reached;
      if (is_new) {
        pause_ = {};
      }
    }
  }
}

std::vector<std::string> Collectors::look(std::optional<WantedUnderlay> const &underlay) {
  std::erase_if(collectors_, [](auto const &one) { return !one.second.is_wanted; });
  underlay_ = underlay;
  look_again();
  std::vector<std::string> obstacles;
  for (auto const &[address, collector] : collectors_) {
    if (auto why = obstacle(address); !why.empty()) {
      obstacles.push_back(std::move(why));
    }
  }
  return obstacles;
}

// From a timer, too, so that nothing is thrown.
void Collectors::look_again() {
  bool has_changed = false;
  for (auto &[address, collector] : collectors_) {
    bool reached = false;
    try {
      reached = underlay_ && is_reached(*underlay_, devices_, address);
    } catch (std::runtime_error const &) {
      // Its bridge has just gone.
    }
    has_changed |= std::exchange(collector.is_reached, reached) != reached;
  }
  next_look_.end();
  if (!collectors_.empty()) {
    pause_ = std::clamp(2 * pause_, kFirstWait, kLongestWait);
    next_look_ = loop_.after(pause_, [this] { look_again(); });
  }
  if (has_changed) {
    changed_();
  }
}

std::string Collectors::obstacle(storage::AddressBytes const &address) const {
  auto const &collector = collectors_.at(address);
  auto const who = "the collector " + ip_text(address);
  if (!collector.is_reached) {
    return fmt::format("{} of mirror sessions does not reply", who);
  }
  for (auto const &[name, number] : underlay_->row.devices) {
    auto const device = devices_.find(name);
    if (device && device->mtu < collector.largest) {
      return fmt::format("the way to {} bears packets of {} bytes, and its copies may have {}", who,
                         device->mtu, collector.largest);
    }
  }
  return {};
}

}  // namespace simhost::daemon
