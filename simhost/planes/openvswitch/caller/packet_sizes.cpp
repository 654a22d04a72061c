// A switch has many ports, whose devices are named when they come; the daemon knows them from then
// on.
#include "planes/openvswitch/caller/packet_sizes.h"

#include <algorithm>
#include <utility>

#include "model/properties/properties.h"
#include "model/switches/properties.h"
#include "storage/ports.h"
#include "storage/running/devices.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::openvswitch {
namespace {

std::uint32_t size_of(storage::Transaction &transaction, storage::SwitchKey key) {
  return effective(transaction, switches::mtu, storage::PropertyOwner::global(key));
}

std::vector<std::uint8_t> numbers_of(storage::AddressBytes const &address) {
  auto const *const first = reinterpret_cast<std::uint8_t const *>(address.data());
  return {first, first + address.size()};
}

// What is asked of one and not agreed to.
template <typename Sizes>
Json larger_ones(Sizes const &asked, Sizes const &agreed) {
  Json larger = Json::array();
  for (auto const &[whose, size] : asked) {
    auto const known = agreed.find(whose);
    if (known == agreed.end() || known->second < size) {
      larger.push_back({whose, size});
    }
  }
  return larger;
}

}  // namespace

std::optional<Json> PacketSizes::question(storage::Transaction &transaction) {
  asked_ = {};
  auto const underlay = storage::underlay_of(transaction);
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    auto const size = size_of(transaction, key);
    asked_.switches.emplace(static_cast<std::int64_t>(key), size);
    for (auto const &uplink : storage::uplinks_of(transaction, key)) {
      if (auto const device = storage::device_of(transaction, uplink.name)) {
        asked_.devices.emplace(device->name, size);
      }
    }
    if (auto const fabric = storage::fabric_of(transaction, key)) {
      for (auto const &tunnel : fabric->tunnels) {
        auto &largest = asked_.tunnels[{underlay ? underlay->device : "", numbers_of(tunnel.peer)}];
        largest = std::max(largest, size);
      }
    }
  }
  auto switches = larger_ones(asked_.switches, agreed_.switches);
  auto devices = larger_ones(asked_.devices, agreed_.devices);
  auto const tunnels = larger_ones(asked_.tunnels, agreed_.tunnels);
  for (auto const &name : std::exchange(added_, {})) {
    auto const holder = storage::find_device(transaction, name);
    if (holder && holder->port) {
      auto const key = storage::get_port_row(transaction, *holder->port).switch_key;
      devices.push_back({name, size_of(transaction, key)});
    }
  }
  if (switches.empty() && devices.empty() && tunnels.empty()) {
    agreed_ = asked_;
    return std::nullopt;
  }
  return Json{{"ask", "carry"}, {"switches", switches}, {"devices", devices}, {"tunnels", tunnels}};
}

}  // namespace simhost::openvswitch
