// What is heard and what time does is put into flows a moment later: who joins several groups says
// so in several frames.
#include "daemon/groups/group_members.h"

#include <arpa/inet.h>

#include <algorithm>
#include <stdexcept>
#include <utility>
#include <variant>
#include <vector>

#include "model/options/runtime_options.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "storage/store.h"

namespace simhost::daemon {
namespace {

using multicast::Family;
using openvswitch::Network;
using openvswitch::PrivateKind;
namespace field = openvswitch::field;

// A port that tags more VLANs is asked only in those where it, or another port, is.
constexpr std::size_t kFewVlans = 64;

multicast::Time now() {
  return std::chrono::duration_cast<multicast::Time>(events::Clock::now().time_since_epoch());
}

multicast::Options options_of(storage::Transaction &transaction, Network const &network) {
  auto const number = [&](VSRuntimeOptionType type) {
    return static_cast<unsigned>(runtime_number(transaction, type));
  };
  auto const &heard = network.multicast;
  return {.igmp = {.is_heard = heard.hears_igmp,
                   .version = number(VS_RT_OPT_IGMP_VERSION),
                   .most_sources = number(VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM)},
          .mld = {.is_heard = heard.hears_mld,
                  .version = number(VS_RT_OPT_MLD_VERSION),
                  .most_sources = number(VS_RT_OPT_MLD_V2_MAX_SRC_IP_NUM)},
          .robustness = number(VS_RT_OPT_IGMP_QUERIES),
          .interval = std::chrono::seconds(number(VS_RT_OPT_IGMP_QUERY_INTERVAL))};
}

// Locally administered, and another one for another switch.
openflow::EthernetAddress hardware_of(storage::SwitchKey key) {
  auto const number = static_cast<std::uint32_t>(key);
  return {0x02,
          'v',
          static_cast<std::uint8_t>(number >> 24U),
          static_cast<std::uint8_t>(number >> 16U),
          static_cast<std::uint8_t>(number >> 8U),
          static_cast<std::uint8_t>(number)};
}

multicast::Querier querier(storage::Transaction &transaction, storage::SwitchKey key,
                           Family family) {
  bool const is_ipv4 = family == Family::ipv4;
  auto const option = is_ipv4 ? VS_RT_OPT_IGMP_ROUTER_IP : VS_RT_OPT_MLD_ROUTER_IP;
  auto const text = std::get<std::string>(runtime_option(transaction, option));
  multicast::Querier from{.hardware = hardware_of(key), .source = {.family = family}};
  inet_pton(is_ipv4 ? AF_INET : AF_INET6, text.c_str(), from.source.bytes.data());
  if (!is_ipv4 && multicast::is_unspecified(from.source)) {
    from.source = multicast::link_local_address(from.hardware);
  }
  return from;
}

// By VLANs: the primary ones of private VLANs, and all others themselves.
class Domains {
 public:
  explicit Domains(Network const &network) {
    for (auto const &entry : network.private_vlans) {
      primary_.emplace(entry.secondary, entry.primary);
    }
  }
  [[nodiscard]] std::uint16_t of(std::uint16_t vlan) const {
    auto const found = primary_.find(vlan);
    return found == primary_.end() ? vlan : found->second;
  }

