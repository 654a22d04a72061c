// The collectors of mirror sessions: which of them can be reached over the underlay.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "daemon/devices/network_devices.h"
#include "daemon/wanted.h"
#include "events/loop.h"
#include "planes/openvswitch/compile/network.h"

namespace simhost::daemon {

class Collectors {
 public:
  /// `changed` is told when one is reached that was not, or no longer.
  Collectors(events::Loop &loop, NetworkDevices const &devices, std::function<void()> changed);

  /// Those of the networks that follow are there, and no others.
  void begin();
  /// Puts into a network which of its collectors are reached. Nobody has looked for a new one yet.
  void follow(openvswitch::Network &network);
  /// Looks for all of them over the underlay, now and again. Returns what keeps copies from them,
  /// in words.
  std::vector<std::string> look(std::optional<WantedUnderlay> const &underlay);

 private:
  struct Collector {
    bool is_wanted = true;
    bool is_reached = false;
    std::uint32_t largest = 0;  // packet that is sent to it
  };

  void look_again();
  [[nodiscard]] std::string obstacle(storage::AddressBytes const &address) const;

  events::Loop &loop_;
  NetworkDevices const &devices_;
  std::function<void()> changed_;
  std::map<storage::AddressBytes, Collector> collectors_;
  std::optional<WantedUnderlay> underlay_;
  events::Clock::duration pause_{};
  events::Loop::Timer next_look_;
};

}  // namespace simhost::daemon
