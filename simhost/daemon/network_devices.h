// The network devices of the machine, as far as the namespace of this process sees them.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "events/loop.h"

namespace simhost::daemon {

struct NetworkDevice {
  unsigned index;  ///< another one for a device that was made anew under its name
  bool is_up;      ///< switched on
  bool has_link;
  std::uint32_t mtu;
  /// Mbit/s and both directions at once; nothing for a device that has no such thing.
  std::optional<std::uint32_t> speed;
  bool full_duplex;
};

std::optional<NetworkDevice> find_network_device(std::string_view name);
/// Switches it on or off. Throws std::system_error.
void switch_network_device(std::string_view name, bool up);

/// Tells when a device came, went or changed.
class NetworkDeviceWatch {
 public:
  NetworkDeviceWatch(events::Loop &loop, std::function<void()> changed);

 private:
  events::Descriptor socket_;
  std::function<void()> changed_;
  events::Loop::Watch watch_;
};

}  // namespace simhost::daemon
