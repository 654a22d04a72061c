// From the host to a document.
#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <utility>

#include "control/policy_documents.h"
#include "control/scenario.h"
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
#include "qexapi/switch_properties.h"
#include "store/store.h"
#include "vswitch/properties.h"

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

// The keys of a description that have a meaning of their own are not repeated as raw bytes.
template <typename Record>
void describe_record(Json &described, std::string_view name, Transaction &work,
                     PropertyOwner const &owner, char const *key) {
  if (auto const property = get_property(work, owner, key)) {
    described[std::string(name)] = control::described(record_of<Record>(property->value));
  }
}

bool is_described_by_name(std::string_view key) {
  constexpr std::array<std::string_view, 8> kKeys{
      VSPROP_MTU,
      VSPROP_SWITCH_TEAMING,
      VSPROP_SWITCH_MAC_LEARNING,
      VSPROP_MULTICAST_FILTER,
      VSPROP_PORT_TEAMING_POLICY,
      VSPROP_PORT_TEAMING_OVERRIDE,
      VSPROP_PORT_MAC_MANAGEMENT,
      VSPROP_PORT_MIRROR_SESSIONS,
  };
  return std::find(kKeys.begin(), kKeys.end(), key) != kKeys.end();
}

void describe_properties(Json &described, Transaction &work, PropertyOwner const &owner,
                         char const *under = "properties") {
  Json list = Json::object();
  for (auto const &[name, property] : store::properties_of(work, owner)) {
    if (!is_described_by_name(name)) {
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
  describe_record<VSTeamPolicy>(described, "teaming", work, owner, VSPROP_PORT_TEAMING_POLICY);
  if (auto const bound = get_property(work, owner, VSPROP_PORT_TEAMING_OVERRIDE)) {
    described["uplink"] = text_of(bound->value);
  }
  describe_record<VSPMACManagement>(described, "mac_learning", work, owner,
                                    VSPROP_PORT_MAC_MANAGEMENT);
  if (auto const table = get_property(work, owner, VSPROP_PORT_MIRROR_SESSIONS)) {
    described["mirror_sessions"] = described_mirror_sessions(table->value);
  }
  described["addresses"] = described_addresses(work, place);
  described["groups"] = described_groups(work, port.number);
  described["counters"] =
      described_counters(work, {.switch_key = port.switch_key, .port = port.number});
  describe_properties(described, work, owner);
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
  Json described{{"id", port.identifier}};
  if (auto const name = alias_of(work, port)) {
    described["name"] = *name;
  }
  if (auto const uplink = store::uplink_at(work, port.number)) {
    described["uplink"] = *uplink;
  }
  describe_properties(described, work, PropertyOwner::port(port.switch_key, port.number));
  // It is the name.
  described["properties"].erase(QEX_NEBPROP_PORT_ALIAS);
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
  describe_record<VSTeamPolicy>(described, "teaming", work, owner, VSPROP_SWITCH_TEAMING);
  describe_record<VSMACLearning>(described, "mac_learning", work, owner,
                                 VSPROP_SWITCH_MAC_LEARNING);
  if (auto const mode = get_property(work, owner, VSPROP_MULTICAST_FILTER)) {
    described["multicast"] = described_choice(record_of<std::uint32_t>(mode->value), kFilterModes);
  }
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
  describe_properties(described, work, owner);
  describe_properties(described, work, PropertyOwner::host(key), "host_properties");
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
