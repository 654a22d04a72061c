// Reading and compiling one switch after the other.
#include "daemon/wanted.h"

#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <span>
#include <stdexcept>
#include <utility>

#include "base/ip_text.h"
#include "base/outcomes.h"
#include "model/options/runtime_options.h"
#include "model/properties/properties.h"
#include "model/teaming/properties.h"
#include "model/teaming/team.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/ways.h"
#include "planes/openvswitch/reading/read_network.h"
#include "storage/running/devices.h"
#include "storage/running/frames.h"
#include "storage/running/links.h"
#include "storage/running/readings.h"
#include "storage/store.h"
#include "vswitch/mcast_filter_modes.h"

namespace simhost::daemon {
namespace {

// As a bridge's, but for its last four digits, which are its own.
std::string tunnel_name(std::string const &bridge, std::uint16_t number) {
  return fmt::format("vt{}{:02x}", bridge.substr(2, 10), number & 0xFFU);
}

void add_devices(storage::Transaction &transaction, std::span<storage::PortDevice const> connected,
                 WantedBridge &bridge) {
  for (auto const &[port, device] : connected) {
    bridge.row.devices.emplace(device.name, device.number);
    bridge.ports.emplace(device.name, static_cast<std::uint32_t>(port));
    bridge.numbers.emplace(device.number, static_cast<std::uint32_t>(port));
  }
  for (auto const &uplink : storage::uplinks_of(transaction, bridge.key)) {
    if (auto const device = storage::device_of(transaction, uplink.name)) {
      bridge.row.devices.emplace(device->name, device->number);
      bridge.numbers.emplace(device->number, static_cast<std::uint32_t>(uplink.port));
    }
  }
}

// An address that no device has, the same as long as the bridge is.
std::string own_address(std::string_view bridge) {
  auto const hash = fingerprint(bridge);
  return fmt::format("02:{:02x}:{:02x}:{:02x}:{:02x}:{:02x}", hash >> 32U & 0xffU,
                     hash >> 24U & 0xffU, hash >> 16U & 0xffU, hash >> 8U & 0xffU, hash & 0xffU);
}

void add_lags(storage::Transaction &transaction, WantedBridge &bridge) {
  constexpr std::uint32_t kKeys = 0xffff;  // 1 to that
  for (auto const &lag : storage::all_lags(transaction, bridge.key)) {
    auto const id = static_cast<std::uint32_t>(lag.id);
    openvswitch::LagRow row{.devices = {},
                            .system = own_address(bridge.row.name),
                            .key = static_cast<std::uint16_t>((id - 1) % kKeys + 1),
                            .is_fast = lag.is_fast};
    for (auto const &uplink : lag.uplinks) {
      if (auto const device = storage::device_of(transaction, uplink)) {
        row.devices.insert(device->name);
      }
    }
    if (!row.devices.empty()) {
      bridge.row.lags.emplace(fmt::format("{}-lag{}", bridge.row.name, id), std::move(row));
    }
  }
}

void add_tunnels(storage::Transaction &transaction, WantedBridge &bridge) {
  bridge.fabric = storage::fabric_of(transaction, bridge.key);
  auto const uplink =
      bridge.fabric ? storage::find_uplink(transaction, bridge.fabric->uplink) : std::nullopt;
  if (!uplink || !uplink->port) {
    return;
  }
  auto const underlay = storage::underlay_of(transaction);
  bool const is_vxlan = bridge.fabric->encapsulation == storage::Encapsulation::vxlan;
  for (auto const &tunnel : bridge.fabric->tunnels) {
    openvswitch::TunnelRow row{.number = tunnel.number,
                               .type = is_vxlan ? "vxlan" : "geneve",
                               .options = {{"remote_ip", ip_text(tunnel.peer)},
                                           {"key", std::to_string(bridge.fabric->key)}}};
    if (underlay && underlay->address.size() == tunnel.peer.size()) {
      row.options.emplace("local_ip", ip_text(underlay->address));
    }
    bridge.row.tunnels.emplace(tunnel_name(bridge.row.name, tunnel.number), std::move(row));
    bridge.numbers.emplace(tunnel.number, static_cast<std::uint32_t>(*uplink->port));
  }
}

// Where copies are wrapped for collectors, whose addresses are those that each copy names. What
// comes back goes nowhere; by its key, which no switch shares, Open vSwitch knows the port.
void add_wrapping_ports(storage::Transaction &transaction, openvswitch::Network const &network,
                        WantedBridge &bridge) {
  auto const underlay = storage::underlay_of(transaction);
  std::map<std::string, std::string> options{
      {"remote_ip", "flow"},
      {"in_key", std::to_string(static_cast<std::int64_t>(bridge.key))},
      {"out_key", "flow"}};
  bool const is_ipv6 = underlay && underlay->address.size() == sizeof(openflow::Ipv6Address);
  if (underlay) {
    options.emplace("local_ip", ip_text(underlay->address));
  }
  auto const add = [&](std::uint16_t number, std::string const &type) {
    bridge.row.tunnels.insert_or_assign(
        tunnel_name(bridge.row.name, number),
        openvswitch::TunnelRow{.number = number, .type = type, .options = options});
  };
  for (auto const &mirror : network.mirrors) {
    if (!mirror.collectors.empty() && mirror.wrapping == openvswitch::Wrapping::gre) {
      add(openvswitch::kGrePort, is_ipv6 ? "ip6gre" : "gre");
    }
  }
  for (auto const *option : {"erspan_ver", "erspan_idx", "erspan_dir", "erspan_hwid"}) {
    options.emplace(option, "flow");
  }
  for (auto const &mirror : network.mirrors) {
    if (!mirror.collectors.empty() && mirror.wrapping != openvswitch::Wrapping::gre) {
      add(openvswitch::kErspanPort, is_ipv6 ? "ip6erspan" : "erspan");
    }
  }
}

std::optional<WantedUnderlay> wanted_underlay(storage::Transaction &transaction,
                                              std::string_view host, std::string const &datapath,
                                              IsThere const &is_there) {
  auto const underlay = storage::underlay_of(transaction);
  if (!underlay || !is_there(underlay->device)) {
    return std::nullopt;
  }
  // One with another address is another one, so that none is left over.
  auto const what = fmt::format(
      "{}/{}/{}/{}/{}", host, underlay->device, ip_text(underlay->address), underlay->prefix,
      underlay->gateway.empty() ? std::string() : ip_text(underlay->gateway));
  constexpr std::uint16_t kItsDevice = 1;
  auto const name = fmt::format("vu{:012x}", fingerprint(what) >> 16U);
  // Frames for the device itself the kernel would take for its own.
  return WantedUnderlay{.row = {.name = name,
                                .datapath = datapath,
                                .devices = {{underlay->device, kItsDevice}},
                                .is_underlay = true,
                                .address = own_address(name)},
                        .address = *underlay};
}

teaming::Team team_with_devices(storage::Transaction &transaction, storage::SwitchKey key) {
  return teaming::team_of(transaction, key,
                          [](storage::Transaction &from, std::string_view uplink) {
                            auto link = storage::find_link(from, uplink).value_or(storage::Link{});
                            // Whatever stands in for its wires, no frame comes or goes.
                            link.carrier = link.carrier && storage::carries_frames(from, uplink);
                            return link;
                          });
}

// Only that of a client that was given one can be another than it should be.
openvswitch::Observed observed_at(std::span<storage::PortDevice const> connected,
                                  AddressAt const &address_at) {
  openvswitch::Observed observed;
  for (auto const &[port, device] : connected) {
    if (auto const seen = device.mac ? address_at(device.name) : std::nullopt) {
      observed.addresses.emplace(port, *seen);
    }
  }
  return observed;
}

bool notifies(VSTeamPolicy const &policy) {
  return (policy.flags & TEAM_FRP_FLAG_NOTIFY_SWITCH) != 0;
}

// Of what may carry a frame of a port: where a team looks into frames, any in use.
template <typename Value>
std::vector<Value> in_use(openvswitch::Way const &way, std::vector<Value> const &of_slots) {
  return way.spreads_frames() ? of_slots : std::vector<Value>{of_slots.front()};
}

std::vector<std::uint32_t> links_of(openvswitch::Way const *way) {
  return way == nullptr ? std::vector<std::uint32_t>() : in_use(*way, way->links);
}

// Where there is nothing to choose, links are not looked at.
std::vector<openvswitch::Slot> chosen_slots(openvswitch::Way const *way) {
  return way == nullptr || way->is_single() ? std::vector<openvswitch::Slot>()
                                            : in_use(*way, way->slots);
}

bool gets_out(openvswitch::Port const &port) {
  return openvswitch::sends_frames(port) && !openvswitch::is_closed(port);
}

void add_carried(storage::Transaction &transaction, openvswitch::Network const &network,
                 VSTeamPolicy const &shared, WantedBridge &bridge) {
  std::map<std::uint32_t, bool> own;
  for (auto const &[port, bytes] : list_stored_at_ports(transaction, teaming::policy, bridge.key)) {
    own[static_cast<std::uint32_t>(port)] = notifies(Codec<VSTeamPolicy>::value(bytes));
  }
  openvswitch::Ways const ways(network);
  std::map<std::uint32_t, std::string> devices;
  for (auto const &[device, number] : bridge.ports) {
    devices[number] = device;
  }
  for (auto const &port : network.ports) {
    auto const set = own.find(port.number);
    auto const *const way = gets_out(port) ? ways.of(port) : nullptr;
    bridge.carried.push_back(
        {.number = port.number,
         .device = devices[port.number],
         .links = links_of(way),
         .slots = chosen_slots(way),
         .is_announced = set == own.end() ? notifies(shared) : set->second,
         .client = {.port = port.port,
                    .number = port.number,
                    .address = port.address.value_or(openflow::EthernetAddress{}),
                    .vlan = port.vlan.vlan},
         .vlan = port.vlan});
  }
}

int mode_of(openvswitch::Multicast const &multicast) {
  if (multicast.hears_igmp) {
    return multicast.hears_mld ? VS_MCAST_FILTER_MODE_SNOOPING : VS_MCAST_FILTER_MODE_IGMP;
  }
  return multicast.hears_mld ? VS_MCAST_FILTER_MODE_MLD : VS_MCAST_FILTER_MODE_LEGACY;
}

void shorten(std::optional<ClockTime> &lasts, std::optional<ClockTime> const &other) {
  if (other) {
    lasts = std::min(lasts.value_or(*other), *other);
  }
}

openvswitch::CountedSessions sessions_of(openvswitch::Network const &network) {
  openvswitch::CountedSessions sessions;
  for (auto const &mirror : network.mirrors) {
    auto const failed = static_cast<std::size_t>(
        std::ranges::count(mirror.collectors, false, &openvswitch::Collector::is_reached));
    sessions[mirror.id] = {.sid = mirror.sid,
                           .copies = mirror.to_ports.size() + mirror.to_uplinks.size() +
                                     mirror.collectors.size() - failed,
                           .failed = failed};
  }
  return sessions;
}

}  // namespace

Unfit unfit(WantedBridge const &bridge, std::exception const &why) {
  return {.key = bridge.key, .alias = bridge.alias, .bridge = bridge.row.name, .why = why.what()};
}

void Wanted::leave_out(std::vector<Unfit> const &refused) {
  std::erase_if(bridges, [&](WantedBridge const &bridge) {
    return std::ranges::find(refused, bridge.key, &Unfit::key) != refused.end();
  });
  unfit.insert(unfit.end(), refused.begin(), refused.end());
}

// Linux has room for fifteen bytes, and an alias may change.
std::string bridge_name(std::string_view host, std::string const &identifier) {
  auto const whole = fingerprint(fmt::format("{}/{}", host, identifier));
  return fmt::format("vs{:012x}", whole >> 16U);
}

std::uint64_t fingerprint(std::string_view text) {
  // FNV-1a.
  std::uint64_t hash = 0xcbf29ce484222325;
  for (auto const character : text) {
    hash = (hash ^ static_cast<unsigned char>(character)) * 0x100000001b3;
  }
  return hash;
}

Wanted wanted_of(storage::Transaction &transaction, std::string_view host,
                 std::string const &datapath, IsThere const &is_there, AddressAt const &address_at,
                 Compiler &compiler, Complete const &complete) {
  compiler.begin();
  Wanted wanted;
  wanted.change = storage::frames_change(transaction).value_or(0);
  wanted.most_announced =
      static_cast<std::uint32_t>(runtime_number(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL));
  wanted.announced_for =
      std::chrono::seconds(runtime_number(transaction, VS_RT_OPT_RARP_ADVERTISEMENT_DURATION));
  wanted.underlay = wanted_underlay(transaction, host, datapath, is_there);
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    wanted.switches.insert(key);
    WantedBridge bridge{.key = key,
                        .alias = row.alias,
                        .row = {.name = bridge_name(host, row.identifier), .datapath = datapath},
                        .ports = {},
                        .numbers = {},
                        .sessions = {},
                        .aging = {},
                        .flows = {}};
    auto const connected = storage::port_devices(transaction, key);
    add_devices(transaction, connected, bridge);
    add_lags(transaction, bridge);
    add_tunnels(transaction, bridge);
    if (!row.associated || bridge.row.devices.empty()) {
      continue;
    }
    try {
      auto const team = team_with_devices(transaction, key);
      auto read = openvswitch::read_network(transaction, key, team, connected,
                                            observed_at(connected, address_at));
      complete(key, read);
      auto const &[network, flows] = compiler.compile(key, std::move(read));
      bridge.flows = flows;
      add_carried(transaction, network, team.policy, bridge);
      bridge.sessions = sessions_of(network);
      add_wrapping_ports(transaction, network, bridge);
      bridge.aging = std::chrono::seconds(network.addresses.aging);
      bridge.mtu = network.mtu;
      bridge.multicast_mode = mode_of(network.multicast);
      std::erase_if(bridge.row.devices,
                    [&](auto const &device) { return !is_there(device.first); });
      bridge.row.limits = {{openvswitch::table::kLearnedAddresses, flows->rows.most_learned}};
      wanted.most_tags = std::max(wanted.most_tags, flows->rows.most_tags);
      bridge.forgets = !storage::has_readings(transaction, key);
      shorten(wanted.lasts, teaming::until_next_settles(team));
      wanted.bridges.push_back(std::move(bridge));
    } catch (Refused const &refused) {
      wanted.unfit.push_back(unfit(bridge, refused));
    } catch (std::runtime_error const &) {
      throw;  // of the state, which is all switches'
    } catch (std::exception const &error) {
      // What is wrong here with one of them is no reason to stop the others.
      wanted.unfit.push_back(unfit(bridge, error));
    }
  }
  return wanted;
}

}  // namespace simhost::daemon
