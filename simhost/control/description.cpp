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

Json described_addresses(Transaction &work, Place const &place) {
  Json list = Json::array();
  for (auto const &entry : dataplane::addresses(work, place, VS_MAC_ADDR_TYPE_ALL)) {
    VSMACAddrType const type = entry.macAddrType;
    list.push_back({{"mac", mac_text(std::as_bytes(std::span(entry.macAddress)))},
                    {"vlan", qex_VlanID{entry.vid}},
                    {"vni", qex_uint32{entry.vni}},
                    {"type", described_choice(type, kAddressTypes)},
                    {"ages", entry.aging != 0},
                    {"age", qex_uint32{entry.elapsed}}});
  }
  return list;
}

Json described_groups(Transaction &work, store::PortNumber port) {
  Json list = Json::array();
  for (auto const length : {6, 4, 16}) {
    for (auto const &address : dataplane::groups(work, port, static_cast<std::size_t>(length))) {
      auto const group = *dataplane::group(work, port, address);
      Json sources = Json::array();
      for (auto const &source : group.sources) {
        sources.push_back(address_text(source));
      }
      list.push_back({{"address", address_text(address)},
                      {"version", group.version},
                      {"source_mode", described_choice(group.source_mode, kSourceModes)},
                      {"sources", sources},
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
  Json uplink_ports = Json::array();
  for (auto const &port : store::uplink_ports_of(work, key)) {
    uplink_ports.push_back(described_uplink_port(work, port));
  }
  described["uplink_ports"] = std::move(uplink_ports);
  Json uplinks = Json::array();
  for (auto const &uplink : store::uplinks_of(work, key)) {
    uplinks.push_back(uplink.name);
  }
  described["uplinks"] = std::move(uplinks);
  Json lags = Json::array();
  for (auto const &lag : dataplane::lags_of(work, key)) {
    Json members = Json::array();
    for (auto const &member : lag.members) {
      members.push_back(member.uplink);
    }
    lags.push_back({{"name", lag.name},
                    {"uplinks", members},
                    {"observed", {{"id", lag.id}, {"up", lag.up()}}}});
  }
  described["lags"] = std::move(lags);
  describe_members(described, work, owner, named_of_switch());
  Json ports = Json::array();
  auto const own = dataplane::own_teamings(work, key);
  dataplane::Carriers const carriers(dataplane::team_of(work, key), own);
  for (auto const &port : store::ports_of(work, key)) {
    if (port.kind == store::PortKind::client) {
      ports.push_back(described_port(work, port, carriers));
    }
  }
  described["ports"] = std::move(ports);
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
  Json uplinks = Json::array();
  for (auto const &uplink : store::all_uplinks(transaction)) {
    uplinks.push_back(described_uplink(transaction, uplink));
  }
  host["uplinks"] = std::move(uplinks);
  host["runtime_options"] = described_runtime_options(transaction);
  auto const learning = global_mac_learning(transaction);
  host["mac_learning"] = {{"aging_time", qex_uint32{learning.agingTime}},
                          {"limit", qex_uint32{learning.macLimit}},
                          {"learn_static", learning.learnStatic != 0}};
  Json switches = Json::array();
  for (auto const &known : store::all_switches(transaction)) {
    switches.push_back(described_switch(transaction, known));
  }
  host["switches"] = std::move(switches);
  Json faults = Json::array();
  for (auto const &waiting : waiting_faults(transaction)) {
    faults.push_back(described_fault(waiting));
  }
  host["faults"] = std::move(faults);
  return host;
}

std::string description(Transaction &transaction) {
  return described_host(transaction).dump(2, ' ', false, Json::error_handler_t::replace);
}

}  // namespace simhost::control
