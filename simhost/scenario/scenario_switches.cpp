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
#include "model/devices/devices.h"
#include "model/fabric/fabric.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "model/uplinks/lags.h"
#include "model/vlans/properties.h"
#include "scenario/keys.h"
#include "scenario/members.h"
#include "scenario/reading.h"
#include "scenario/scenario_fabric.h"
#include "scenario/settings.h"
#include "storage/store.h"

namespace simhost::scenario {
namespace {

using storage::ChangingTransaction;
using storage::PropertyOwner;

// The keys that an object may have.
std::vector<std::string_view> keys_of(SettingOwner kind, std::span<Member const> members,
                                      std::span<std::string_view const> parts) {
  auto all = setting_names(kind);
  auto const own = names_of(members);
  all.insert(all.end(), own.begin(), own.end());
  all.insert(all.end(), parts.begin(), parts.end());
  return all;
}

// What other ports have and an uplink port has not is a mistake of another kind than a typing
// error.
void only_of_uplink_port(Node const &node) {
  auto const is_among = [](auto const &keys, std::string_view key) {
    return std::find(keys.begin(), keys.end(), key) != keys.end();
  };
  auto const own = keys_of(SettingOwner::of_uplink_port, kUplinkPortMembers, kUplinkPortParts);
  auto const of_others = keys_of(SettingOwner::of_port, kPortMembers, kPortParts);
  for (auto const &[key, value] : node.members()) {
    if (is_among(own, key) || !is_among(of_others, key)) {
      continue;
    }
    auto const name = name_at_uplink_port(key);
    value.fail(name.empty() ? "uplink ports have none"
                            : fmt::format("uplink ports call it '{}'", name));
  }
  node.only(own);
}

void set_counters(ChangingTransaction &transaction, CounterOwner const &owner,
                  Node const &counters) {
  for_each_member(counters, [&](std::string const &name, Node const &value) {
    set_counter(transaction, owner, name, value.counter());
  });
}

void apply_counters(ChangingTransaction &transaction, CounterOwner const &owner, Node const &node) {
  if_there(node, keys::counters,
           [&](Node const &counters) { set_counters(transaction, owner, counters); });
}

void apply_addresses(ChangingTransaction &transaction, Place const &place, Node const &node) {
  for_each_in(node, keys::addresses, [&](Node const &item) {
    auto const entry = read_object(kAddressMembers, item, new_address());
    // Those of other types are settings, whatever the wires are.
    auto &wires =
        entry.macAddrType == VS_MAC_ADDR_TYPE_LEARNED ? get_wires(transaction, place) : get_wires();
    wires.describe_address(transaction, place, entry);
  });
}

// The address of the client, if one is said.
std::optional<storage::MacBytes> client_from(DeviceMembers const &said, Node const &node) {
  if (said.mac.empty()) {
    return std::nullopt;
  }
  auto const mac = mac_from(said.mac);
  if (!mac) {
    node.at(kMac).fail("must be six bytes such as 02:00:00:00:00:01");
  }
  return mac;
}

// An empty name stands for none.
void apply_device(ChangingTransaction &transaction, storage::Port const &port, Node const &node) {
  DeviceMembers said;
  read(kPortDevice, node, &said);
  if (!said.name.empty()) {
    connect(transaction, port, said.name, client_from(said, node));
  } else if (storage::device_of(transaction, port.number)) {
    disconnect(transaction, port);
  }
}

void apply_port(ChangingTransaction &transaction, storage::SwitchKey key, Node const &node) {
  node.only(keys_of(SettingOwner::of_port, kPortMembers, kPortParts));
  PortMembers said;
  read_members(kPortMembers, node, &said);
  auto const found = storage::find_port(transaction, key, said.id);
  auto const port = found ? *found : add_client_port(transaction, key, said.id);
  auto const owner = PropertyOwner::port(key, port.number);
  if_there(node, kExternalId,
           [&](Node const &) { set_external_id(transaction, port, said.external_id); });
  apply_settings(transaction, owner, SettingOwner::of_port, node);
  Place const place{.switch_key = key, .port = port.number};
  apply_addresses(transaction, place, node);
  for_each_in(node, keys::groups, [&](Node const &item) {
    get_wires(transaction, place)
        .join(transaction, port.number, read_object(kGroupMembers, item, McastGroup()));
  });
  apply_counters(transaction, {.switch_key = key, .port = port.number}, node);
  // Last, because what stands in for wires may be said of a port only while it has none.
  if_there(node, keys::device,
           [&](Node const &device) { apply_device(transaction, port, device); });
}

storage::SwitchKey made_switch(ChangingTransaction &transaction, storage::Switch const &wanted) {
  return create_switch(transaction, {.alias = wanted.alias,
                                     .identifier = wanted.identifier,
                                     .portset = wanted.portset,
                                     .max_ports = wanted.max_ports,
                                     .persistent = wanted.persistent,
                                     .version = wanted.version});
}

// What a switch is made with cannot change later.
void require_fixed(Node const &node, storage::Switch const &row) {
  for (auto const &member : kSwitchMembers) {
    auto const given = node.find(member.name);
    if (!given || member.name == kRunning) {
      continue;
    }
    auto wanted = row;
    read(member.form, *given, &wanted);
    if (wanted != row) {
      given->fail("cannot change while the switch exists");
    }
  }
}

// The port is to have the uplink, and no other one.
void attach_to(ChangingTransaction &transaction, storage::Port const &port,
               std::string const &uplink) {
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

void apply_uplink_port(ChangingTransaction &transaction, storage::SwitchKey key, Node const &node) {
  only_of_uplink_port(node);
  UplinkPortMembers said;
  read_members(kUplinkPortMembers, node, &said);
  auto const found = storage::find_port(transaction, key, said.id);
  auto const port = found ? *found : add_vacant_uplink_port(transaction, key, said.id);
  if (port.kind != storage::PortKind::uplink) {
    node.at(kId).fail("is a port that is no uplink port");
  }
  auto const owner = PropertyOwner::port(key, port.number);
  apply_settings(transaction, owner, SettingOwner::of_uplink_port, node);
  if_there(node, kUplink, [&](Node const &) { attach_to(transaction, port, said.uplink); });
}

void attach_uplinks(ChangingTransaction &transaction, storage::SwitchKey key, Node const &node) {
  for_each_in(node, keys::uplinks, [&](Node const &item) {
    auto const name = item.text();
    auto const attached = storage::uplinks_of(transaction, key);
    bool const here = std::any_of(attached.begin(), attached.end(),
                                  [&](auto const &uplink) { return uplink.name == name; });
    if (!here) {
      add_uplink_port(transaction, key, name);
    }
  });
}

void apply_lag(ChangingTransaction &transaction, storage::SwitchKey key, Node const &node) {
  auto const lag = read_object(kLagMembers, node, LagMembers());
  put_lag(transaction, key, lag.name, lag.uplinks, lag.is_fast != 0);
}

void apply_session_counters(ChangingTransaction &transaction, storage::SwitchKey key,
                            Node const &node) {
  if_there(node, keys::mirror_counters, [&](Node const &sessions) {
    for_each_member(sessions, [&](std::string const &sid, Node const &counters) {
      set_counters(transaction, {.switch_key = key, .session = sid}, counters);
    });
  });
}

}  // namespace

void apply_switch(ChangingTransaction &transaction, Node const &node) {
  node.only(keys_of(SettingOwner::of_switch, kSwitchMembers, kSwitchParts));
  auto wanted = new_switch();
  read_members(kSwitchMembers, node, &wanted);
  auto const known = storage::find_switch(transaction, storage::SwitchName::alias, wanted.alias);
  if (known) {
    require_fixed(node, known->row);
  }
  auto const key = known ? known->key : made_switch(transaction, wanted);
  auto const owner = PropertyOwner::global(key);
  apply_raw(transaction, owner, SettingOwner::of_switch, node);
  apply_raw(transaction, PropertyOwner::host(key), SettingOwner::of_host, node,
            keys::host_properties);
  // Before ports of either kind: their VLANs may be in the switch's private VLANs.
  apply_named(transaction, owner, SettingOwner::of_switch, node);
  // Its uplink may be named among those of ports.
  if_there(node, keys::fabric, [&](Node const &fabric) { apply_fabric(transaction, key, fabric); });
  for_each_in(node, keys::uplink_ports,
              [&](Node const &item) { apply_uplink_port(transaction, key, item); });
  attach_uplinks(transaction, key, node);
  if_there(node, keys::fabric, [&](Node const &) { attach_fabric(transaction, key); });
  for_each_in(node, keys::lags, [&](Node const &item) { apply_lag(transaction, key, item); });
  for_each_in(node, keys::ports, [&](Node const &item) { apply_port(transaction, key, item); });
  apply_addresses(transaction, {.switch_key = key, .port = std::nullopt}, node);
  apply_counters(transaction, {.switch_key = key}, node);
  apply_session_counters(transaction, key, node);
  if_there(node, kRunning,
           [&](Node const &) { change_running(transaction, key, wanted.associated); });
}

}  // namespace simhost::scenario
