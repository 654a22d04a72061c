// Switches over the store: bounds, defaults, and what the host chooses by itself.
#include "core/switches.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <random>
#include <string>

#include "core/giving_up.h"
#include "core/known.h"
#include "core/ports.h"
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

void check_length(std::string_view name, std::size_t longest) {
  if (name.size() > longest) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
}

void check_alias(std::string_view alias) {
  check_length(alias, kLongestAlias);
  if (alias.empty()) {
    throw Refused(QEX_BAD_PARAM);
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
  check_alias(spec.alias);
  check_length(spec.identifier, kLongestIdentifier);
  check_length(spec.portset, kLongestPortset);
  auto const max_ports = or_default(spec.max_ports, kDefaultMaxPorts);
  if (max_ports > kGreatestMaxPorts) {
    throw Refused(QEX_BAD_PARAM);
  }
  return {.alias = std::string(spec.alias),
          .identifier = spec.identifier.empty() ? fresh_identifier() : std::string(spec.identifier),
          .portset = spec.portset.empty() ? fresh_portset(transaction) : std::string(spec.portset),
          .max_ports = max_ports,
          .version = or_default(spec.version, kDefaultVersion),
          .persistent = spec.persistent,
          .associated = spec.associated};
}

constexpr RecordProperty<std::uint32_t> kMtu{.key = VSPROP_MTU, .unset = kDefaultMtu};

void attach_free_uplinks(store::Transaction &transaction, store::SwitchKey key,
                         std::uint32_t count) {
  auto const free = store::free_uplinks(transaction);
  if (count > free.size()) {
    throw Refused(QEX_NO_RESOURCES);
  }
  for (std::uint32_t at = 0; at < count; ++at) {
    add_uplink_port(transaction, key, free[at]);
  }
}

store::Switch row_behind(store::Transaction &transaction, store::SwitchKey key) {
  return store::find_switch(transaction, key).value().row;
}

}  // namespace

store::SwitchKey create_switch(store::Transaction &transaction, SwitchSpec const &spec) {
  auto const key = store::add_switch(transaction, row_of(transaction, spec));
  if (!key) {
    throw Refused(QEX_EXISTS);
  }
  write(transaction, PropertyOwner::global(*key), kMtu, or_default(spec.mtu, kDefaultMtu));
  attach_free_uplinks(transaction, *key, spec.uplink_count);
  return *key;
}

void destroy_switch(store::Transaction &transaction, std::string_view alias) {
  destroy_switch(transaction, known_switch(transaction, alias).key);
}

void destroy_switch(store::Transaction &transaction, store::SwitchKey key) {
  store::remove_switch(transaction, key);
}

void change_running(store::Transaction &transaction, store::SwitchKey key, bool running) {
  store::set_associated(transaction, key, running);
}

void change_version(store::Transaction &transaction, store::SwitchKey key, std::uint32_t version) {
  if (version == 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  store::set_version(transaction, key, version);
}

void change_max_ports(store::Transaction &transaction, store::SwitchKey key,
                      std::uint32_t max_ports) {
  if (max_ports == 0 || max_ports > kGreatestMaxPorts) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (max_ports < store::count_ports(transaction, key, store::PortKind::client)) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
  store::set_max_ports(transaction, key, max_ports);
}

void set_mtu(store::Transaction &transaction, std::string_view alias, std::uint32_t mtu) {
  auto const owner = PropertyOwner::global(known_switch(transaction, alias).key);
  write(transaction, owner, kMtu, mtu);
}

std::uint32_t mtu_of(store::Transaction &transaction, std::string_view alias) {
  return read(transaction, PropertyOwner::global(known_switch(transaction, alias).key), kMtu);
}

VSInfo switch_info(store::Transaction &transaction, std::string_view alias) {
  auto const [key, row] = running_switch(transaction, alias);
  VSInfo info{};
  info.mtu = read(transaction, PropertyOwner::global(key), kMtu);
  info.minValidVlan = kLeastVlan;
  info.maxValidVlan = kGreatestVlan;
  info.activePorts = store::count_ports(transaction, key, store::PortKind::client);
  info.maxPorts = row.max_ports;
  put_text(info.dvsName, row.alias);
  put_text(info.nebID, row.identifier);
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
  return store::uplinks_of(transaction, running_switch(transaction, alias).key);
}

Bytes read_alias(store::Transaction &transaction, store::PropertyOwner const &owner) {
  return bytes_of_text(row_behind(transaction, owner.switch_key).alias);
}

Bytes read_version(store::Transaction &transaction, store::PropertyOwner const &owner) {
  auto const version = row_behind(transaction, owner.switch_key).version;
  return copied(bytes_of(version));
}

Bytes read_portset(store::Transaction &transaction, store::PropertyOwner const &owner) {
  return bytes_of_text(row_behind(transaction, owner.switch_key).portset);
}

void write_alias(Setting const &setting) {
  auto const alias = text_of(setting.value);
  check_alias(alias);
  if (!store::rename_switch(setting.transaction, setting.owner.switch_key, alias)) {
    throw Refused(QEX_EXISTS);
  }
}

void write_version(Setting const &setting) {
  change_version(setting.transaction, setting.owner.switch_key,
                 record_of<std::uint32_t>(setting.value));
}

}  // namespace simhost
