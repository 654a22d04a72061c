// From a document to the host.
#include "control/scenario.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <string>
#include <vector>

#include "control/policy_documents.h"
#include "control/texts.h"
#include "control/vocabulary.h"
#include "core/clock.h"
#include "core/faults.h"
#include "core/giving_up.h"
#include "core/host_settings.h"
#include "core/known.h"
#include "core/ports.h"
#include "core/properties.h"
#include "core/runtime_options.h"
#include "core/switches.h"
#include "dataplane/counters.h"
#include "dataplane/links.h"
#include "dataplane/mac_tables.h"
#include "dataplane/multicast.h"
#include "dataplane/teaming.h"
#include "qexapi/names.h"
#include "store/store.h"
#include "vswitch/mac_learning.h"
#include "vswitch/properties.h"

namespace simhost::control {
namespace {

using store::PropertyOwner;
using store::Transaction;

constexpr std::int64_t k32Bits = 0xFFFFFFFF;

bool up_or_down(Node const &node) {
  return node.choice(std::span(kUpDown));
}

std::string text_of_node(Node const &node) {
  return node.text();
}

std::uint32_t number_of_32_bits(Node const &node) {
  return static_cast<std::uint32_t>(node.integer(0, k32Bits));
}

// Does `work`; what the host refuses is told with the path of `node`.
template <typename Work>
auto do_at(Node const &node, Work const &work) {
  try {
    return work();
  } catch (Refused const &refused) {
    node.fail("the host refuses it: " + status_text(refused.status()));
  }
}

template <typename Each>
void for_each_in(Node const &node, std::string_view key, Each const &each) {
  if (auto const list = node.find(key)) {
    for (auto const &item : list->items()) {
      do_at(item, [&] { each(item); });
    }
  }
}

template <typename Each>
void for_each_member(Node const &object, Each const &each) {
  for (auto const &member : object.members()) {
    do_at(member.value, [&] { each(member.key, member.value); });
  }
}

template <typename Use>
void if_there(Node const &node, std::string_view key, Use const &use) {
  if (auto const found = node.find(key)) {
    do_at(*found, [&] { use(*found); });
  }
}

void apply_clock(Transaction &work, Node const &node) {
  node.only({"stopped", "now"});
  if (auto const stopped = node.find("stopped")) {
    if (stopped->flag()) {
      stop_clock(work);
    } else {
      run_clock(work);
    }
  }
  if_there(node, "now", [&](Node const &now) { set_clock(work, ClockTime(now.milliseconds())); });
}

void apply_uplink(Transaction &work, Node const &node) {
  node.only({"name", "link", "admin", "lacp", "speed", "duplex", "beacons", "error_percent",
             "driver", "observed"});
  auto const name = node.at("name").text();
  if (name.empty() || name.size() >= QEX_MISC_NAME_MAX) {
    node.at("name").fail("must have 1 to 31 bytes");
  }
  if (!store::find_uplink(work, name)) {
    store::add_uplink(work, name);
  }
  auto const before = dataplane::link_of(work, name);
  auto link = before;
  link.carrier = node.get("link", before.carrier, up_or_down);
  link.admin = node.get("admin", before.admin, up_or_down);
  link.partner = node.get("lacp", before.partner, up_or_down);
  link.speed =
      node.get("speed", before.speed, [](Node const &speed) { return speed.integer(1, 1000000); });
  link.full_duplex = node.get("duplex", before.full_duplex,
                              [](Node const &duplex) { return duplex.choice(std::span(kDuplex)); });
  link.beacons = node.get("beacons", before.beacons, up_or_down);
  link.error_percent = node.get("error_percent", before.error_percent,
                                [](Node const &percent) { return percent.integer(0, 100); });
  link.driver = node.get("driver", before.driver, [](Node const &driver) { return driver.flag(); });
  dataplane::change_link(work, name, link);
}

void apply_runtime_option(Transaction &work, std::string const &name, Node const &node) {
  auto const options = runtime_options();
  auto const found = std::find_if(options.begin(), options.end(),
                                  [&](RuntimeOption const &option) { return option.name == name; });
  if (found == options.end()) {
    node.fail("unknown option");
  }
  auto const type = static_cast<unsigned>(found - options.begin());
  if (node.is_text()) {
    set_runtime_option(work, type, node.text());
  } else {
    auto const number = node.integer(found->least, found->greatest);
    set_runtime_option(work, type, static_cast<std::int32_t>(number));
  }
}

void apply_global_learning(Transaction &work, Node const &node) {
  node.only({"aging_time", "limit", "learn_static"});
  auto props = global_mac_learning(work);
  props.agingTime = node.get("aging_time", qex_uint32{props.agingTime}, [](Node const &given) {
    return given.integer(1, VS_MAC_LEARNING_AGING_TIME_MAX);
  });
  props.macLimit = node.get("limit", qex_uint32{props.macLimit}, number_of_32_bits);
  props.learnStatic = node.get("learn_static", props.learnStatic, &Node::flag_of);
  set_global_mac_learning(work, props);
}

Bytes bytes_from(Node const &node) {
  auto const hex = node.find("hex");
  auto const text = node.find("text");
  if (hex.has_value() == text.has_value()) {
    node.fail("must have one of the keys hex, text");
  }
  if (text) {
    return bytes_of_text(text->text());
  }
  auto const bytes = bytes_from_hex(hex->text());
  if (!bytes) {
    hex->fail("must be hexadecimal digits, two for each byte");
  }
  return *bytes;
}

void apply_properties(Transaction &work, PropertyOwner const &owner, Node const &node) {
  if_there(node, "properties", [&](Node const &properties) {
    for_each_member(properties, [&](std::string const &key, Node const &property) {
      property.only({"type", "hex", "text"});
      auto const type = property.at("type").choice(std::span(kPropertyTypes));
      set_property(work, owner, key, bytes_from(property), type);
    });
  });
}

void set_counters(Transaction &work, CounterOwner const &owner, Node const &counters) {
  for_each_member(counters, [&](std::string const &name, Node const &value) {
    dataplane::set_counter(work, owner, name, value.counter());
  });
}

void apply_counters(Transaction &work, CounterOwner const &owner, Node const &node) {
  if_there(node, "counters", [&](Node const &counters) { set_counters(work, owner, counters); });
}

VSMACEntry address_entry_from(Node const &node) {
  node.only({"mac", "vlan", "vni", "type", "ages", "age"});
  VSMACEntry entry{};
  auto const mac = mac_from(node.at("mac").text());
  if (!mac) {
    node.at("mac").fail("must be six bytes such as 02:00:00:00:00:01");
  }
  std::memcpy(entry.macAddress, mac->data(), mac->size());
  auto const type = node.get("type", VS_MAC_ADDR_TYPE_LEARNED, [](Node const &given) {
    return given.choice(std::span(kAddressTypes));
  });
  entry.macAddrType = type;
  entry.vid =
      node.get("vlan", qex_VlanID{0}, [](Node const &given) { return given.integer(0, 4094); });
  entry.vni =
      node.get("vni", qex_uint32{0}, [](Node const &given) { return given.integer(0, 0xFFFFFF); });
  entry.aging =
      node.get("ages", static_cast<qex_Bool>(type == VS_MAC_ADDR_TYPE_LEARNED), &Node::flag_of);
  entry.elapsed = node.get("age", qex_uint32{0}, number_of_32_bits);
  return entry;
}

void apply_addresses(Transaction &work, Place const &place, Node const &node) {
  for_each_in(node, "addresses", [&](Node const &item) {
    dataplane::describe_address(work, place, address_entry_from(item));
  });
}

McastGroup group_from(Node const &node) {
  node.only({"address", "version", "sources", "source_mode", "vni", "observed"});
  auto const address = [](Node const &given) {
    auto const bytes = address_from(given.text());
    if (!bytes) {
      given.fail("must be an address of Ethernet, IPv4 or IPv6");
    }
    return *bytes;
  };
  McastGroup group{.address = address(node.at("address")),
                   .version = node.get("version", 0U, number_of_32_bits),
                   .source_mode = node.get(
                       "source_mode", 0U,
                       [](Node const &given) { return given.choice(std::span(kSourceModes)); }),
                   .vni = node.get("vni", 0U, number_of_32_bits),
                   .updated = {},
                   .sources = {}};
  if (auto const sources = node.find("sources")) {
    for (auto const &source : sources->items()) {
      group.sources.push_back(address(source));
    }
  }
  return group;
}

void apply_mirror_sessions(Transaction &work, store::Port const &port, Node const &node) {
  set_property(work, PropertyOwner::port(port.switch_key, port.number), VSPROP_PORT_MIRROR_SESSIONS,
               mirror_sessions_from(node));
}

void apply_port(Transaction &work, store::SwitchKey key, Node const &node) {
  node.only({"id", "teaming", "uplink", "mac_learning", "addresses", "groups", "mirror_sessions",
             "counters", "properties", "observed"});
  auto const identifier = node.at("id").text();
  auto const found = store::find_port(work, key, identifier);
  auto const port = found ? *found : add_client_port(work, key, identifier);
  auto const owner = PropertyOwner::port(key, port.number);
  apply_properties(work, owner, node);
  if_there(node, "teaming", [&](Node const &teaming) {
    set_property(work, owner, VSPROP_PORT_TEAMING_POLICY, bytes_of(teaming_from(teaming)));
  });
  if_there(node, "uplink", [&](Node const &uplink) {
    set_property(work, owner, VSPROP_PORT_TEAMING_OVERRIDE, bytes_of_text(uplink.text()));
  });
  if_there(node, "mac_learning", [&](Node const &learning) {
    set_property(work, owner, VSPROP_PORT_MAC_MANAGEMENT, bytes_of(port_learning_from(learning)));
  });
  if_there(node, "mirror_sessions",
           [&](Node const &sessions) { apply_mirror_sessions(work, port, sessions); });
  apply_addresses(work, {.switch_key = key, .port = port.number}, node);
  for_each_in(node, "groups",
              [&](Node const &item) { dataplane::join(work, port.number, group_from(item)); });
  apply_counters(work, {.switch_key = key, .port = port.number}, node);
}

// The keys with which a switch is made, and which cannot change later.
store::SwitchKey made_switch(Transaction &work, std::string const &alias, Node const &node) {
  auto const identifier = node.get("id", std::string(), text_of_node);
  auto const portset = node.get("portset", std::string(), text_of_node);
  SwitchSpec const spec{
      .alias = alias,
      .identifier = identifier,
      .portset = portset,
      .max_ports =
          node.get("max_ports", 0U, [](Node const &given) { return given.integer(1, 65535); }),
      .persistent = node.get("persistent", true, &Node::flag_of),
      .version = node.get("version", 0U, number_of_32_bits)};
  create_switch(work, spec);
  return known_switch(work, alias).key;
}

store::SwitchKey changed_switch(store::FoundSwitch const &known, Node const &node) {
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

void attach_uplinks(Transaction &work, store::SwitchKey key, Node const &node) {
  for_each_in(node, "uplinks", [&](Node const &item) {
    auto const name = item.text();
    auto const attached = store::uplinks_of(work, key);
    bool const here = std::any_of(attached.begin(), attached.end(),
                                  [&](auto const &uplink) { return uplink.name == name; });
    if (!here) {
      add_uplink_port(work, key, name);
    }
  });
}

void apply_lag(Transaction &work, store::SwitchKey key, Node const &node) {
  node.only({"name", "uplinks", "observed"});
  std::vector<std::string> uplinks;
  for (auto const &uplink : node.at("uplinks").items()) {
    uplinks.push_back(uplink.text());
  }
  dataplane::put_lag(work, key, node.at("name").text(), uplinks);
}

void apply_session_counters(Transaction &work, store::SwitchKey key, Node const &node) {
  if_there(node, "mirror_counters", [&](Node const &sessions) {
    for_each_member(sessions, [&](std::string const &sid, Node const &counters) {
      set_counters(work, {.switch_key = key, .session = sid}, counters);
    });
  });
}

void apply_switch(Transaction &work, Node const &node) {
  node.only({"alias", "id", "portset", "max_ports", "persistent", "version", "mtu", "uplinks",
             "lags", "teaming", "mac_learning", "multicast", "addresses", "counters",
             "mirror_counters", "properties", "ports", "observed"});
  auto const alias = node.at("alias").text();
  auto const known = store::find_switch(work, store::SwitchName::alias, alias);
  auto const key = known ? changed_switch(*known, node) : made_switch(work, alias, node);
  auto const owner = PropertyOwner::global(key);
  apply_properties(work, owner, node);
  if_there(node, "mtu", [&](Node const &mtu) {
    set_mtu(work, alias, static_cast<std::uint32_t>(mtu.integer(1280, 9190)));
  });
  attach_uplinks(work, key, node);
  for_each_in(node, "lags", [&](Node const &item) { apply_lag(work, key, item); });
  if_there(node, "teaming", [&](Node const &teaming) {
    set_property(work, owner, VSPROP_SWITCH_TEAMING, bytes_of(teaming_from(teaming)));
  });
  if_there(node, "mac_learning", [&](Node const &learning) {
    set_property(work, owner, VSPROP_SWITCH_MAC_LEARNING, bytes_of(switch_learning_from(learning)));
  });
  if_there(node, "multicast", [&](Node const &mode) {
    set_property(work, owner, VSPROP_MULTICAST_FILTER,
                 bytes_of(mode.choice(std::span(kFilterModes))));
  });
  for_each_in(node, "ports", [&](Node const &item) { apply_port(work, key, item); });
  apply_addresses(work, {.switch_key = key, .port = std::nullopt}, node);
  apply_counters(work, {.switch_key = key}, node);
  apply_session_counters(work, key, node);
}

QEX_ReturnStatus status_from(Node const &node) {
  auto const status = status_named(node.text());
  if (!status) {
    node.fail("'" + node.text() + "' is the name of no status");
  }
  return *status;
}

void apply_fault(Transaction &work, Node const &node) {
  node.only({"call", "nth", "times", "status", "exception", "message", "delay", "observed"});
  Fault fault;
  fault.function = node.at("call").text();
  fault.first =
      node.get("nth", std::int64_t{1}, [](Node const &given) { return given.integer(1, k32Bits); });
  auto const times = node.get("times", std::int64_t{1},
                              [](Node const &given) { return given.integer(0, k32Bits); });
  fault.last = times == 0 ? Fault::kForever : fault.first + times - 1;
  fault.status = node.get("status", QEX_OK, status_from);
  fault.exception = node.get("exception", std::string(), text_of_node);
  fault.message = node.get("message", std::string(), text_of_node);
  fault.delay = std::chrono::milliseconds(
      node.get("delay", std::int64_t{0}, [](Node const &given) { return given.milliseconds(); }));
  add_fault(work, fault);
}

}  // namespace

void apply(Transaction &transaction, std::string_view document) {
  auto const json = parsed(document);
  Node const node(json);
  node.only({"clock", "uplinks", "runtime_options", "mac_learning", "switches", "faults"});
  if_there(node, "clock", [&](Node const &clock) { apply_clock(transaction, clock); });
  for_each_in(node, "uplinks", [&](Node const &item) { apply_uplink(transaction, item); });
  if_there(node, "runtime_options", [&](Node const &options) {
    for_each_member(options, [&](std::string const &name, Node const &value) {
      apply_runtime_option(transaction, name, value);
    });
  });
  if_there(node, "mac_learning",
           [&](Node const &learning) { apply_global_learning(transaction, learning); });
  for_each_in(node, "switches", [&](Node const &item) { apply_switch(transaction, item); });
  for_each_in(node, "faults", [&](Node const &item) { apply_fault(transaction, item); });
}

}  // namespace simhost::control
