// Switches over the store: bounds, defaults, and what the host chooses by itself.
#include "core/switches.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <random>
#include <span>
#include <string>

#include "core/giving_up.h"
#include "core/properties.h"
#include "store/properties.h"
#include "store/store.h"
#include "store/switches.h"
#include "vswitch/device.h"
#include "vswitch/mirror.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

using store::PropertyOwner;
using store::SwitchName;

constexpr std::uint32_t kDefaultMaxPorts = 128;
constexpr std::uint32_t kGreatestMaxPorts = 65535;
constexpr std::uint32_t kDefaultMtu = 1500;
constexpr std::uint32_t kDefaultVersion = VS_YKT_NEB_VERSION_20;

// Bytes without the terminating NUL: what the fixed texts of the callers' records have room for.
constexpr std::size_t kLongestAlias = sizeof(VSInfo::dvsName) - 1;
constexpr std::size_t kLongestIdentifier = sizeof(VSInfo::nebID) - 1;
constexpr std::size_t kLongestPortset = VS_PORTSET_NAME_MAX - 1;

// VLAN 0 is "untagged" and 4095 is reserved.
constexpr std::uint16_t kLeastVlan = 1;
constexpr std::uint16_t kGreatestVlan = 4094;

store::FoundSwitch known_switch(store::Transaction &transaction, std::string_view name,
                                SwitchName kind = SwitchName::alias) {
  auto found = store::find_switch(transaction, kind, name);
  if (!found) {
    throw Refused(QEX_NOT_FOUND);
  }
  return *std::move(found);
}

void check_length(std::string_view name, std::size_t longest) {
  if (name.size() > longest) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
}

std::uint32_t or_default(std::uint32_t number, std::uint32_t host_default) {
  return number == 0 ? host_default : number;
}

// A random identifier in the form of a UUID of version 4.
std::string fresh_identifier() {
  std::random_device random;
  std::array<std::uint32_t, 4> words{};
  std::generate(words.begin(), words.end(), std::ref(random));
  words[1] = (words[1] & 0xFFFF0FFFU) | 0x00004000U;
  words[2] = (words[2] & 0x3FFFFFFFU) | 0x80000000U;
  std::array<char, 37> text{};
  std::snprintf(text.data(), text.size(), "%08x-%04x-%04x-%04x-%04x%08x", words[0], words[1] >> 16U,
                words[1] & 0xFFFFU, words[2] >> 16U, words[2] & 0xFFFFU, words[3]);
  return text.data();
}

std::string fresh_portset(store::Transaction &transaction) {
  for (unsigned number = 0;; ++number) {
    auto name = "portset-" + std::to_string(number);
    if (!store::find_switch(transaction, SwitchName::portset, name)) {
      return name;
    }
  }
}

store::Switch row_of(store::Transaction &transaction, SwitchSpec const &spec) {
  check_length(spec.alias, kLongestAlias);
  check_length(spec.identifier, kLongestIdentifier);
  check_length(spec.portset, kLongestPortset);
  auto const max_ports = or_default(spec.max_ports, kDefaultMaxPorts);
  if (spec.alias.empty() || max_ports > kGreatestMaxPorts) {
    throw Refused(QEX_BAD_PARAM);
  }
  return {.alias = std::string(spec.alias),
          .identifier = spec.identifier.empty() ? fresh_identifier() : std::string(spec.identifier),
          .portset = spec.portset.empty() ? fresh_portset(transaction) : std::string(spec.portset),
          .max_ports = max_ports,
          .version = or_default(spec.version, kDefaultVersion),
          .persistent = spec.persistent};
}

void store_mtu(store::Transaction &transaction, store::SwitchKey key, std::uint32_t mtu) {
  set_property(transaction, PropertyOwner::global(key), VSPROP_MTU,
               std::as_bytes(std::span(&mtu, 1)), store::PropertyType::config);
}

std::uint32_t stored_mtu(store::Transaction &transaction, store::SwitchKey key) {
  std::uint32_t mtu = kDefaultMtu;
  if (auto const property =
          store::find_property(transaction, PropertyOwner::global(key), VSPROP_MTU)) {
    std::memcpy(&mtu, property->value.data(), sizeof mtu);
  }
  return mtu;
}

void attach_free_uplinks(store::Transaction &transaction, store::SwitchKey key,
                         std::uint32_t count) {
  auto const free = store::free_uplinks(transaction);
  if (count > free.size()) {
    throw Refused(QEX_NO_RESOURCES);
  }
  for (std::uint32_t at = 0; at < count; ++at) {
    auto const port = store::add_port(transaction, key, "uplink" + std::to_string(at + 1),
                                      store::PortKind::uplink);
    store::attach_uplink(transaction, free[at], port.value());
  }
}

// The caller's field is longer than any name that the host accepts, and zeroed.
void copy_name(std::span<qex_uint8> field, std::string_view name) {
  std::copy(name.begin(), name.end(), field.begin());
}

}  // namespace

void create_switch(store::Transaction &transaction, SwitchSpec const &spec) {
  auto const key = store::add_switch(transaction, row_of(transaction, spec));
  if (!key) {
    throw Refused(QEX_EXISTS);
  }
  store_mtu(transaction, *key, or_default(spec.mtu, kDefaultMtu));
  attach_free_uplinks(transaction, *key, spec.uplink_count);
}

void destroy_switch(store::Transaction &transaction, std::string_view alias) {
  store::remove_switch(transaction, known_switch(transaction, alias).key);
}

void set_mtu(store::Transaction &transaction, std::string_view alias, std::uint32_t mtu) {
  store_mtu(transaction, known_switch(transaction, alias).key, mtu);
}

std::uint32_t mtu_of(store::Transaction &transaction, std::string_view alias) {
  return stored_mtu(transaction, known_switch(transaction, alias).key);
}

VSInfo switch_info(store::Transaction &transaction, std::string_view alias) {
  auto const [key, row] = known_switch(transaction, alias);
  VSInfo info{};
  info.mtu = stored_mtu(transaction, key);
  info.minValidVlan = kLeastVlan;
  info.maxValidVlan = kGreatestVlan;
  info.activePorts = store::count_ports(transaction, key, store::PortKind::client);
  info.maxPorts = row.max_ports;
  copy_name(info.dvsName, row.alias);
  copy_name(info.nebID, row.identifier);
  return info;
}

std::string identifier_of(store::Transaction &transaction, std::string_view alias) {
  return known_switch(transaction, alias).row.identifier;
}

std::string portset_of(store::Transaction &transaction, std::string_view alias) {
  return known_switch(transaction, alias).row.portset;
}

std::string alias_of_portset(store::Transaction &transaction, std::string_view portset) {
  return known_switch(transaction, portset, SwitchName::portset).row.alias;
}

std::vector<store::AttachedUplink> uplinks_of(store::Transaction &transaction,
                                              std::string_view alias) {
  return store::uplinks_of(transaction, known_switch(transaction, alias).key);
}

}  // namespace simhost