 private:
  std::map<std::uint16_t, std::uint16_t> primary_;
};

std::optional<std::uint64_t> number_in(openflow::Match const &metadata, openflow::Field field) {
  auto const found = metadata.fields().find(field);
  return found == metadata.fields().end()
             ? std::nullopt
             : std::optional(static_cast<std::uint64_t>(found->second.value));
}

// Into the VLAN, as what everybody in it gets, to the one port.
openflow::PacketOut asking(multicast::Asked const &asked, multicast::Querier const &from,
                           openflow::Port device) {
  auto const vlan = asked.place.vlan;
  return {.actions = {openflow::set(field::kVlan, vlan), openflow::set(field::kDomain, vlan),
                      openflow::set(field::kPrivateKind,
                                    static_cast<openflow::Value>(PrivateKind::promiscuous)),
                      openflow::set(field::kReceiver, device),
                      openflow::Resubmit{.table = openvswitch::table::kDelivery}},
          .frame = multicast::encode(asked.query, from)};
}

}  // namespace

GroupMembers::GroupMembers(events::Loop &loop, Told told) : loop_(loop), told_(std::move(told)) {}

void GroupMembers::follow(storage::Transaction &transaction, storage::SwitchKey key,
                          Network &network) {
  auto &known = switches_[key];
  known.igmp = querier(transaction, key, Family::ipv4);
  known.mld = querier(transaction, key, Family::ipv6);
  note_places(known, network);
  auto places = known.places;
  places.insert(known.heard.begin(), known.heard.end());
  known.members.set_options(options_of(transaction, network), now());
  known.members.set_places(places, now());
  network.multicast.groups = known.members.groups();
  known.told = known.members.revision();
  wait();
}

void GroupMembers::note_places(Switch &known, Network const &network) const {
  Domains const domains(network);
  known.numbers.clear();
  known.devices.clear();
  known.many.clear();
  known.places.clear();
  if (!network.multicast.hears_igmp && !network.multicast.hears_mld) {
    known.heard.clear();
    return;
  }
  std::set<std::uint16_t> used;
  auto const add = [&](openvswitch::Port const &port, std::uint16_t vlan) {
    known.places.insert({.port = port.number, .vlan = domains.of(vlan)});
    used.insert(domains.of(vlan));
  };
  for (auto const &port : network.ports) {
    known.numbers.emplace(port.port, port.number);
    known.devices.emplace(port.number, port.port);
    if (!port.vlan.carried) {
      add(port, port.vlan.vlan);
      continue;
    }
    if (port.vlan.vlan != 0 || port.vlan.carried->test(0)) {
      add(port, port.vlan.vlan);
    }
    if (port.vlan.carried->count() > kFewVlans) {
      known.many.emplace(port.number, *port.vlan.carried);
      continue;
    }
    for (std::size_t vlan = 1; vlan < port.vlan.carried->size(); ++vlan) {
      if (port.vlan.carried->test(vlan)) {
        add(port, static_cast<std::uint16_t>(vlan));
      }
    }
  }
  for (auto const &[number, vlans] : known.many) {
    for (auto const vlan : used) {
      if (vlans.test(vlan)) {
        known.places.insert({.port = number, .vlan = vlan});
      }
    }
  }
  std::erase_if(known.heard, [&](multicast::Place const &place) {
    auto const vlans = known.many.find(place.port);
    return vlans == known.many.end() || !vlans->second.test(place.vlan);
  });
}

void GroupMembers::keep(std::set<storage::SwitchKey> const &keys) {
  std::erase_if(switches_, [&](auto const &one) { return !keys.contains(one.first); });
}

void GroupMembers::receive(storage::SwitchKey key, openflow::PacketIn const &packet) {
  auto const known = switches_.find(key);
  auto const device = number_in(packet.metadata, openflow::Field::in_port);
  if (known == switches_.end() || !device) {
    return;
  }
  auto &heard = known->second;
  auto const number = heard.numbers.find(static_cast<openflow::Port>(*device));
  auto const message = multicast::decode(packet.frame);
  if (number == heard.numbers.end() || !message) {
    return;
  }
  multicast::Place const place{
      .port = number->second,
      .vlan = static_cast<std::uint16_t>(number_in(packet.metadata, field::kDomain).value_or(0))};
  auto const vlans = heard.many.find(place.port);
  if (vlans != heard.many.end() && vlans->second.test(place.vlan) &&
      heard.heard.insert(place).second) {
    auto places = heard.places;
    places.insert(heard.heard.begin(), heard.heard.end());
    heard.members.set_places(places, now());
  }
  heard.members.receive(place, *message, now());
  wait();
}

void GroupMembers::advance() {
  for (auto &[key, known] : switches_) {
    std::vector<openflow::PacketOut> frames;
    for (auto const &asked : known.members.advance(now())) {
      if (auto const device = known.devices.find(asked.place.port); device != known.devices.end()) {
        auto const &from = asked.family == Family::ipv4 ? known.igmp : known.mld;
        frames.push_back(asking(asked, from, device->second));
      }
    }
    if (!frames.empty()) {
      told_.send(key, frames);
    }
  }
  if (tells_at_ && *tells_at_ <= now()) {
    tells_at_.reset();
    for (auto &[key, known] : switches_) {
      known.told = known.members.revision();
    }
    told_.changed();
  }
  wait();
}

void GroupMembers::wait() {
  // Whatever is heard in the meantime goes into one change of flows.
  constexpr std::chrono::milliseconds kMoment{10};
  std::optional<multicast::Time> next;
  for (auto const &[key, known] : switches_) {
    if (known.told != known.members.revision() && !tells_at_) {
      tells_at_ = now() + kMoment;
    }
    if (auto const due = known.members.next(); due && (!next || *due < *next)) {
      next = due;
    }
  }
  if (tells_at_ && (!next || *tells_at_ < *next)) {
    next = tells_at_;
  }
  next_.end();
  if (next) {
    next_ = loop_.after(std::max(*next - now(), multicast::Time{}), [this] { advance(); });
  }
}

std::vector<GroupMembers::JoinedGroup> GroupMembers::joined(storage::SwitchKey key,
                                                            std::uint32_t port) const {
  std::vector<JoinedGroup> all;
  if (auto const known = switches_.find(key); known != switches_.end()) {
    for (auto &[address, joined] : known->second.members.joined(port)) {
      all.push_back({.address = address, .joined = joined, .age = now() - joined.reported});
    }
  }
  return all;
}

}  // namespace simhost::daemon
