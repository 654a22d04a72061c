// From a document to the host: switches, their ports, and what is known of them.
#include "scenario/scenario_switches.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstring>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "model/counters/counters.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "model/uplinks/lags.h"
#include "model/vlans/properties.h"
#include "scenario/reading.h"
#include "scenario/settings.h"
#include "storage/store.h"

namespace simhost::scenario {
namespace {

using storage::PropertyOwner;
using storage::Transaction;

// The object must have no other keys than these and those of its settings.
void only(Node const &node, SettingOwner kind, std::span<std::string_view const> keys) {
  auto all = setting_names(kind);
  all.insert(all.end(), keys.begin(), keys.end());
  node.only(all);
}

// What other ports have and an uplink port has not is a mistake of another kind than a typing
// error.
void only_of_uplink_port(Node const &node) {
  auto const has = [](auto const &keys, std::string_view key) {
    return std::find(keys.begin(), keys.end(), key) != keys.end();
  };
  auto const own = setting_names(SettingOwner::of_uplink_port);
  auto const of_others = setting_names(SettingOwner::of_port);
  for (auto const &[key, value] : node.members()) {
    bool const is_others = has(of_others, key) || has(kPortKeys, key);
    if (has(own, key) || has(kUplinkPortKeys, key) || !is_others) {
      continue;
    }
    auto const name = name_at_uplink_port(key);
    value.fail(name.empty() ? "uplink ports have none"
                            : fmt::format("uplink ports call it '{}'", name));
  }
  only(node, SettingOwner::of_uplink_port, kUplinkPortKeys);
}

void set_counters(Transaction &transaction, CounterOwner const &owner, Node const &counters) {
  for_each_member(counters, [&](std::string const &name, Node const &value) {
    set_counter(transaction, owner, name, value.counter());
  });
}

void apply_counters(Transaction &transaction, CounterOwner const &owner, Node const &node) {
  if_there(node, "counters",
           [&](Node const &counters) { set_counters(transaction, owner, counters); });
}

void apply_addresses(Transaction &transaction, Place const &place, Node const &node) {
  for_each_in(node, "addresses", [&](Node const &item) {
    get_wires().describe_address(transaction, place,
                                 read_object(kAddressMembers, item, new_address()));
  });
}

void apply_port(Transaction &transaction, storage::SwitchKey key, Node const &node) {
  only(node, SettingOwner::of_port, kPortKeys);
  auto const identifier = node.at("id").text();
  auto const found = storage::find_port(transaction, key, identifier);
  auto const port = found ? *found : add_client_port(transaction, key, identifier);
  auto const owner = PropertyOwner::port(key, port.number);
  if_there(node, "external_id",
           [&](Node const &external) { set_external_id(transaction, port, external.text()); });
  apply_settings(transaction, owner, SettingOwner::of_port, node);
  apply_addresses(transaction, {.switch_key = key, .port = port.number}, node);
  for_each_in(node, "groups", [&](Node const &item) {
    get_wires().join(transaction, port.number, read_object(kGroupMembers, item, McastGroup()));
  });
  apply_counters(transaction, {.switch_key = key, .port = port.number}, node);
}

// The keys with which a switch is made, and which cannot change later.
storage::SwitchKey made_switch(Transaction &transaction, std::string const &alias,
                               Node const &node) {
  auto const identifier = node.get("id", std::string(), text_of_node);
  auto const portset = node.get("portset", std::string(), text_of_node);
  SwitchSpec const spec{
      .alias = alias,
      .identifier = identifier,
      .portset = portset,
      .max_ports = node.get("max_ports", 0U,
                            [](Node const &given) { return given.integer(1, kGreatestMaxPorts); }),
      .persistent = node.get("persistent", true, &Node::flag_of),
      .version = node.get("version", 0U, number_of_32_bits)};
  create_switch(transaction, spec);
  return get_switch(transaction, alias).key;
}

storage::SwitchKey changed_switch(storage::FoundSwitch const &known, Node const &node) {
  auto const keep = [&](std::string_view key, auto const &value, auto const &read) {
    if (auto const given = node.find(key); given && read(*given) != value) {
      given->fail("cannot change while the switch exists");
    }
  };
  keep("id", known.row.identifier, text_of_node);
  keep("portset", known.row.portset, text_of_node);
  keep("max_ports", known.row.max_ports, number_of_32_bits);
  keep("persistent", known.row.persistent, &Node::flag_of);
  keep("version", known.row.version, number_of_32_bits);
  return known.key;
}

// The port is to have the uplink, and no other one.
void attach_to(Transaction &transaction, storage::Port const &port, std::string const &uplink) {
  auto const known = get_uplink(transaction, uplink);
  auto const present = storage::uplink_at(transaction, port.number);
  if (present == uplink) {
    return;
  }
  if (present) {
    throw Refused(QEX_BUSY, "the port has the uplink '" + *present + "'");
  }
  if (known.port) {
    throw Refused(QEX_BUSY, "the uplink '" + uplink + "' is at another port");
  }
  storage::attach_uplink(transaction, uplink, port.number);
}

void apply_uplink_port(Transaction &transaction, storage::SwitchKey key, Node const &node) {
  only_of_uplink_port(node);
  auto const identifier = node.at("id").text();
  auto const found = storage::find_port(transaction, key, identifier);
  auto const port = found ? *found : add_vacant_uplink_port(transaction, key, identifier);
  if (port.kind != storage::PortKind::uplink) {
    node.at("id").fail("is a port that is no uplink port");
  }
  auto const owner = PropertyOwner::port(key, port.number);
  apply_settings(transaction, owner, SettingOwner::of_uplink_port, node);
  if_there(node, "uplink",
           [&](Node const &uplink) { attach_to(transaction, port, uplink.text()); });
}

void attach_uplinks(Transaction &transaction, storage::SwitchKey key, Node const &node) {
  for_each_in(node, "uplinks", [&](Node const &item) {
    auto const name = item.text();
    auto const attached = storage::uplinks_of(transaction, key);
    bool const here = std::any_of(attached.begin(), attached.end(),
                                  [&](auto const &uplink) { return uplink.name == name; });
    if (!here) {
      add_uplink_port(transaction, key, name);
    }
  });
}

void apply_lag(Transaction &transaction, storage::SwitchKey key, Node const &node) {
  auto const lag = read_object(kLagMembers, node, LagMembers());
  put_lag(transaction, key, lag.name, lag.uplinks);
}

void apply_session_counters(Transaction &transaction, storage::SwitchKey key, Node const &node) {
  if_there(node, "mirror_counters", [&](Node const &sessions) {
    for_each_member(sessions, [&](std::string const &sid, Node const &counters) {
      set_counters(transaction, {.switch_key = key, .session = sid}, counters);
    });
  });
}

}  // namespace

void apply_switch(Transaction &transaction, Node const &node) {
  only(node, SettingOwner::of_switch, kSwitchKeys);
  auto const alias = node.at("alias").text();
  auto const known = storage::find_switch(transaction, storage::SwitchName::alias, alias);
  auto const key = known ? changed_switch(*known, node) : made_switch(transaction, alias, node);
  auto const owner = PropertyOwner::global(key);
  apply_raw(transaction, owner, SettingOwner::of_switch, node);
  apply_raw(transaction, PropertyOwner::host(key), SettingOwner::of_host, node, "host_properties");
  // Before ports of either kind: their VLANs may be in the switch's private VLANs.
  apply_named(transaction, owner, SettingOwner::of_switch, node);
  for_each_in(node, "uplink_ports",
              [&](Node const &item) { apply_uplink_port(transaction, key, item); });
  attach_uplinks(transaction, key, node);
  for_each_in(node, "lags", [&](Node const &item) { apply_lag(transaction, key, item); });
  for_each_in(node, "ports", [&](Node const &item) { apply_port(transaction, key, item); });
  apply_addresses(transaction, {.switch_key = key, .port = std::nullopt}, node);
  apply_counters(transaction, {.switch_key = key}, node);
  apply_session_counters(transaction, key, node);
  if_there(node, "running",
           [&](Node const &running) { change_running(transaction, key, running.flag()); });
}

}  // namespace simhost::scenario
