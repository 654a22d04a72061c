// Switches over the store: bounds, defaults, and what the host chooses by itself.
#include "model/switches/switches.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <random>
#include <string>

#include "base/outcomes.h"
#include "base/utf8.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/switches/properties.h"
#include "model/vlans/properties.h"
#include "storage/properties.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost {
namespace {

using storage::PropertyOwner;
using storage::SwitchName;

void check_name(std::string_view name, std::size_t longest) {
  if (name.size() > longest) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
  require_utf8(name);
}

void check_alias(std::string_view alias) {
  check_name(alias, kLongestAlias);
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

std::string fresh_portset(storage::Transaction &transaction) {
  for (unsigned number = 0;; ++number) {
    auto name = "portset-" + std::to_string(number);
    if (!storage::find_switch(transaction, SwitchName::portset, name)) {
      return name;
    }
  }
}

storage::Switch row_of(storage::Transaction &transaction, SwitchSpec const &spec) {
  check_alias(spec.alias);
  check_name(spec.identifier, kLongestSwitchIdentifier);
  check_name(spec.portset, kLongestPortset);
  auto const max_ports = or_default(spec.max_ports, kDefaultMaxPorts);
  if (max_ports > storage::kGreatestMaxPorts) {
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

void attach_free_uplinks(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                         std::uint32_t count) {
  auto const free = storage::free_uplinks(transaction);
  if (count > free.size()) {
    throw Refused(QEX_NO_RESOURCES);
  }
  for (std::uint32_t at = 0; at < count; ++at) {
    add_uplink_port(transaction, key, free[at]);
  }
}

storage::Switch get_row(storage::Transaction &transaction, storage::SwitchKey key) {
  return storage::get_switch_row(transaction, key).row;
}

}  // namespace

storage::SwitchKey create_switch(storage::ChangingTransaction &transaction,
                                 SwitchSpec const &spec) {
  auto const key = storage::add_switch(transaction, row_of(transaction, spec));
  if (!key) {
    throw Refused(QEX_EXISTS);
  }
  set(transaction, switches::mtu, PropertyOwner::global(*key),
      or_default(spec.mtu, switches::mtu.unset));
  attach_free_uplinks(transaction, *key, spec.uplink_count);
  return *key;
}

void destroy_switch(storage::ChangingTransaction &transaction, std::string_view alias) {
  destroy_switch(transaction, get_switch(transaction, alias).key);
}

void destroy_switch(storage::ChangingTransaction &transaction, storage::SwitchKey key) {
  storage::remove_switch(transaction, key);
}

void change_running(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                    bool running) {
  storage::set_associated(transaction, key, running);
}

void change_version(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                    std::uint32_t version) {
  if (version == 0) {
    throw Refused(QEX_BAD_PARAM);
  }
  storage::set_version(transaction, key, version);
}

void change_max_ports(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                      std::uint32_t max_ports) {
  if (max_ports == 0 || max_ports > storage::kGreatestMaxPorts) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const count = storage::count_ports(transaction, key, storage::PortKind::client);
  if (max_ports < count) {
    throw Refused(
        QEX_LIMIT_EXCEEDED,
        fmt::format("max_ports: {} is below the {} ports that there are", max_ports, count));
  }
  storage::set_max_ports(transaction, key, max_ports);
}

VSInfo switch_info(storage::Transaction &transaction, std::string_view alias) {
  auto const [key, row] = get_running_switch(transaction, alias);
  VSInfo info{};
  info.mtu = effective(transaction, switches::mtu, PropertyOwner::global(key));
  info.minValidVlan = vlans::kLeast;
  info.maxValidVlan = vlans::kGreatest;
  info.activePorts = storage::count_ports(transaction, key, storage::PortKind::client);
  info.maxPorts = row.max_ports;
  put_text(info.dvsName, row.alias);
  put_text(info.nebID, row.identifier);
  return info;
}

std::string identifier_of(storage::Transaction &transaction, std::string_view alias) {
  return get_switch(transaction, alias).row.identifier;
}

std::string portset_of(storage::Transaction &transaction, std::string_view alias) {
  return get_switch(transaction, alias).row.portset;
}

std::string alias_of_portset(storage::Transaction &transaction, std::string_view portset) {
  return get_switch(transaction, portset, SwitchName::portset).row.alias;
}

std::vector<storage::AttachedUplink> uplinks_of(storage::Transaction &transaction,
                                                std::string_view alias) {
  return storage::uplinks_of(transaction, get_running_switch(transaction, alias).key);
}

Bytes read_alias(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return bytes_of_text(get_row(transaction, owner.switch_key).alias);
}

Bytes read_version(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const version = get_row(transaction, owner.switch_key).version;
  return copied(bytes_of(version));
}

Bytes read_portset(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  return bytes_of_text(get_row(transaction, owner.switch_key).portset);
}

void write_alias(Setting const &setting) {
  auto const alias = text_of(setting.value);
  check_alias(alias);
  if (!storage::rename_switch(setting.transaction, setting.owner.switch_key, alias)) {
    throw Refused(QEX_EXISTS);
  }
}

void write_version(Setting const &setting) {
  change_version(setting.transaction, setting.owner.switch_key,
                 record_of<std::uint32_t>(setting.value));
}

}  // namespace simhost
