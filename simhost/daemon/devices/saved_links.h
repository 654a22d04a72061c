// Puts the links that devices have into the state, as soon as nobody else writes to it: who does
// may wait for a reply of this process.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "daemon/devices/links.h"
#include "daemon/devices/network_devices.h"
#include "events/loop.h"
#include "storage/store.h"

namespace simhost::daemon {

class SavedLinks {
 public:
  /// `saved` is told when those that could not be put at once are there, or are worth another look.
  SavedLinks(events::Loop &loop, storage::Store &store, NetworkDevices const &devices,
             HeardAt heard_at, std::function<void()> saved);

  /// Looks whether the state is as the devices are, and puts it right if it is not: later, if the
  /// state takes nothing now, as on a full disk; why that is so is returned.
  std::optional<std::string> follow();

 private:
  [[nodiscard]] bool save();
  void save_later(events::Clock::duration wait);

  events::Loop &loop_;
  storage::Store &store_;
  NetworkDevices const &devices_;
  HeardAt heard_at_;
  std::function<void()> saved_;
  events::Loop::Timer next_;
};

}  // namespace simhost::daemon
