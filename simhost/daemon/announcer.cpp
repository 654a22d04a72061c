// What is due waits for its interval.
#include "daemon/announcer.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <set>
#include <utility>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/compile/plan.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;
using openvswitch::Announced;

constexpr auto kInterval = 1s;

// The client of a flow that was learned at its port.
Announced client_of(openflow::Flow const &flow, Announced client) {
  auto const &fields = flow.match.fields();
  for (auto const field : {openflow::Field::eth_dst, openflow::Field::eth_src}) {
    if (auto const address = fields.find(field); address != fields.end()) {
      client.address = openflow::to_address<6>(address->second.value);
    }
  }
  return client;
}

// In which VLAN it was learned; nothing for an address that is known in all those of its port.
std::optional<std::uint16_t> learned_vlan(openflow::Flow const &flow) {
  auto const &fields = flow.match.fields();
  auto const domain = fields.find(openvswitch::field::kDomain);
  return domain == fields.end() || flow.table != openvswitch::table::kLearnedAddresses
             ? std::nullopt
             : std::optional(static_cast<std::uint16_t>(domain->second.value));
}

// Those that a client is reached in, that of frames without a tag first.
std::vector<std::uint16_t> vlans_of(openvswitch::PortVlan const &vlan) {
  if (!vlan.carried) {
    return {vlan.vlan};
  }
  auto const carried = openvswitch::carried_by(vlan);
  std::vector<std::uint16_t> vlans;
  if (carried.untagged) {
    vlans.push_back(*carried.untagged);
  }
  for (std::size_t tagged = 0; tagged < carried.tagged.size(); ++tagged) {
    if (carried.tagged[tagged] && tagged != carried.untagged) {
      vlans.push_back(static_cast<std::uint16_t>(tagged));
    }
  }
  return vlans;
}

}  // namespace

void Announcer::follow(Wanted const &wanted, Memory const &memory, IsLive const &is_live) {
  most_ = wanted.most_announced;
  duration_ = wanted.announced_for;
  std::erase_if(switches_, [&](auto const &known) {
    auto const is_it = [&](auto const &one) { return one.key == known.first; };
    return std::ranges::none_of(wanted.bridges, is_it) && std::ranges::none_of(wanted.unfit, is_it);
  });
  for (auto const &bridge : wanted.bridges) {
    follow(bridge, memory, is_live);
  }
  has_begun_ = true;
  if (!next_interval_) {
    send();
  }
}

void Announcer::follow(WantedBridge const &bridge, Memory const &memory, IsLive const &is_live) {
  auto const has_link = [&](openvswitch::Slot const &slot) {
    return std::ranges::any_of(slot, [&](auto port) { return is_live(bridge.key, port); });
  };
  auto &known = switches_[bridge.key];
  std::map<std::uint32_t, Place> places;
  std::vector<Moved> moved;
  for (auto const &carried : bridge.carried) {
    auto const before = known.places.find(carried.number);
    bool const is_elsewhere = before == known.places.end() ||
                              before->second.device != carried.device ||
                              before->second.links != carried.links;
    if (has_begun_ && is_elsewhere && !std::ranges::all_of(carried.slots, has_link)) {
      if (before != known.places.end()) {
        places.insert(*before);
      }
      continue;
    }
    if (has_begun_ && is_elsewhere && carried.is_announced && !carried.links.empty()) {
      moved.push_back(clients_at(carried, memory.learned_at(bridge.key, carried.number)));
    }
    places[carried.number] = {.device = carried.device, .links = carried.links};
  }
  known.places = std::move(places);
  announce(known, moved);
}

Announcer::Moved Announcer::clients_at(Carried const &carried,
                                       std::vector<openflow::Flow> const &learned) {
  Moved moved{
      .number = carried.number, .in_one_vlan = {}, .in_all = {}, .vlans = vlans_of(carried.vlan)};
  if (carried.has_address()) {
    moved.in_all.push_back(carried.client);
  }
  for (auto const &flow : learned) {
    auto client = client_of(flow, carried.client);
    if (auto const vlan = learned_vlan(flow)) {
      client.vlan = *vlan;
      moved.in_one_vlan.push_back(client);
    } else {
      moved.in_all.push_back(client);
    }
  }
  return moved;
}

// In the VLAN that each port has at this place.
std::set<Announced> Announcer::clients_in(std::vector<Moved> const &moved, std::size_t place) {
  std::set<Announced> clients;
  for (auto const &port : moved) {
    if (place == 0) {
      clients.insert(port.in_one_vlan.begin(), port.in_one_vlan.end());
    }
    if (place < port.vlans.size()) {
      for (auto client : port.in_all) {
        client.vlan = port.vlans[place];
        clients.insert(client);
      }
    }
  }
  return clients;
}

// Where a client is now is all that matters. What would have to wait for too long is not kept, and
// not looked for: ports have up to 4,096 VLANs.
void Announcer::announce(OfSwitch &known, std::vector<Moved> const &moved) const {
  std::set<std::uint32_t> numbers;
  std::size_t places = 1;
  for (auto const &port : moved) {
    numbers.insert(port.number);
    places = std::max(places, port.vlans.size());
  }
  std::erase_if(known.due, [&](Due const &due) { return numbers.contains(due.announced.number); });
  auto const until = events::Clock::now() + duration_;
  auto const room = std::uint64_t{most_} * static_cast<std::uint64_t>(duration_.count() + 1);
  // An address may be known in a VLAN twice, as of the port and as learned there.
  std::set<Announced> told;
  for (std::size_t place = 0; place < places && known.due.size() < room; ++place) {
    for (auto const &client : clients_in(moved, place)) {
      if (known.due.size() < room && told.insert(client).second) {
        known.due.push_back({.announced = client, .until = until});
      }
    }
  }
}

void Announcer::send() {
  bool has_sent = false;
  for (auto &[key, known] : switches_) {
    std::vector<Announced> some;
    while (!known.due.empty() && some.size() < most_) {
      some.push_back(known.due.front().announced);
      known.due.pop_front();
    }
    auto const next = events::Clock::now() + kInterval;
    std::erase_if(known.due, [&](Due const &due) { return due.until < next; });
    if (!some.empty()) {
      has_sent = true;
      send_(key, some);
    }
  }
  if (has_sent) {
    next_interval_ = loop_.after(kInterval, [this] { send(); });
  }
}

}  // namespace simhost::daemon
