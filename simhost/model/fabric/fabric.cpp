// A key is one switch's, and a peer is a host.
#include "model/fabric/fabric.h"

#include <fmt/format.h>

#include <algorithm>
#include <set>

#include "base/ip_text.h"
#include "base/outcomes.h"
#include "clock/clock.h"
#include "model/devices/devices.h"
#include "model/ports/ports.h"
#include "qexapi/names.h"
#include "storage/switches.h"

namespace simhost {
namespace {

using storage::AddressBytes;

// Neither of a group nor of the own host, whatever its number, nor nobody's.
bool is_of_a_host(AddressBytes const &address) {
  auto const first = std::to_integer<unsigned>(address.front());
  if (address.size() == 4) {
    return first != 0 && first != 127 && first < 224;
  }
  auto const is_zero = [](std::byte byte) { return byte == std::byte{}; };
  return first != 0xFF && !std::all_of(address.begin(), address.end() - 1, is_zero);
}

void require_host(AddressBytes const &address) {
  if (!is_of_a_host(address)) {
    throw Refused(QEX_INVALID_ADDRESS,
                  fmt::format("{} is the address of no host", ip_text(address)));
  }
}

void check_peers(std::vector<AddressBytes> const &peers) {
  if (peers.size() > storage::kMostTunnels) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  std::set<AddressBytes> seen;
  for (auto const &peer : peers) {
    require_host(peer);
    if (!seen.insert(peer).second) {
      throw Refused(QEX_EXISTS, fmt::format("the peer {} is there twice", ip_text(peer)));
    }
  }
}

void check_key(storage::Transaction &transaction, storage::SwitchKey key, FabricSpec const &spec) {
  auto const other = storage::find_fabric(transaction, spec.encapsulation, spec.key);
  if (other && *other != key) {
    auto const alias = storage::get_switch_row(transaction, *other).row.alias;
    throw Refused(QEX_EXISTS, fmt::format("the switch '{}' has the key {}", alias, spec.key));
  }
}

// "fabric0", "fabric1", ...: the first that no uplink of the host is called.
std::string fresh_name(storage::Transaction &transaction) {
  for (unsigned number = 0;; ++number) {
    auto name = fmt::format("fabric{}", number);
    if (!storage::find_uplink(transaction, name)) {
      return name;
    }
  }
}

// The uplink of the fabric that is there, or a new one.
std::string uplink_for(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                       std::string const &wanted) {
  auto const present = storage::fabric_of(transaction, key);
  if (present && (wanted.empty() || wanted == present->uplink)) {
    return present->uplink;
  }
  if (present) {
    storage::remove_fabric(transaction, key);
  }
  auto name = wanted.empty() ? fresh_name(transaction) : wanted;
  if (name.size() >= QEX_MISC_NAME_MAX) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  if (storage::find_uplink(transaction, name)) {
    throw Refused(QEX_EXISTS, fmt::format("the uplink '{}' is another one of this host", name));
  }
  storage::add_uplink(transaction, name);
  return name;
}

}  // namespace

void set_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                FabricSpec const &spec) {
  require_real_time(transaction);
  check_key(transaction, key, spec);
  check_peers(spec.peers);
  auto const uplink = uplink_for(transaction, key, spec.uplink);
  storage::put_fabric(transaction, key, uplink, spec.encapsulation, spec.key, spec.peers);
}

void attach_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key) {
  auto const fabric = storage::fabric_of(transaction, key);
  if (fabric && !storage::find_uplink(transaction, fabric->uplink)->port) {
    add_uplink_port(transaction, key, fabric->uplink);
  }
}

void set_underlay(storage::ChangingTransaction &transaction, storage::Underlay const &underlay) {
  check_underlay_device(transaction, underlay.device);
  require_host(underlay.address);
  if (!underlay.gateway.empty()) {
    require_host(underlay.gateway);
    if (underlay.gateway.size() != underlay.address.size()) {
      throw Refused(QEX_INVALID_ADDRESS, "the gateway has an address of the other kind");
    }
  }
  storage::put_underlay(transaction, underlay);
}

}  // namespace simhost
