// A team is worked out once for all ports and questions, until its generation is another one.
#include "planes/stored/teaming.h"

#include <algorithm>
#include <cstddef>
#include <utility>

#include "base/bytes.h"
#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/options/runtime_options.h"
#include "model/properties/properties.h"
#include "model/teaming/properties.h"
#include "planes/stored/counters.h"
#include "planes/stored/links.h"
#include "storage/store.h"

namespace simhost::stored {
namespace {

// Switches that come and go must not pile up; no host has so many at a time.
constexpr std::size_t kMostKept = 1024;

template <typename Kept>
Kept &keep(std::map<storage::SwitchKey, Kept> &all, storage::SwitchKey key, Kept kept) {
  if (all.size() >= kMostKept) {
    all.clear();
  }
  return all.insert_or_assign(key, std::move(kept)).first->second;
}

bool announces(VSTeamPolicy const &policy) {
  return (policy.flags & TEAM_FRP_FLAG_NOTIFY_SWITCH) != 0;
}

bool has_moved(std::optional<std::size_t> before, std::optional<std::size_t> after) {
  return after && after != before;
}

// The switch whose ports a change of an uplink's link may move, if it is at one and that one runs.
std::optional<storage::SwitchKey> switch_running_over(storage::Transaction &transaction,
                                                      std::string_view uplink) {
  auto const at = storage::find_uplink(transaction, uplink);
  if (!at || !at->port) {
    return std::nullopt;
  }
  auto const key = storage::find_port(transaction, *at->port)->switch_key;
  return storage::get_switch_row(transaction, key).row.associated ? std::optional(key)
                                                                  : std::nullopt;
}

void announce(storage::ChangingTransaction &transaction, storage::SwitchKey key,
              std::uint64_t sent) {
  if (sent > 0) {
    CounterOwner const owner{.switch_key = key};
    add_to_counter(transaction, owner, counter_in(&VSRARPStats::rarpPktsSent), sent);
    set_counter(transaction, owner, counter_in(&VSRARPStats::rarpTime),
                static_cast<std::uint64_t>(clock_now(transaction).count()));
  }
}

}  // namespace

Teaming::KeptTeam const &Teaming::team_of_switch(storage::Transaction &transaction,
                                                 storage::SwitchKey key,
                                                 storage::Generations const &generations) {
  auto const found = teams_.find(key);
  if (found == teams_.end() || found->second.generation != generations.team) {
    auto team = teaming::team_of(transaction, key, link_of);
    auto slots = slots_in_use(team, team.policy);
    return keep(
        teams_, key,
        KeptTeam{
            .generation = generations.team, .team = std::move(team), .slots = std::move(slots)});
  }
  auto &kept = found->second;
  if (kept.team.up_delay != ClockTime::zero()) {
    kept.team.now = clock_now(transaction);
    kept.slots = slots_in_use(kept.team, kept.team.policy);
  }
  return kept;
}

Teaming::KeptPorts &Teaming::ports_of_switch(storage::SwitchKey key,
                                             storage::Generations const &generations) {
  auto const found = ports_.find(key);
  if (found == ports_.end() || found->second.generation != generations.ports) {
    return keep(ports_, key,
                KeptPorts{.generation = generations.ports, .own = {}, .plain = std::nullopt});
  }
  return found->second;
}

OwnTeaming const &Teaming::own_of(storage::Transaction &transaction, storage::Port const &port,
                                  KeptPorts &ports) {
  auto const found = ports.own.find(port.number);
  if (found != ports.own.end()) {
    return found->second;
  }
  if (ports.plain) {
    static OwnTeaming const nothing;
    return nothing;
  }
  return ports.own.emplace(port.number, teaming::own_teaming(transaction, port)).first->second;
}

Teaming::KeptPorts const &Teaming::all_ports(storage::Transaction &transaction,
                                             storage::SwitchKey key,
                                             storage::Generations const &generations) {
  auto &ports = ports_of_switch(key, generations);
  if (!ports.plain) {
    ports.own.clear();
    for (auto const &[port, value] : list_stored_at_ports(transaction, teaming::policy, key)) {
      ports.own[port].policy = record_of<VSTeamPolicy>(value);
    }
    for (auto const &[port, value] :
         list_stored_at_ports(transaction, teaming::bound_uplink, key)) {
      ports.own[port].uplink = text_of(value);
    }
    auto numbers = storage::client_numbers(transaction, key);
    std::erase_if(numbers, [&](auto number) { return ports.own.contains(number); });
    ports.plain = std::move(numbers);
  }
  return ports;
}

std::string Teaming::uplink_of(storage::Transaction &transaction, storage::Port const &port) {
  if (port.kind == storage::PortKind::uplink) {
    throw Refused(QEX_NOT_SUPPORTED);
  }
  auto const generations = storage::get_generations(transaction, port.switch_key);
  auto const &kept = team_of_switch(transaction, port.switch_key, generations);
  if (kept.team.uplinks.empty()) {
    throw Refused(QEX_ENETUNREACH);
  }
  auto const &own = own_of(transaction, port, ports_of_switch(port.switch_key, generations));
  auto const place = teaming::uplink_with(kept.team, own, kept.slots, port.number);
  if (!place) {
    throw Refused(QEX_ENETDOWN);
  }
  return kept.team.uplinks[*place].name;
}

// Counts no further than there may be announced: most ports of a large switch need no look.
std::uint64_t Teaming::count_announced(KeptTeam const &before, KeptTeam const &after,
                                       KeptPorts const &ports, std::uint64_t most) {
  std::uint64_t count = 0;
  auto const &shared = after.team.policy;
  if (announces(shared) && before.slots != after.slots) {
    for (auto at = ports.plain->begin(); at != ports.plain->end() && count < most; ++at) {
      count +=
          has_moved(uplink_for(before.slots, shared, *at), uplink_for(after.slots, shared, *at))
              ? 1
              : 0;
    }
  }
  for (auto at = ports.own.begin(); at != ports.own.end() && count < most; ++at) {
    auto const &[number, own] = *at;
    bool const counts = announces(own.policy.value_or(shared)) &&
                        has_moved(teaming::uplink_with(before.team, own, before.slots, number),
                                  teaming::uplink_with(after.team, own, after.slots, number));
    count += counts ? 1 : 0;
  }
  return count;
}

void Teaming::change_link(storage::ChangingTransaction &transaction, std::string_view uplink,
                          Link const &link) {
  auto const running = switch_running_over(transaction, uplink);
  if (!running) {
    teaming::set_link(transaction, uplink, link);
    return;
  }
  auto const key = *running;
  auto const generations = storage::get_generations(transaction, key);
  auto const before = team_of_switch(transaction, key, generations);
  teaming::set_link(transaction, uplink, link);
  auto const &after = team_of_switch(transaction, key, storage::get_generations(transaction, key));

  auto const most =
      static_cast<std::uint64_t>(runtime_number(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL));
  auto const &ports = all_ports(transaction, key, generations);
  announce(transaction, key, count_announced(before, after, ports, most));
}

}  // namespace simhost::stored
