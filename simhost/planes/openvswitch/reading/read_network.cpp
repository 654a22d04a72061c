// Reading what the model knows, all ports of a switch at once.
#include "planes/openvswitch/reading/read_network.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <string>
#include <unordered_map>
#include <utility>

#include "model/mac/learning.h"
#include "model/mac/properties.h"
#include "model/mirror/running.h"
#include "model/multicast/properties.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "model/security/properties.h"
#include "model/switches/properties.h"
#include "model/teaming/properties.h"
#include "model/vlans/properties.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/compile/ways.h"
#include "planes/openvswitch/reading/read_mirrors.h"
#include "storage/ports.h"
#include "storage/running/addresses.h"
#include "storage/running/devices.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::openvswitch {
namespace {

static_assert(storage::kFirstTunnel == kFirstTunnel && storage::kMostTunnels == 1U << kTunnelBits);

template <typename Bytes>
EthernetAddress address_of(Bytes const &bytes) {
  EthernetAddress address{};
  static_assert(sizeof bytes == sizeof address);
  std::memcpy(address.data(), &bytes, sizeof address);
  return address;
}

// A setting of the ports that have one.
template <typename Value>
class OfPorts {
 public:
  OfPorts(storage::Transaction &transaction, storage::SwitchKey key,
          Property<Value> const &property)
      : unset_(property.default_value()) {
    for (auto const &[port, bytes] : list_stored_at_ports(transaction, property, key)) {
      values_.emplace(port, Codec<Value>::value(bytes));
    }
  }

  [[nodiscard]] Value const *find(storage::PortNumber port) const {
    auto const found = values_.find(port);
    return found == values_.end() ? nullptr : &found->second;
  }
  [[nodiscard]] Value const &of(storage::PortNumber port) const {
    auto const *found = find(port);
    return found == nullptr ? unset_ : *found;
  }

 private:
  std::unordered_map<storage::PortNumber, Value> values_;
  Value unset_;
};

struct Settings {
  Settings(storage::Transaction &transaction, storage::SwitchKey key)
      : vlans(transaction, key, vlans::of_port),
        priorities(transaction, key, vlans::priority),
        nested(transaction, key, vlans::nested_tag),
        blocked(transaction, key, ports::blocked),
        forbidden(transaction, key, security::forbids),
        management(transaction, key, mac::management),
        filters(transaction, key, mac::ethernet_filter),
        transmit_uplink(transaction, key, teaming::transmit_uplink),
        policies(transaction, key, teaming::policy),
        bound(transaction, key, teaming::bound_uplink) {}

  OfPorts<vlans::PortVlans> vlans;
  OfPorts<std::int32_t> priorities;
  OfPorts<qex_Bool> nested;
  OfPorts<qex_Bool> blocked;
  OfPorts<VSPropSecurity> forbidden;
  OfPorts<VSPMACManagement> management;
  OfPorts<VSExtraEthFilter> filters;
  OfPorts<qex_Bool> transmit_uplink;
  OfPorts<VSTeamPolicy> policies;
  OfPorts<std::string> bound;
};

PortVlan vlan_of(Settings const &settings, storage::PortNumber number) {
  auto const &set = settings.vlans.of(number);
  PortVlan vlan;
  vlan.vlan = set.vlan;
  vlan.must_be_private = set.private_vlan;
  vlan.nested = settings.nested.of(number) != 0;
  if (auto const priority = settings.priorities.of(number); priority != vlans::kNoPriority) {
    vlan.priority = static_cast<std::uint8_t>(priority);
  }
  if (set.private_vlan || (!set.guest_tagging && set.ranges.empty())) {
    return vlan;
  }
  vlan.carried.emplace();
  if (set.ranges.empty()) {
    vlan.carried->set();
  }
  for (auto const &range : set.ranges) {
    for (unsigned carried = range.minVID; carried <= range.maxVID; ++carried) {
      vlan.carried->set(carried);
    }
  }
  return vlan;
}

bool forbids(Settings const &settings, storage::PortNumber number, std::uint32_t what) {
  return (settings.forbidden.of(number).flags & what) != 0;
}

void read_address(Settings const &settings, storage::PortDevice const &connected,
                  Observed const &observed, Port &port) {
  if (connected.device.mac) {
    port.address = address_of(*connected.device.mac);
  }
  auto const number = connected.port;
  auto const *management = settings.management.find(number);
  bool const may_change = !forbids(settings, number, VSPORT_SECURITY_DISALLOW_MAC_CHANGE) &&
                          (management == nullptr || management->macChangeAllowed != 0);
  if (auto const seen = observed.addresses.find(number); seen != observed.addresses.end()) {
    port.address_changed = !may_change && port.address && seen->second != port.address;
    port.address = seen->second;
  }
  port.may_forge = !forbids(settings, number, VSPORT_SECURITY_DISALLOW_FORGED_SRC);
}

void read_learning(VSPMACLearning const &set, Port &port) {
  port.floods = set.flooding != 0;
  if (set.learning != 0) {
    port.learning = Learning{
        .limit = set.macLimit,
        .when_full = set.macLimitPolicy == VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP ? WhenFull::drop
                                                                                 : WhenFull::allow};
  }
}

// Places of a hash are addresses that are asked for one by one.
std::vector<EthernetAddress> asked_groups(VSExtraEthFilter const &filter) {
  std::vector<EthernetAddress> asked;
  for (std::size_t at = 0; at < filter.numMulticastAddrs; ++at) {
    asked.push_back(address_of(filter.multicastAddrs[at]));
  }
  return asked;
}

void read_filter(Settings const &settings, storage::PortNumber number, Port &port) {
  auto const &filter = settings.filters.of(number);
  auto const flags = filter.flags;
  port.takes_all_groups = (flags & QEX_ETH_FILTER_ALLMULTI) != 0;
  if (!port.takes_all_groups &&
      (flags & (QEX_ETH_FILTER_MULTICAST | QEX_ETH_FILTER_USE_LADRF)) != 0) {
    port.asked_groups = asked_groups(filter);
  }
  port.is_sink = (flags & QEX_ETH_FILTER_SINK) != 0;
  port.promiscuous = (flags & QEX_ETH_FILTER_PROMISC) != 0 &&
                     !forbids(settings, number, VSPORT_SECURITY_DISALLOW_PROMISC);
}

class Reader {
 public:
  Reader(storage::Transaction &transaction, storage::SwitchKey key, teaming::Team const &team,
         std::span<storage::PortDevice const> connected, Observed const &observed)
      : transaction_(transaction),
        key_(key),
        team_(team),
        connected_(connected),
        observed_(observed) {}

