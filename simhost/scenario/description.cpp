// From the host to a document.
#include <span>
#include <string>
#include <utility>

#include "base/outcomes.h"
#include "clock/clock.h"
#include "faults/faults.h"
#include "model/lookup.h"
#include "model/options/host_settings.h"
#include "model/options/runtime_options.h"
#include "model/plane.h"
#include "model/switches/switches.h"
#include "model/uplinks/lags.h"
#include "scenario/forms.h"
#include "scenario/keys.h"
#include "scenario/members.h"
#include "scenario/scenario.h"
#include "scenario/scenario_fabric.h"
#include "scenario/settings.h"
#include "scenario/texts.h"
#include "storage/running/devices.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::scenario {
namespace {

using storage::PropertyOwner;
using storage::Transaction;

template <typename Range, typename Describe>
Json each_to_json(Range const &range, Describe const &describe) {
  Json list = Json::array();
  for (auto const &item : range) {
    list.push_back(describe(item));
  }
  return list;
}

double seconds(ClockTime time) {
  return static_cast<double>(time.count()) / 1000;
}

Json uplink_to_json(Transaction &transaction, storage::Uplink const &uplink) {
  Json described{{kName, uplink.name}};
  Json observed = Json::object();
  auto const device = storage::device_of(transaction, uplink.name);
  if (device) {
    described[keys::device] = device->name;
  }
  if (auto *const wires = running_plane().find_wires()) {
    auto const link = wires->link_of(transaction, uplink.name);
    add_members(device ? observed : described, kLinkMembers, &link);
  }
  if (uplink.port) {
    auto const port = get_port(transaction, *uplink.port);
    observed["switch"] = storage::get_switch_row(transaction, port.switch_key).row.alias;
    observed["port"] = port.identifier;
  }
  if (!observed.empty()) {
    described[std::string(kObserved)] = std::move(observed);
  }
  return described;
}

// Those of fabrics are made with them.
Json uplinks_to_json(Transaction &transaction) {
  auto wires = storage::all_uplinks(transaction);
  std::erase_if(wires, [&](auto const &uplink) {
    return storage::fabric_of(transaction, uplink.name).has_value();
  });
  return each_to_json(
      wires, [&](storage::Uplink const &uplink) { return uplink_to_json(transaction, uplink); });
}

// What the members of an object say.
template <typename Object>
Json object_to_json(std::span<Member const> members, Object const &object) {
  Json said = Json::object();
  add_members(said, members, &object);
  return said;
}

Json addresses_to_json(Transaction &transaction, Place const &place, VSMACAddrType type) {
  return each_to_json(
      running_plane().addresses(transaction, place, type),
      [](VSMACEntry const &entry) { return object_to_json(kAddressMembers, entry); });
}

// A host is described also while nobody can tell what it has learned.
void describe_addresses(Json &described, Transaction &transaction, Place const &place) {
  auto &list = described[keys::addresses];
  try {
    list = addresses_to_json(transaction, place, VS_MAC_ADDR_TYPE_ALL);
  } catch (Refused const &refused) {
    list = addresses_to_json(transaction, place, VS_MAC_ADDR_TYPE_STATIC);
    auto const more = addresses_to_json(transaction, place, VS_MAC_ADDR_TYPE_USER);
    list.insert(list.end(), more.begin(), more.end());
    described[std::string(kObserved)]["not_learned"] = refusal_text(refused);
  }
}

Json groups_to_json(Transaction &transaction, storage::PortNumber port) {
  Json list = Json::array();
  for (auto const length : {6, 4, 16}) {
    for (auto const &address :
         running_plane().groups(transaction, port, static_cast<std::size_t>(length))) {
      // The port may have left it since.
      if (auto const group = running_plane().group(transaction, port, address)) {
        auto described = object_to_json(kGroupMembers, *group);
        described[std::string(kObserved)] = {{"updated", seconds(group->updated)}};
        list.push_back(std::move(described));
      }
    }
  }
  return list;
}

// Likewise while nobody can tell what its clients joined.
void describe_groups(Json &described, Transaction &transaction, storage::PortNumber port) {
  try {
    described[keys::groups] = groups_to_json(transaction, port);
  } catch (Refused const &refused) {
    described[keys::groups] = Json::array();
    described[std::string(kObserved)]["not_joined"] = refusal_text(refused);
  }
}

Json counters_to_json(Transaction &transaction, CounterOwner const &owner) {
  Json list = Json::object();
  for (auto const &[name, value] : running_plane().counters(transaction, owner)) {
    list[std::string(name)] = value;
  }
  return list;
}

Json device_to_json(storage::Device const &device) {
  DeviceMembers const members{.name = device.name,
                              .mac = device.mac ? mac_text(*device.mac) : std::string()};
  return to_json(kPortDevice, &members);
}

Json port_to_json(Transaction &transaction, storage::Port const &port) {
  auto const owner = PropertyOwner::port(port.switch_key, port.number);
  Place const place{.switch_key = port.switch_key, .port = port.number};
  auto described = object_to_json(
      kPortMembers, PortMembers{.id = port.identifier,
                                .external_id = storage::external_id_of(transaction, port.number)});
  describe_named(described, transaction, owner, SettingOwner::of_port);
  if (auto const device = storage::device_of(transaction, port.number)) {
    described[keys::device] = device_to_json(*device);
  }
  describe_addresses(described, transaction, place);
  describe_groups(described, transaction, port.number);
  described[keys::counters] =
      counters_to_json(transaction, {.switch_key = port.switch_key, .port = port.number});
  describe_raw(described, transaction, owner, SettingOwner::of_port);
  auto &observed = described[std::string(kObserved)];
  observed["number"] = static_cast<std::uint32_t>(port.number);
  try {
    observed["uplink"] = running_plane().team_uplink(transaction, port);
  } catch (Refused const &refused) {
    observed["uplink"] = nullptr;
    observed["why"] = refusal_text(refused);
  }
  return described;
}

Json uplink_port_to_json(Transaction &transaction, storage::Port const &port) {
  auto const owner = owner_of(port);
  auto described = object_to_json(
      kUplinkPortMembers,
      UplinkPortMembers{.id = port.identifier,
                        .uplink = storage::uplink_at(transaction, port.number).value_or("")});
  describe_named(described, transaction, owner, SettingOwner::of_uplink_port);
  describe_raw(described, transaction, owner, SettingOwner::of_uplink_port);
  return described;
}

Json uplink_ports_to_json(Transaction &transaction, storage::SwitchKey key) {
  return each_to_json(storage::uplink_ports_of(transaction, key), [&](storage::Port const &port) {
    return uplink_port_to_json(transaction, port);
  });
}

Json lag_to_json(Lag const &lag) {
  LagMembers members{
      .name = lag.name, .uplinks = {}, .is_fast = static_cast<std::uint8_t>(lag.is_fast)};
  for (auto const &member : lag.members) {
    members.uplinks.push_back(member.uplink);
  }
  auto described = object_to_json(kLagMembers, members);
  described[std::string(kObserved)] = {{"id", lag.id}, {"up", lag.up()}};
  return described;
}

Json ports_to_json(Transaction &transaction, storage::SwitchKey key) {
  Json list = Json::array();
  for (auto const &port : storage::ports_of(transaction, key)) {
    if (port.kind == storage::PortKind::client) {
      list.push_back(port_to_json(transaction, port));
    }
  }
  return list;
}

Json session_counters_to_json(Transaction &transaction, storage::SwitchKey key) {
  Json sessions = Json::object();
  for (auto const &sid : running_plane().counting_sessions(transaction, key)) {
    sessions[sid] = counters_to_json(transaction, {.switch_key = key, .session = sid});
  }
  return sessions;
}

Json switch_to_json(Transaction &transaction, storage::FoundSwitch const &known) {
  auto const &key = known.key;
  auto const owner = PropertyOwner::global(key);
  auto described = object_to_json(kSwitchMembers, known.row);
  if (auto const fabric = storage::fabric_of(transaction, key)) {
    described[keys::fabric] = to_json(*fabric);
  }
  described[keys::uplink_ports] = uplink_ports_to_json(transaction, key);
  described[keys::uplinks] = each_to_json(storage::uplinks_of(transaction, key),
                                          [](auto const &uplink) { return uplink.name; });
  described[keys::lags] = each_to_json(lags_of(transaction, key), lag_to_json);
  describe_named(described, transaction, owner, SettingOwner::of_switch);
  described[keys::ports] = ports_to_json(transaction, key);
  describe_addresses(described, transaction, {.switch_key = key, .port = std::nullopt});
  described[keys::counters] = counters_to_json(transaction, {.switch_key = key});
  described[keys::mirror_counters] = session_counters_to_json(transaction, key);
  describe_raw(described, transaction, owner, SettingOwner::of_switch);
  describe_raw(described, transaction, PropertyOwner::host(key), SettingOwner::of_host,
               keys::host_properties);
  return described;
}

Json fault_to_json(WaitingFault const &waiting) {
  auto const &fault = waiting.fault;
  auto described = object_to_json(
      kFaultMembers,
      FaultMembers{.call = fault.function,
                   .nth = fault.first,
                   .times = fault.last == Fault::kForever ? 0 : fault.last - fault.first + 1,
                   .status = fault.status == QEX_OK ? "" : status_name(fault.status),
                   .exception = fault.exception,
                   .message = fault.message,
                   .delay = fault.delay.count()});
  described[std::string(kObserved)] = {{"calls", waiting.seen}};
  return described;
}

Json runtime_options_to_json(Transaction &transaction) {
  Json list = Json::object();
  auto const options = runtime_options();
  for (unsigned type = 0; type < options.size(); ++type) {
    std::visit([&](auto const &value) { list[std::string(options[type].name)] = value; },
               runtime_option(transaction, type));
  }
  return list;
}

}  // namespace

Json host_to_json(Transaction &transaction) {
  Json host{{keys::clock, object_to_json(kClockMembers, clock_members(transaction))}};
  if (auto const underlay = storage::underlay_of(transaction)) {
    host[keys::underlay] = to_json(*underlay);
  }
  host[keys::uplinks] = uplinks_to_json(transaction);
  host[keys::runtime_options] = runtime_options_to_json(transaction);
  host[keys::mac_learning] =
      object_to_json(kGlobalLearningMembers, global_mac_learning(transaction));
  host[keys::switches] = each_to_json(
      storage::all_switches(transaction),
      [&](storage::FoundSwitch const &known) { return switch_to_json(transaction, known); });
  host[keys::faults] = each_to_json(waiting_faults(transaction), fault_to_json);
  return host;
}

std::string description(Transaction &transaction) {
  return host_to_json(transaction).dump(2, ' ', false, Json::error_handler_t::replace);
}

}  // namespace simhost::scenario
