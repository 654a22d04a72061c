// What is due waits for its interval.
#include "daemon/announcer.h"

#include <algorithm>
#include <utility>

#include "planes/openvswitch/compile/pipeline.h"

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
  if (auto const domain = fields.find(openvswitch::field::kDomain);
      domain != fields.end() && flow.table == openvswitch::table::kLearnedAddresses) {
    client.vlan = static_cast<std::uint16_t>(domain->second.value);
  }
  return client;
}

}  // namespace

void Announcer::follow(Wanted const &wanted, Memory const &memory) {
  most_ = wanted.most_announced;
  duration_ = wanted.announced_for;
  std::erase_if(switches_, [&](auto const &known) {
    auto const is_it = [&](auto const &one) { return one.key == known.first; };
    return std::ranges::none_of(wanted.bridges, is_it) && std::ranges::none_of(wanted.unfit, is_it);
  });
  for (auto const &bridge : wanted.bridges) {
    follow(bridge, memory);
  }
  has_begun_ = true;
  if (!next_interval_) {
    send();
  }
}

void Announcer::follow(WantedBridge const &bridge, Memory const &memory) {
  auto &known = switches_[bridge.key];
  std::map<std::uint32_t, Place> places;
  for (auto const &carried : bridge.carried) {
    auto const before = known.places.find(carried.number);
    bool const is_elsewhere = before == known.places.end() ||
                              before->second.device != carried.device ||
                              before->second.links != carried.links;
    if (has_begun_ && is_elsewhere && carried.is_announced && !carried.links.empty()) {
      announce(bridge.key, known, carried, memory);
    }
    places[carried.number] = {.device = carried.device, .links = carried.links};
  }
  known.places = std::move(places);
}

void Announcer::announce(storage::SwitchKey key, OfSwitch &known, Carried const &carried,
                         Memory const &memory) const {
  std::set<Announced> clients;
  if (carried.has_address()) {
    clients.insert(carried.client);
  }
  for (auto const &flow : memory.learned_at(key, carried.number)) {
    clients.insert(client_of(flow, carried.client));
  }
  auto const until = events::Clock::now() + duration_;
  for (auto const &client : clients) {
    // Where it is now is all that matters.
    std::erase_if(known.due, [&](Due const &due) { return due.announced == client; });
    known.due.push_back({.announced = client, .until = until});
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