  Network read() {
    read_switch();
    read_uplinks();
    read_ports();
    read_promiscuous();
    read_fixed_addresses();
    read_mirrors(transaction_, key_, network_);
    return std::move(network_);
  }

 private:
  void read_switch() {
    auto const owner = storage::PropertyOwner::global(key_);
    network_.disabled = effective(transaction_, switches::disabled, owner) != 0;
    network_.mtu = static_cast<std::uint16_t>(effective(transaction_, switches::mtu, owner));
    for (auto const &entry : effective(transaction_, vlans::private_vlans, owner)) {
      network_.private_vlans.push_back({.primary = entry.primaryVID,
                                        .secondary = entry.secondaryVID,
                                        .kind = static_cast<PrivateKind>(entry.pvlanType)});
    }
    auto const mode = effective(transaction_, multicast::filter_mode, owner);
    network_.multicast = {
        .hears_igmp = mode == VS_MCAST_FILTER_MODE_SNOOPING || mode == VS_MCAST_FILTER_MODE_IGMP,
        .hears_mld = mode == VS_MCAST_FILTER_MODE_SNOOPING || mode == VS_MCAST_FILTER_MODE_MLD,
        .groups = observed_.groups};
    auto const learning = mac::learning_of(transaction_, key_);
    network_.addresses = {.aging = learning.agingTime,
                          .limit = learning.macLimit,
                          .uplink_limit = TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT,
                          .fixed_ones_move = learning.learnStatic != 0};
  }

  void read_uplinks() {
    fabric_ = storage::fabric_of(transaction_, key_);
    for (auto const &[name, number] : storage::uplinks_of(transaction_, key_)) {
      auto const owner = storage::PropertyOwner::port(key_, number);
      for (auto const port : ports_of(name)) {
        network_.uplinks.push_back({.port = port,
                                    .number = static_cast<std::uint32_t>(number),
                                    .blocked = effective(transaction_, ports::blocked, owner) != 0,
                                    .lag = lag_of(name),
                                    .has_partner = has_partner(name)});
      }
    }
  }

  // Numbered within the switch.
  [[nodiscard]] std::uint32_t lag_of(std::string const &uplink) const {
    for (std::size_t at = 0; at < team_.lags.size(); ++at) {
      if (std::ranges::find(team_.lags[at].uplinks, uplink) != team_.lags[at].uplinks.end()) {
        return static_cast<std::uint32_t>(at + 1);
      }
    }
    return 0;
  }

  [[nodiscard]] bool has_partner(std::string const &uplink) const {
    return std::ranges::any_of(team_.uplinks, [&](teaming::TeamUplink const &one) {
      return one.name == uplink && one.aggregated && teaming::would_aggregate(one.link);
    });
  }

  void read_ports() {
    Settings const settings(transaction_, key_);
    add_team(team_.policy);
    network_.ports.reserve(connected_.size());
    for (auto const &connected : connected_) {
      read_port(settings, connected);
    }
  }

