// The devices that are at bridges, and which of them were made anew since.
#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>

#include "daemon/devices/network_devices.h"
#include "daemon/wanted.h"

namespace simhost::daemon {

class DevicesAtBridges {
 public:
  /// Everything is as it is wanted now; what could not be made so is as it was.
  void follow(Wanted const &wanted, NetworkDevices const &devices);
  [[nodiscard]] bool contains(std::string const &device) const;
  /// Those of uplinks.
  [[nodiscard]] std::set<std::string> uplinks() const;
  /// What is wanted without those that were made anew under their names: such a one has to be taken
  /// from its bridge before it is put there. Nothing if there are none.
  [[nodiscard]] std::optional<Wanted> without_new(Wanted const &wanted,
                                                  NetworkDevices const &devices) const;

 private:
  struct OfSwitch {
    std::map<std::string, unsigned> indexes = {};
    std::set<std::string> uplinks = {};
  };

  void leave(std::string const &name);
  [[nodiscard]] bool is_new(std::string const &name, NetworkDevices const &devices) const;

  std::map<storage::SwitchKey, OfSwitch> switches_;
};

}  // namespace simhost::daemon
