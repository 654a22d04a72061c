// Nothing that carries tunnels is made to carry more: what is beyond the device, nobody knows here.
#include "daemon/underlay/tunnel_sizes.h"

#include <fmt/format.h>

#include <algorithm>

#include "base/ip_text.h"
#include "daemon/underlay/network_routes.h"
#include "daemon/underlay/underlay.h"
#include "model/properties/properties.h"
#include "model/switches/properties.h"

namespace simhost::daemon {
namespace {

bool was_so(storage::Transaction &before, TunnelSize const &wanted) {
  auto const underlay = storage::underlay_of(before);
  if ((underlay ? underlay->device : "") != wanted.device) {
    return false;
  }
  return std::ranges::any_of(storage::all_switches(before), [&](auto const &known) {
    auto const fabric = storage::fabric_of(before, known.key);
    return fabric &&
           std::ranges::find(fabric->tunnels, wanted.peer, &storage::Tunnel::peer) !=
               fabric->tunnels.end() &&
           effective(before, switches::mtu, storage::PropertyOwner::global(known.key)) >=
               wanted.size;
  });
}

// Of packets on the way; 0 if nobody knows.
std::uint32_t way_mtu(TunnelSize const &wanted, NetworkDevices const &devices) {
  if (auto const underlay = devices.find(wanted.device)) {
    return underlay->mtu;
  }
  auto const route = find_route(wanted.peer);
  return route ? mtu_of(*route, devices) : 0;
}

}  // namespace

std::optional<std::string> why_too_large(storage::Transaction &before, TunnelSize const &wanted,
                                         NetworkDevices const &devices) {
  auto const way = way_mtu(wanted, devices);
  auto const most = mtu_within(way, wanted.peer.size());
  if (way == 0 || wanted.size <= most || was_so(before, wanted)) {
    return std::nullopt;
  }
  return fmt::format("the way to the peer {} bears an MTU of {}, and the switch would have {}",
                     ip_text(wanted.peer), most, wanted.size);
}

}  // namespace simhost::daemon
