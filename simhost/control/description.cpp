// From the host to a document.
#include <string>
#include <utility>

#include "control/named_properties.h"
#include "control/scenario.h"
#include "control/texts.h"
#include "control/vocabulary.h"
#include "core/clock.h"
#include "core/faults.h"
#include "core/giving_up.h"
#include "core/host_settings.h"
#include "core/known.h"
#include "core/runtime_options.h"
#include "core/switches.h"
#include "dataplane/counters.h"
#include "dataplane/links.h"
#include "dataplane/mac_tables.h"
#include "dataplane/multicast.h"
#include "dataplane/teaming.h"
#include "store/store.h"

namespace simhost::control {
namespace {

using store::PropertyOwner;
using store::Transaction;

template <typename Range, typename Describe>
Json described_each(Range const &range, Describe const &describe) {
  Json list = Json::array();
  for (auto const &item : range) {
    list.push_back(describe(item));
  }
  return list;
}

double seconds(ClockTime time) {
  return static_cast<double>(time.count()) / 1000;
}

Json described_uplink(Transaction &work, store::Uplink const &uplink) {
  auto const link = dataplane::link_of(work, uplink.name);
  Json described{{"name", uplink.name},
                 {"link", described_choice(link.carrier, kUpDown)},
                 {"admin", described_choice(link.admin, kUpDown)},
                 {"lacp", described_choice(link.partner, kUpDown)},
                 {"speed", link.speed},
                 {"duplex", described_choice(link.full_duplex, kDuplex)},
                 {"beacons", described_choice(link.beacons, kUpDown)},
                 {"error_percent", link.error_percent},
                 {"driver", link.driver}};
  if (uplink.port) {
    auto const port = known_port(work, *uplink.port);
    described["observed"] = {{"switch", store::find_switch(work, port.switch_key)->row.alias},
                             {"port", port.identifier}};
  }
  return described;
}

Json described_address(VSMACEntry const &entry) {
  VSMACAddrType const type = entry.macAddrType;
  return {{"mac", mac_text(std::as_bytes(std::span(entry.macAddress)))},
          {"vlan", qex_VlanID{entry.vid}},
          {"vni", qex_uint32{entry.vni}},
          {"type", described_choice(type, kAddressTypes)},
          {"ages", entry.aging != 0},
          {"age", qex_uint32{entry.elapsed}}};
}

Json described_addresses(Transaction &work, Place const &place) {
  return described_each(dataplane::addresses(work, place, VS_MAC_ADDR_TYPE_ALL), described_address);
}

Json described_groups(Transaction &work, store::PortNumber port) {
  Json list = Json::array();
  for (auto const length : {6, 4, 16}) {
    for (auto const &address : dataplane::groups(work, port, static_cast<std::size_t>(length))) {
      auto const group = *dataplane::group(work, port, address);
      list.push_back({{"address", address_text(address)},
                      {"version", group.version},
                      {"source_mode", described_choice(group.source_mode, kSourceModes)},
                      {"sources", described_each(group.sources, address_text)},
                      {"vni", group.vni},
                      {"observed", {{"updated", seconds(group.updated)}}}});
    }
  }
  return list;
}

// Bytes of what a member says whole are not repeated.
void describe_properties(Json &described, Transaction &work, PropertyOwner const &owner,
                         NamedProperties named, char const *under = "properties") {
  Json list = Json::object();
  for (auto const &[name, property] : store::properties_of(work, owner)) {
    auto const *const member = find_named(named, name);
    if (member == nullptr || !is_said_whole(described, *member, property)) {
      list[name] = {{"type", described_choice(property.type, kPropertyTypes)},
                    {"hex", hex_text(property.value)}};
    }
  }
  described[under] = std::move(list);
}

Json described_counters(Transaction &work, CounterOwner const &owner) {
  Json list = Json::object();
  for (auto const &[name, value] : dataplane::counters_of(work, owner)) {
    list[name] = value;
  }
  return list;
}

Json described_port(Transaction &work, store::Port const &port,
                    dataplane::Carriers const &carriers) {
  auto const owner = PropertyOwner::port(port.switch_key, port.number);
  Place const place{.switch_key = port.switch_key, .port = port.number};
  Json described{{"id", port.identifier}};
  if (auto const external = store::external_id_of(work, port.number); !external.empty()) {
    described["external_id"] = external;
  }
  describe_members(described, work, owner, named_of_port());
  described["addresses"] = described_addresses(work, place);
  described["groups"] = described_groups(work, port.number);
  described["counters"] =
      described_counters(work, {.switch_key = port.switch_key, .port = port.number});
  describe_properties(described, work, owner, named_of_port());
  Json observed{{"number", static_cast<std::uint32_t>(port.number)}};
  try {
    observed["uplink"] = carriers.required_of(port);
  } catch (Refused const &refused) {
    observed["uplink"] = nullptr;
    observed["why"] = refusal_text(refused);
  }
  described["observed"] = std::move(observed);
  return described;
}

Json described_uplink_port(Transaction &work, store::Port const &port) {
  auto const owner = owner_of(port);
  Json described{{"id", port.identifier}};
  describe_members(described, work, owner, named_of_uplink_port());
  if (auto const uplink = store::uplink_at(work, port.number)) {
    described["uplink"] = *uplink;
  }
  describe_properties(described, work, owner, named_of_uplink_port());
  return described;
}

Json described_uplink_ports(Transaction &work, store::SwitchKey key) {
  return described_each(store::uplink_ports_of(work, key),
                        [&](store::Port const &port) { return described_uplink_port(work, port); });
}

Json described_lag(Lag const &lag) {
  return {
      {"name", lag.name},
      {"uplinks", described_each(lag.members, [](auto const &member) { return member.uplink; })},
      {"observed", {{"id", lag.id}, {"up", lag.up()}}}};
}

Json described_ports(Transaction &work, store::SwitchKey key) {
  auto const own = dataplane::own_teamings(work, key);
  dataplane::Carriers const carriers(dataplane::team_of(work, key), own);
  Json list = Json::array();
  for (auto const &port : store::ports_of(work, key)) {
    if (port.kind == store::PortKind::client) {
      list.push_back(described_port(work, port, carriers));
    }
  }
  return list;
}

Json described_session_counters(Transaction &work, store::SwitchKey key) {
  Json sessions = Json::object();
  for (auto const &sid : dataplane::counting_sessions(work, key)) {
    sessions[sid] = described_counters(work, {.switch_key = key, .session = sid});
  }
  return sessions;
}

Json described_switch(Transaction &work, store::FoundSwitch const &known) {
  auto const &key = known.key;
  auto const &row = known.row;
  auto const owner = PropertyOwner::global(key);
  Json described{{"alias", row.alias},           {"id", row.identifier},
                 {"portset", row.portset},       {"max_ports", row.max_ports},
                 {"persistent", row.persistent}, {"version", row.version},
                 {"running", row.associated},    {"mtu", mtu_of(work, row.alias)}};
  described["uplink_ports"] = described_uplink_ports(work, key);
  described["uplinks"] =
      described_each(store::uplinks_of(work, key), [](auto const &uplink) { return uplink.name; });
  described["lags"] = described_each(dataplane::lags_of(work, key), described_lag);
  describe_members(described, work, owner, named_of_switch());
  described["ports"] = described_ports(work, key);
  described["addresses"] = described_addresses(work, {.switch_key = key, .port = std::nullopt});
  described["counters"] = described_counters(work, {.switch_key = key});
  described["mirror_counters"] = described_session_counters(work, key);
  describe_properties(described, work, owner, named_of_switch());
  describe_properties(described, work, PropertyOwner::host(key), {}, "host_properties");
  return described;
}

Json described_fault(WaitingFault const &waiting) {
  auto const &fault = waiting.fault;
  Json described{{"call", fault.function},
                 {"nth", fault.first},
                 {"times", fault.last == Fault::kForever ? 0 : fault.last - fault.first + 1}};
  if (fault.status != QEX_OK) {
    described["status"] = status_name(fault.status);
  }
  if (!fault.exception.empty()) {
    described["exception"] = fault.exception;
    described["message"] = fault.message;
  }
  if (fault.delay.count() > 0) {
    described["delay"] = seconds(fault.delay);
  }
  described["observed"] = {{"calls", waiting.seen}};
  return described;
}

Json described_runtime_options(Transaction &work) {
  Json list = Json::object();
  auto const options = runtime_options();
  for (unsigned type = 0; type < options.size(); ++type) {
    std::visit([&](auto const &value) { list[std::string(options[type].name)] = value; },
               runtime_option(work, type));
  }
  return list;
}

}  // namespace

Json described_host(Transaction &transaction) {
  Json host{
      {"clock",
       {{"stopped", clock_is_stopped(transaction)}, {"now", seconds(clock_now(transaction))}}}};
  host["uplinks"] = described_each(
      store::all_uplinks(transaction),
      [&](store::Uplink const &uplink) { return described_uplink(transaction, uplink); });
  host["runtime_options"] = described_runtime_options(transaction);
  auto const learning = global_mac_learning(transaction);
  host["mac_learning"] = {{"aging_time", qex_uint32{learning.agingTime}},
                          {"limit", qex_uint32{learning.macLimit}},
                          {"learn_static", learning.learnStatic != 0}};
  host["switches"] = described_each(
      store::all_switches(transaction),
      [&](store::FoundSwitch const &known) { return described_switch(transaction, known); });
  host["faults"] = described_each(waiting_faults(transaction), described_fault);
  return host;
}

std::string description(Transaction &transaction) {
  return described_host(transaction).dump(2, ' ', false, Json::error_handler_t::replace);
}

}  // namespace simhost::control
