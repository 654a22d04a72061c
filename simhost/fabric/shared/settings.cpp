// Everything here is told by the descriptors and by the members of documents.
#include "fabric/shared/settings.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <limits>
#include <utility>
#include <vector>

#include "base/outcomes.h"
#include "model/fabric/fabric.h"
#include "model/plane.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/properties/registry.h"
#include "model/switches/switches.h"
#include "scenario/fabric_members.h"
#include "scenario/forms.h"
#include "scenario/keys.h"
#include "scenario/members.h"
#include "scenario/reading.h"
#include "scenario/scenario_fabric.h"
#include "scenario/settings.h"
#include "scenario/texts.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using scenario::Json;
using scenario::Node;
using scenario::SettingOwner;
using storage::PropertyOwner;
using storage::PropertyType;
using storage::Transaction;

// Members beside those of settings.
constexpr auto *kMaxPorts = "max_ports";
constexpr auto *kVersion = "version";
constexpr auto *kExternal = "external_id";
constexpr std::array kAddressNames{"mac", "vlan", "vni", "type"};

bool lasts(storage::NamedProperty const &named) {
  return named.property.type == PropertyType::config || named.property.type == PropertyType::policy;
}

SettingOwner kind_of(PropertyOwner const &owner) {
  return owner.scope == storage::PropertyScope::port ? SettingOwner::of_port
                                                     : SettingOwner::of_switch;
}

// The member that says what is under a key; empty if none does.
std::string name_of(std::string_view key, PropertyOwner const &owner) {
  auto const *const descriptor = find_descriptor(key);
  bool const is_its = descriptor != nullptr && descriptor->scope == owner.scope;
  return is_its ? std::string(descriptor->name) : std::string();
}

Json properties_to_json(Transaction &transaction, PropertyOwner const &owner) {
  auto said = Json::object();
  scenario::describe_named(said, transaction, owner, kind_of(owner));
  scenario::describe_raw(said, transaction, owner, kind_of(owner));
  for (auto const &stored : list_stored(transaction, owner)) {
    if (!lasts(stored)) {
      said[scenario::keys::properties].erase(stored.name);
      said.erase(name_of(stored.name, owner));
    }
  }
  return said;
}

using Addresses = std::vector<storage::Address>;

// Of a port, or of the team.
Addresses fixed_at(Transaction &transaction, PropertyOwner const &owner) {
  Place const place{.switch_key = owner.switch_key, .port = owner.port_number};
  constexpr auto kAtAnyTime = ClockTime::min();
  auto all = storage::addresses_at(transaction, place, VS_MAC_ADDR_TYPE_STATIC, kAtAnyTime);
  auto const users = storage::addresses_at(transaction, place, VS_MAC_ADDR_TYPE_USER, kAtAnyTime);
  all.insert(all.end(), users.begin(), users.end());
  return all;
}

VSMACEntry entry_of(storage::Address const &address) {
  VSMACEntry entry{};
  std::memcpy(entry.macAddress, address.name.mac.data(), address.name.mac.size());
  entry.vid = address.name.vid;
  entry.vni = address.name.vni;
  entry.macAddrType = address.type;
  return entry;
}

// How long ago a fixed address was seen is nobody else's matter.
Json address_to_json(storage::Address const &address) {
  auto const entry = entry_of(address);
  auto said = Json::object();
  scenario::add_members(said, scenario::kAddressMembers, &entry);
  for (auto member = said.begin(); member != said.end();) {
    bool const stays = std::ranges::find(kAddressNames, member.key()) != kAddressNames.end();
    member = stays ? std::next(member) : said.erase(member);
  }
  return said;
}

void describe_addresses(Json &said, Transaction &transaction, PropertyOwner const &owner) {
  auto list = Json::array();
  for (auto const &address : fixed_at(transaction, owner)) {
    list.push_back(address_to_json(address));
  }
  if (!list.empty()) {
    said[scenario::keys::addresses] = std::move(list);
  }
}

// By what its uplink is called each host knows it for itself.
Json fabric_to_json(Transaction &transaction, storage::SwitchKey key) {
  auto const fabric = storage::fabric_of(transaction, key);
  auto said = fabric ? scenario::to_json(*fabric) : Json::object();
  said.erase(std::string(scenario::kUplink));
  return said;
}

Settings texts_of(Json const &said) {
  Settings settings;
  for (auto const &[name, value] : said.items()) {
    if (name != scenario::keys::properties || !value.empty()) {
      settings[name] = value.dump(-1, ' ', false, Json::error_handler_t::replace);
    }
  }
  return settings;
}

Json json_of(Settings const &settings) {
  auto said = Json::object();
  for (auto const &[name, text] : settings) {
    try {
      said[name] = scenario::parsed(text);
    } catch (scenario::DocumentError const &error) {
      throw scenario::DocumentError(name + ": " + error.what());
    }
  }
  return said;
}

// Not by the order of members.
bool are_equal(Json const &one, Json const &other) {
  return nlohmann::json(one) == nlohmann::json(other);
}

void require_known(Json const &wanted, PropertyOwner const &owner,
                   std::initializer_list<std::string_view> more) {
  auto names = scenario::setting_names(kind_of(owner));
  names.insert(names.end(), more);
  names.insert(names.end(), {scenario::keys::properties, scenario::keys::addresses});
  Node(wanted).only(names);
}

std::uint32_t number_in(Json const &wanted, char const *name, std::uint32_t otherwise) {
  return Node(wanted).get(name, otherwise, [](Node const &node) {
    return node.integer(0, std::numeric_limits<std::uint32_t>::max());
  });
}

