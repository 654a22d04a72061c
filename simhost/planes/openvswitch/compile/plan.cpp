// Private VLANs by their numbers, and the addresses of the clients.
#include "planes/openvswitch/compile/plan.h"

#include <algorithm>
#include <map>
#include <set>
#include <unordered_map>
#include <utility>

namespace simhost::openvswitch {
namespace {

// A timeout of a flow has 16 bits.
constexpr std::uint32_t kLongestTimeout = 65535;

// Of the 4,096 that a frame has, those which lists may take.
constexpr std::size_t kMostLookups = 3900;

bool is_mirrored_to(Network const &network, Port const &port) {
  return std::ranges::any_of(network.mirrors, [&](Mirror const &mirror) {
    auto const &ports = mirror.received.ports;
    return std::ranges::find(ports, port.port) != ports.end();
  });
}

bool may_return(Network const &network) {
  auto const &uplinks = network.uplinks;
  if (network.is_mesh() || uplinks.empty()) {
    return false;
  }
  return uplinks.size() > 1 || std::ranges::any_of(network.ports, &Port::transmits_by_uplink);
}

}  // namespace

Common::Common(Network const &network)
    : mtu(network.mtu),
      addresses(network.addresses),
      mirrors(network.mirrors),
      hears_igmp(network.multicast.hears_igmp),
      hears_mld(network.multicast.hears_mld),
      has_uplinks(!network.uplinks.empty()),
      any_promiscuous(std::ranges::any_of(network.ports, &Port::promiscuous)),
      frames_may_return(may_return(network)) {
  note_private_vlans(network);
}

void Common::note_private_vlans(Network const &network) {
  kinds_.resize(Vlans().size());
  for (std::size_t vlan = 0; vlan < kinds_.size(); ++vlan) {
    kinds_[vlan].domain = static_cast<std::uint16_t>(vlan);
  }
  std::set<std::uint16_t> named;
  for (auto const &entry : network.private_vlans) {
    kinds_[entry.primary] = {.domain = entry.primary, .kind = PrivateKind::promiscuous};
    kinds_[entry.secondary] = {.domain = entry.primary, .kind = entry.kind};
    named.insert({entry.primary, entry.secondary});
  }
  private_vlans_.assign(named.begin(), named.end());
}

std::uint16_t Common::hard_timeout() const {
  return addresses.aging > kLongestTimeout ? 0 : static_cast<std::uint16_t>(addresses.aging);
}

Plan::Plan(Network const &given)
    : network(given), common(given), ways(given), outlets(outlets_of(ways)) {
  note_lookups();
  note_ports();
  note_addresses();
  note_fixed_addresses();
}

bool Plan::is_looked_at(Port const &port) const {
  return looked_at_[index_of(port)];
}

bool Plan::counts_sent(Port const &port) const {
  return index_of(port) < counted_ports_;
}

bool Plan::filters_by_address() const {
  auto const &multicast = network.multicast;
  return !multicast.hears_igmp && !multicast.hears_mld &&
         std::ranges::any_of(network.ports,
                             [](Port const &port) { return port.asked_groups.has_value(); });
}

void Plan::note_ports() {
  ports_.reserve(network.ports.size());
  for (auto const &port : network.ports) {
    AmongOthers among_others;
    if (auto const *const way = ways.of(port)) {
      among_others.way = way->number;
      among_others.out = outlets.actions.at(way->number);
    }
    among_others.counts_sent = counts_sent(port);
    ports_.push_back({.common = common, .port = port, .among_others = std::move(among_others)});
  }
}

Vlans Plan::domains_of(Port const &port) const {
  Vlans domains;
  auto const carried = carried_by(port.vlan);
  for (std::size_t vlan = 0; vlan < carried.tagged.size(); ++vlan) {
    if (carried.tagged[vlan] || vlan == carried.untagged) {
      domains.set(common.kind_of(static_cast<std::uint16_t>(vlan)).domain);
    }
  }
  return domains;
}

void Plan::note_addresses() {
  std::map<EthernetAddress, Vlans> all_taken;
  for (auto &[_, port, among_others] : ports_) {
    if (!port.address || !has_vlan(common, port)) {
      continue;
    }
    auto &own = among_others.own_domains;
    auto &taken = all_taken[*port.address];
    if (port.vlan.carried) {
      auto const domains = domains_of(port) & ~taken;
      own = masks_with_0_of(domains);
      taken |= domains;
    } else if (auto const domain = common.kind_of(port.vlan.vlan).domain; !taken[domain]) {
      own.push_back({.vlan = domain, .mask = kWholeVlan});
      taken.set(domain);
    }
  }
}

// Two private VLANs of one primary are one to addresses.
void Plan::note_fixed_addresses() {
  std::unordered_map<std::uint32_t, Port const *> ports;
  for (auto const &port : network.ports) {
    ports.emplace(port.number, &port);
  }
  std::set<std::pair<EthernetAddress, std::uint16_t>> taken;
  for (auto const &fixed : network.fixed_addresses) {
    auto const domain = common.kind_of(fixed.vlan).domain;
    if (taken.insert({fixed.address, domain}).second) {
      auto const found = fixed.port ? ports.find(*fixed.port) : ports.end();
      fixed_places_.push_back({.address = fixed.address,
                               .domain = domain,
                               .is_beyond = !fixed.port,
                               .port = found == ports.end() ? nullptr : found->second});
    }
  }
}

void Plan::note_lookups() {
  for (auto const &port : network.ports) {
    looked_at_.push_back(port.vlan.carried ||
                         common.kind_of(port.vlan.vlan).kind != PrivateKind::none ||
                         port.transmits_by_uplink || is_mirrored_to(network, port));
  }
  auto const taken = static_cast<std::size_t>(std::ranges::count(looked_at_, true));
  counted_ports_ = kMostLookups - std::min(taken, kMostLookups);
}

bool is_closed(Port const &port) {
  return port.blocked || port.address_changed;
}

bool has_vlan(Common const &common, Port const &port) {
  return !port.vlan.must_be_private || common.kind_of(port.vlan.vlan).kind != PrivateKind::none;
}

bool takes_frames(Common const &common, Port const &port) {
  return !is_closed(port) && !port.mirrors_only && has_vlan(common, port);
}

bool sends_frames(Port const &port) {
  return !port.blocked && !port.sends_nothing;
}

Carried carried_by(PortVlan const &vlan) {
  Carried carried{.untagged = std::nullopt, .tagged = *vlan.carried};
  if (vlan.vlan != 0 || carried.tagged[0]) {
    carried.untagged = vlan.vlan;
    carried.tagged.reset(vlan.vlan);
  }
  carried.tagged.reset(0);
  return carried;
}

}  // namespace simhost::openvswitch