  void read_port(Settings const &settings, storage::PortDevice const &connected) {
    auto const number = connected.port;
    auto const share = observed_.shares.find(number);
    Port port;
    port.port = connected.device.number;
    port.number = static_cast<std::uint32_t>(number);
    port.vlan = vlan_of(settings, number);
    port.blocked = settings.blocked.of(number) != 0;
    port.transmits_by_uplink = settings.transmit_uplink.of(number) != 0;
    port.team = team_of(settings, number);
    port.share = share == observed_.shares.end() ? port.number : share->second;
    read_address(settings, connected, observed_, port);
    read_learning(settings.management.of(number).portMACLearning, port);
    read_filter(settings, number, port);
    network_.ports.push_back(std::move(port));
  }

  std::size_t team_of(Settings const &settings, storage::PortNumber number) {
    if (auto const *bound = settings.bound.find(number)) {
      network_.teams.emplace_back().balance = fabric_ ? Balance::mesh : Balance::first;
      if (auto const at = teaming::bound_uplink_in(team_, *bound)) {
        append_slot(network_.teams.back().in_use, {.uplinks = {*at}, .since = {}});
      }
      return network_.teams.size() - 1;
    }
    if (auto const *policy = settings.policies.find(number)) {
      return add_team(*policy);
    }
    return 0;
  }

  std::size_t add_team(VSTeamPolicy const &policy) {
    network_.asks_for_beacons =
        network_.asks_for_beacons || (policy.linkCriteria & TEAM_FRP_CRIT_BEACON_STATE) != 0;
    auto const usable = teaming::usable_slots(team_, policy);
    Team team{.balance = fabric_ ? Balance::mesh : balance_of(policy),
              .in_use = {},
              .standby = {},
              .goes_by_load = !fabric_ && policy.loadBalance == TEAM_FRP_TYPE_LB_LBT};
    for (std::size_t at = 0; at < usable.slots.size(); ++at) {
      append_slot(at < usable.in_use ? team.in_use : team.standby, usable.slots[at]);
    }
    network_.teams.push_back(std::move(team));
    return network_.teams.size() - 1;
  }

  static Balance balance_of(VSTeamPolicy const &policy) {
    if (teaming::uses_first_slot(policy)) {
      return Balance::first;
    }
    switch (policy.loadBalance) {
      case TEAM_FRP_TYPE_LB_IP:
        return Balance::addresses;
      case TEAM_FRP_TYPE_LB_SRCMAC:
        return Balance::source;
      default:
        return Balance::share;
    }
  }

  void append_slot(std::vector<Slot> &slots, teaming::Slot const &usable) const {
    Slot slot;
    for (auto const at : usable.uplinks) {
      auto const ports = ports_of(team_.uplinks[at].name);
      slot.insert(slot.end(), ports.begin(), ports.end());
    }
    if (!slot.empty()) {
      slots.push_back(std::move(slot));
    }
  }

  // Those of its device, or of its tunnels.
  [[nodiscard]] std::vector<openflow::Port> ports_of(std::string const &uplink) const {
    std::vector<openflow::Port> ports;
    if (fabric_ && fabric_->uplink == uplink) {
      for (auto const &tunnel : fabric_->tunnels) {
        ports.push_back(tunnel.number);
      }
    } else if (auto const device = storage::device_of(transaction_, uplink)) {
      ports.push_back(device->number);
    }
    return ports;
  }

  void read_promiscuous() {
    auto const seeing = promiscuous_ports(transaction_, key_);
    for (auto &port : network_.ports) {
      port.promiscuous = port.promiscuous || std::binary_search(seeing.begin(), seeing.end(),
                                                                storage::PortNumber{port.number});
    }
  }

  void read_fixed_addresses() {
    for (auto const &[at, address] : storage::fixed_addresses(transaction_, key_)) {
      // Virtual networks are none of this switch's.
      if (address.name.vni == 0) {
        network_.fixed_addresses.push_back(
            {.address = address_of(address.name.mac),
             .vlan = address.name.vid,
             .port = at ? std::optional(static_cast<std::uint32_t>(*at)) : std::nullopt});
      }
    }
  }

  storage::Transaction &transaction_;
  storage::SwitchKey key_;
  teaming::Team const &team_;
  std::span<storage::PortDevice const> connected_;
  Observed const &observed_;
  Network network_;
  std::optional<storage::Fabric> fabric_;
};

}  // namespace

Network read_network(storage::Transaction &transaction, storage::SwitchKey key,
                     teaming::Team const &team, std::span<storage::PortDevice const> connected,
                     Observed const &observed) {
  return Reader(transaction, key, team, connected, observed).read();
}

bool may_be_refused(storage::Transaction &transaction, storage::SwitchKey key) {
  return has_mirror_sessions(transaction, key) || storage::fabric_of(transaction, key) ||
         storage::uplinks_of(transaction, key).size() > kMostInSlot;
}

}  // namespace simhost::openvswitch
