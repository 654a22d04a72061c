// From a document to the host: what belongs to no switch.
#include "scenario/scenario.h"

#include <algorithm>
#include <chrono>
#include <string>

#include "clock/clock.h"
#include "faults/faults.h"
#include "model/devices/devices.h"
#include "model/lookup.h"
#include "model/options/host_settings.h"
#include "model/options/runtime_options.h"
#include "model/plane.h"
#include "qexapi/names.h"
#include "scenario/members.h"
#include "scenario/reading.h"
#include "scenario/scenario_fabric.h"
#include "scenario/scenario_switches.h"
#include "storage/shared.h"
#include "storage/store.h"

namespace simhost::scenario {
namespace {

using storage::ChangingTransaction;

void apply_clock(ChangingTransaction &transaction, Node const &node) {
  auto const before = clock_members(transaction);
  auto const after = read_object(kClockMembers, node, before);
  if (after.stopped != before.stopped) {
    after.stopped ? stop_clock_without_devices(transaction) : run_clock(transaction);
  }
  // A clock that runs has gone on meanwhile.
  if (node.find(kNow)) {
    set_clock(transaction, ClockTime(after.now));
  }
}

void apply_link(ChangingTransaction &transaction, std::string const &name, Node const &node) {
  auto &wires = get_wires(transaction, name);
  auto link = wires.link_of(transaction, name);
  read_members(kLinkMembers, node, &link);
  wires.change_link(transaction, name, link);
}

// An empty name stands for none.
void apply_device(ChangingTransaction &transaction, std::string const &name,
                  std::string const &device) {
  auto const uplink = get_uplink(transaction, name);
  if (!device.empty()) {
    connect(transaction, uplink, device);
  } else if (storage::device_of(transaction, name)) {
    disconnect(transaction, uplink);
  }
}

void apply_uplink(ChangingTransaction &transaction, Node const &node) {
  auto const link_keys = names_of(kLinkMembers);
  auto keys = link_keys;
  keys.insert(keys.end(), {kName, keys::device, kObserved});
  node.only(keys);
  auto const name = node.at(kName).text();
  if (name.empty() || name.size() >= QEX_MISC_NAME_MAX) {
    node.at(kName).fail("must have 1 to 31 bytes");
  }
  if (!storage::find_uplink(transaction, name)) {
    storage::add_uplink(transaction, name);
  }
  if (std::ranges::any_of(link_keys, [&](auto key) { return node.find(key).has_value(); })) {
    apply_link(transaction, name, node);
  }
  if_there(node, keys::device,
           [&](Node const &device) { apply_device(transaction, name, device.text()); });
}

void apply_runtime_option(ChangingTransaction &transaction, std::string const &name,
                          Node const &node) {
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

void apply_global_learning(ChangingTransaction &transaction, Node const &node) {
  auto props = global_mac_learning(transaction);
  read(form::record<VSMACLearningGlobalProps>(kGlobalLearningMembers), node, &props);
  set_global_mac_learning(transaction, props);
}

QEX_ReturnStatus status_from(Node const &node) {
  auto const status = status_named(node.text());
  if (!status) {
    node.fail("'" + node.text() + "' is the name of no status");
  }
  return *status;
}

void apply_fault(ChangingTransaction &transaction, Node const &node) {
  auto const said = read_object(kFaultMembers, node, FaultMembers());
  add_fault(transaction, {.function = said.call,
                          .first = said.nth,
                          .last = said.times == 0 ? Fault::kForever : said.nth + said.times - 1,
                          .delay = std::chrono::milliseconds(said.delay),
                          .status = node.get(kStatus, QEX_OK, status_from),
                          .exception = said.exception,
                          .message = said.message});
}

// Whether a host shares the switch of that alias.
bool is_shared(ChangingTransaction &transaction, Node const &node) {
  auto const alias = node.at(kAlias).text();
  auto const found = storage::find_switch(transaction, storage::SwitchName::alias, alias);
  return found && storage::is_shared(transaction, found->row.identifier);
}

template <typename IsWanted>
void apply_if(ChangingTransaction &transaction, std::string_view document,
              IsWanted const &is_wanted) {
  auto const json = parsed(document);
  Node const node(json);
  node.only(kDocumentParts);
  if_there(node, keys::clock, [&](Node const &clock) { apply_clock(transaction, clock); });
  if_there(node, keys::underlay,
           [&](Node const &underlay) { apply_underlay(transaction, underlay); });
  for_each_in(node, keys::uplinks, [&](Node const &item) { apply_uplink(transaction, item); });
  if_there(node, keys::runtime_options, [&](Node const &options) {
    for_each_member(options, [&](std::string const &name, Node const &value) {
      apply_runtime_option(transaction, name, value);
    });
  });
  if_there(node, keys::mac_learning,
           [&](Node const &learning) { apply_global_learning(transaction, learning); });
  for_each_in(node, keys::switches, [&](Node const &item) {
    if (is_wanted(item)) {
      apply_switch(transaction, item);
    }
  });
  for_each_in(node, keys::faults, [&](Node const &item) { apply_fault(transaction, item); });
}

}  // namespace

void apply(ChangingTransaction &transaction, std::string_view document) {
  apply_if(transaction, document, [](Node const &) { return true; });
}

void apply_to_own(ChangingTransaction &transaction, std::string_view document) {
  apply_if(transaction, document, [&](Node const &item) { return !is_shared(transaction, item); });
}

}  // namespace simhost::scenario
