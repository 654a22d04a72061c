// The wires of uplinks, of whose devices it is asked from time to time what came in damaged.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>

#include "daemon/devices/damaged_frames.h"
#include "daemon/devices/network_devices.h"

namespace simhost::daemon {

/// Nothing of a device that is gone. Throws std::system_error.
std::optional<Arrived> arrived_at(unsigned device);

class UplinkWires {
 public:
  /// What came in at a device, by its index, as arrived_at().
  using Ask = std::function<std::optional<Arrived>(unsigned device)>;

  explicit UplinkWires(Ask ask = arrived_at) : ask_(std::move(ask)) {}

  /// These are the devices from now on.
  void follow(std::set<std::string> const &devices);
  /// What was plugged in anew, or is another device by its name, is another wire: nothing is known
  /// of it.
  void leave_lost(NetworkDevices const &devices);
  /// Asks what came in, and tells of each that does not say it. Returns whether a percentage is
  /// another one.
  bool look(NetworkDevices const &devices, std::function<void(std::string const &)> const &say);
  /// See DamagedFrames; nothing of what is no such device.
  [[nodiscard]] std::optional<std::uint32_t> damaged_percent(std::string_view device) const;

 private:
  struct Wire {
    unsigned index = 0;  // of the device; 0 while it has no link
    DamagedFrames frames = {};
  };

  static bool look_at(Wire &wire, Ask const &ask);

  Ask ask_;
  std::map<std::string, Wire, std::less<>> wires_;
};

}  // namespace simhost::daemon