void clear_setting(storage::ChangingTransaction &transaction, PropertyOwner const &owner,
                   Descriptor const &descriptor) {
  clear(transaction, descriptor, owner);
  if (descriptor.companion.property != nullptr) {
    clear(transaction, *descriptor.companion.property, owner);
  }
}

// Clears what is not wanted, and returns what is other than it is wanted.
Json clear_and_differ(storage::ChangingTransaction &transaction, PropertyOwner const &owner,
                      Json const &wanted) {
  auto const now = properties_to_json(transaction, owner);
  auto differing = Json::object();
  for (auto const *const descriptor : descriptors()) {
    auto const name = std::string(descriptor->name);
    if (descriptor->scope != owner.scope || name.empty()) {
      continue;
    }
    if (!wanted.contains(name) && now.contains(name)) {
      clear_setting(transaction, owner, *descriptor);
    } else if (wanted.contains(name) &&
               (!now.contains(name) || !are_equal(now[name], wanted[name]))) {
      differing[name] = wanted[name];
    }
  }
  auto const &bytes_now = now.at(scenario::keys::properties);
  auto const bytes = wanted.value(scenario::keys::properties, Json::object());
  auto other_bytes = Json::object();
  for (auto const &[key, value] : bytes.items()) {
    if (!bytes_now.contains(key) || !are_equal(bytes_now[key], value)) {
      other_bytes[key] = value;
    }
  }
  for (auto const &[key, value] : bytes_now.items()) {
    if (bytes.contains(key)) {
      continue;
    }
    reset_property(transaction, owner, key);
    if (auto const name = name_of(key, owner); !name.empty() && wanted.contains(name)) {
      differing[name] = wanted[name];
    }
  }
  differing[scenario::keys::properties] = std::move(other_bytes);
  return differing;
}

void apply_addresses(storage::ChangingTransaction &transaction, PropertyOwner const &owner,
                     Json const &wanted) {
  Place const place{.switch_key = owner.switch_key, .port = owner.port_number};
  auto left = wanted.value(scenario::keys::addresses, Json::array());
  for (auto const &address : fixed_at(transaction, owner)) {
    auto const said = address_to_json(address);
    auto const found =
        std::ranges::find_if(left, [&](Json const &one) { return are_equal(one, said); });
    if (found != left.end()) {
      left.erase(found);
    } else {
      running_plane().remove_address(transaction, place, entry_of(address));
    }
  }
  for (auto const &item : left) {
    running_plane().put_address(
        transaction, place,
        scenario::read_object(scenario::kAddressMembers, Node(item, scenario::keys::addresses),
                              scenario::new_address()));
  }
}

void apply_members(storage::ChangingTransaction &transaction, PropertyOwner const &owner,
                   Json const &wanted) {
  auto const differing = clear_and_differ(transaction, owner, wanted);
  scenario::apply_settings(transaction, owner, kind_of(owner), Node(differing));
  apply_addresses(transaction, owner, wanted);
}

void apply_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                  Json const &wanted) {
  auto const now = fabric_to_json(transaction, key);
  auto const fabric = wanted.value(scenario::keys::fabric, Json::object());
  if (are_equal(now, fabric)) {
    return;
  }
  Node const node(fabric, scenario::keys::fabric);
  if (auto const uplink = node.find(scenario::kUplink)) {
    uplink->fail("each host has its own");
  }
  scenario::do_at(node, [&] {
    scenario::apply_fabric(transaction, key, node);
    if (now.empty()) {
      attach_fabric(transaction, key);
    }
  });
}

}  // namespace

Settings settings_of(Transaction &transaction, storage::FoundSwitch const &found) {
  auto const owner = PropertyOwner::global(found.key);
  auto said = properties_to_json(transaction, owner);
  describe_addresses(said, transaction, owner);
  if (auto fabric = fabric_to_json(transaction, found.key); !fabric.empty()) {
    said[scenario::keys::fabric] = std::move(fabric);
  }
  said[kMaxPorts] = found.row.max_ports;
  said[kVersion] = found.row.version;
  return texts_of(said);
}

Settings settings_of(Transaction &transaction, storage::Port const &port) {
  auto const owner = PropertyOwner::port(port.switch_key, port.number);
  auto said = properties_to_json(transaction, owner);
  describe_addresses(said, transaction, owner);
  if (auto const external = storage::external_id_of(transaction, port.number); !external.empty()) {
    said[kExternal] = external;
  }
  return texts_of(said);
}

void apply_settings(storage::ChangingTransaction &transaction, storage::FoundSwitch const &found,
                    Settings const &settings) {
  auto const owner = PropertyOwner::global(found.key);
  auto const wanted = json_of(settings);
  require_known(wanted, owner, {kMaxPorts, kVersion, scenario::keys::fabric});
  auto const max_ports = number_in(wanted, kMaxPorts, kDefaultMaxPorts);
  if (max_ports != found.row.max_ports) {
    change_max_ports(transaction, found.key, max_ports);
  }
  auto const version = number_in(wanted, kVersion, kDefaultVersion);
  if (version != found.row.version) {
    change_version(transaction, found.key, version);
  }
  apply_members(transaction, owner, wanted);
  apply_fabric(transaction, found.key, wanted);
}

void apply_settings(storage::ChangingTransaction &transaction, storage::Port const &port,
                    Settings const &settings) {
  auto const owner = PropertyOwner::port(port.switch_key, port.number);
  auto const wanted = json_of(settings);
  require_known(wanted, owner, {kExternal});
  auto const external = wanted.value(kExternal, std::string());
  if (external != storage::external_id_of(transaction, port.number)) {
    set_external_id(transaction, port, external);
  }
  apply_members(transaction, owner, wanted);
}

}  // namespace simhost::fabric
