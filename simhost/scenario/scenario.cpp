// From a document to the host: what belongs to no switch.
#include "scenario/scenario.h"

#include <algorithm>
#include <array>
#include <string>

#include "clock/clock.h"
#include "faults/faults.h"
#include "model/options/host_settings.h"
#include "model/options/runtime_options.h"
#include "model/plane.h"
#include "qexapi/names.h"
#include "scenario/reading.h"
#include "scenario/scenario_switches.h"
#include "storage/store.h"
#include "vswitch/mac_learning.h"

namespace simhost::scenario {
namespace {

using storage::Transaction;

void apply_clock(Transaction &transaction, Node const &node) {
  node.only({"stopped", "now"});
  if (auto const stopped = node.find("stopped")) {
    if (stopped->flag()) {
      stop_clock(transaction);
    } else {
      run_clock(transaction);
    }
  }
  if_there(node, "now",
           [&](Node const &now) { set_clock(transaction, ClockTime(now.milliseconds())); });
}

constexpr std::array kLinkKeys{"link",   "admin",   "lacp",          "speed",
                               "duplex", "beacons", "error_percent", "driver"};

bool has_link(Node const &node) {
  return std::ranges::any_of(kLinkKeys,
                             [&](auto const *key) { return node.find(key).has_value(); });
}

void apply_link(Transaction &transaction, std::string const &name, Node const &node) {
  auto &wires = get_wires();
  auto const before = wires.link_of(transaction, name);
  auto link = before;
  link.carrier = node.get("link", before.carrier, up_or_down);
  link.admin = node.get("admin", before.admin, up_or_down);
  link.partner = node.get("lacp", before.partner, up_or_down);
  link.speed =
      node.get("speed", before.speed, [](Node const &speed) { return speed.integer(1, 1000000); });
  link.full_duplex = node.get("duplex", before.full_duplex,
                              [](Node const &duplex) { return duplex.choice(kDuplex) != 0; });
  link.beacons = node.get("beacons", before.beacons, up_or_down);
  link.error_percent = node.get("error_percent", before.error_percent,
                                [](Node const &percent) { return percent.integer(0, 100); });
  link.driver = node.get("driver", before.driver, [](Node const &driver) { return driver.flag(); });
  wires.change_link(transaction, name, link);
}

void apply_uplink(Transaction &transaction, Node const &node) {
  node.only({"name", "link", "admin", "lacp", "speed", "duplex", "beacons", "error_percent",
             "driver", "observed"});
  auto const name = node.at("name").text();
  if (name.empty() || name.size() >= QEX_MISC_NAME_MAX) {
    node.at("name").fail("must have 1 to 31 bytes");
  }
  if (!storage::find_uplink(transaction, name)) {
    storage::add_uplink(transaction, name);
  }
  if (has_link(node)) {
    apply_link(transaction, name, node);
  }
}

void apply_runtime_option(Transaction &transaction, std::string const &name, Node const &node) {
  auto const options = runtime_options();
  auto const found = std::find_if(options.begin(), options.end(),
                                  [&](RuntimeOption const &option) { return option.name == name; });
  if (found == options.end()) {
    node.fail("unknown option");
  }
  auto const type = static_cast<unsigned>(found - options.begin());
  if (found->is_number()) {
    auto const number = node.integer(found->least, found->greatest);
    set_runtime_option(transaction, type, static_cast<std::int32_t>(number));
  } else {
    set_runtime_option(transaction, type, node.text());
  }
}

void apply_global_learning(Transaction &transaction, Node const &node) {
  node.only({"aging_time", "limit", "learn_static"});
  auto props = global_mac_learning(transaction);
  props.agingTime = node.get("aging_time", qex_uint32{props.agingTime}, [](Node const &given) {
    return given.integer(1, VS_MAC_LEARNING_AGING_TIME_MAX);
  });
  props.macLimit = node.get("limit", qex_uint32{props.macLimit}, number_of_32_bits);
  props.learnStatic = node.get("learn_static", props.learnStatic, &Node::flag_of);
  set_global_mac_learning(transaction, props);
}

QEX_ReturnStatus status_from(Node const &node) {
  auto const status = status_named(node.text());
  if (!status) {
    node.fail("'" + node.text() + "' is the name of no status");
  }
  return *status;
}

void apply_fault(Transaction &transaction, Node const &node) {
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
  add_fault(transaction, fault);
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

}  // namespace simhost::scenario
