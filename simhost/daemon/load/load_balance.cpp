// A port without a choice of its own goes by its number, as in teams that go by that.
#include "daemon/load/load_balance.h"

#include <algorithm>

#include "daemon/load/next_move.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "storage/running/readings.h"

namespace simhost::daemon {
namespace {

using openvswitch::Counted;

bool counts_what_came_in(std::uint64_t cookie) {
  auto const kind = openvswitch::kind_of(cookie);
  return kind == Counted::in_unicast || kind == Counted::in_multicast ||
         kind == Counted::in_broadcast;
}

std::uint64_t under(std::map<std::uint32_t, std::uint64_t> const &bytes, std::uint32_t port) {
  auto const found = bytes.find(port);
  return found == bytes.end() ? 0 : found->second;
}

}  // namespace

void LoadBalance::count(storage::SwitchKey key, openvswitch::Totals const &totals) {
  auto const found = switches_.find(key);
  if (found == switches_.end() || found->second.teams.empty()) {
    return;
  }
  auto &sent = found->second.sent;
  sent.clear();
  for (auto const &[cookie, total] : totals) {
    if (counts_what_came_in(cookie)) {
      sent[openvswitch::number_of(cookie)] += total.bytes;
    }
  }
  if (!found->second.sent_before) {
    found->second.sent_before = sent;
  }
}

// What the state has is what was chosen, so that a host that is restarted begins anew.
void LoadBalance::follow(storage::Transaction &transaction, storage::SwitchKey key,
                         openvswitch::Network &network) {
  auto &known = switches_[key];
  known.teams.assign(network.teams.size(), {});
  known.shares.clear();
  storage::ChosenShares chosen;
  if (std::ranges::any_of(network.teams, &openvswitch::Team::goes_by_load)) {
    if (!storage::has_readings(transaction, key)) {
      unsaved_.erase(key);
    }
    auto const unsaved = unsaved_.find(key);
    chosen = unsaved == unsaved_.end() ? chosen : unsaved->second;
    chosen.merge(storage::chosen_shares(transaction, key));
  }
  for (auto &port : network.ports) {
    if (port.team && network.teams[*port.team].goes_by_load) {
      auto &team = known.teams[*port.team];
      team.slots = network.teams[*port.team].in_use;
      team.ports.push_back(port.number);
      auto const share = chosen.find(storage::PortNumber{port.number});
      port.share = share == chosen.end() ? port.share : share->second;
      known.shares.emplace(port.number, port.share);
    }
  }
  std::erase_if(known.teams, [](Team const &team) { return team.slots.size() < 2; });
}

bool LoadBalance::choose(storage::SwitchKey key, OfSwitch &of_switch, Team const &team) {
  std::vector<LoadedPort> ports;
  for (auto const number : team.ports) {
    auto const now = under(of_switch.sent, number);
    auto const before = under(*of_switch.sent_before, number);
    // What counts less than before began anew.
    ports.push_back({.number = number,
                     .slot = of_switch.shares.at(number) % team.slots.size(),
                     .bytes = now < before ? now : now - before});
  }
  auto const move = next_move(ports, team.slots.size());
  if (move) {
    auto const share = static_cast<std::uint32_t>(move->slot);
    of_switch.shares[move->number] = share;
    unsaved_[key][storage::PortNumber{move->number}] = share;
  }
  return move.has_value();
}

bool LoadBalance::choose() {
  bool has_chosen = false;
  for (auto &[key, of_switch] : switches_) {
    if (of_switch.sent_before) {
      for (auto const &team : of_switch.teams) {
        has_chosen |= choose(key, of_switch, team);
      }
      of_switch.sent_before = of_switch.sent;
    }
  }
  return has_chosen;
}

openflow::Port LoadBalance::carrier(storage::SwitchKey key, std::uint32_t port) const {
  auto const found = switches_.find(key);
  if (found != switches_.end()) {
    for (auto const &[slots, ports] : found->second.teams) {
      if (std::ranges::find(ports, port) != ports.end()) {
        return slots[found->second.shares.at(port) % slots.size()].front();
      }
    }
  }
  return 0;
}

void LoadBalance::keep(std::set<storage::SwitchKey> const &keys) {
  auto const goes = [&](auto const &one) { return !keys.contains(one.first); };
  std::erase_if(switches_, goes);
  std::erase_if(unsaved_, goes);
}

bool LoadBalance::save() {
  if (unsaved_.empty()) {
    return true;
  }
  bool const is_saved =
      storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
        for (auto const &[key, shares] : unsaved_) {
          if (storage::has_readings(transaction, key)) {
            for (auto const &[port, share] : shares) {
              storage::put_chosen_share(transaction, port, share);
            }
          }
        }
      });
  if (is_saved) {
    unsaved_.clear();
  }
  return is_saved;
}

}  // namespace simhost::daemon
