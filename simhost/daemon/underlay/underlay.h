// What carries the tunnels of this host: the address and the routes of the machine there, and
// whether tunnels can do with them.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "daemon/devices/network_devices.h"
#include "daemon/troubles.h"
#include "daemon/underlay/kept_names.h"
#include "daemon/underlay/network_routes.h"
#include "daemon/wanted.h"
#include "events/loop.h"

namespace simhost::daemon {

class Underlay {
 public:
  /// `forget` is done when what Open vSwitch remembers of flows is to be forgotten; what it throws
  /// is told to `say`. What has to be undone of it is in `file`, see KeptNames.
  Underlay(events::Loop &loop, int file, std::function<void()> forget, Say say);

  /// Makes the bridge of the underlay, if it is there, the way of the machine to its peers. Returns
  /// what keeps frames from going through tunnels, in words. `is_at_bridge` says of another device
  /// whether Open vSwitch sees what leaves over it.
  std::vector<std::string> follow(Wanted const &wanted, NetworkDevices const &devices,
                                  std::function<bool(std::string const &)> const &is_at_bridge);

  /// Nothing carries tunnels any more.
  void end(NetworkDevices const &devices) { let_others_resolve(nullptr, devices); }

 private:
  bool put(WantedUnderlay const &wanted, NetworkDevices const &devices);
  void let_others_resolve(WantedUnderlay const *wanted, NetworkDevices const &devices);
  void forget_ways_soon();

  events::Loop &loop_;
  std::function<void()> forget_;
  Say say_;
  KeptNames silent_;  // devices at which the kernel tells nobody its addresses
  events::Loop::Timer next_forgetting_;
};

/// The largest packet that a route carries; 0 if nobody knows.
std::uint32_t mtu_of(Route const &route, NetworkDevices const &devices);
/// The largest packet of a switch whose frames have two tags, over a route that carries packets of
/// `route_mtu`.
std::uint32_t mtu_within(std::uint32_t route_mtu, std::size_t address_bytes);

}  // namespace simhost::daemon
