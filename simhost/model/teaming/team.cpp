// Which uplinks a policy can use, and which of them it does.
#include "model/teaming/team.h"

#include <algorithm>
#include <span>
#include <utility>

#include "base/bytes.h"
#include "model/lookup.h"
#include "model/options/runtime_options.h"
#include "model/ports/ports.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "model/teaming/properties.h"
#include "storage/store.h"

namespace simhost::teaming {
namespace {

bool is_settled(Team const &team, Link const &link) {
  return team.up_delay == ClockTime::zero() || link.up_since == ClockTime::zero() ||
         team.now - link.up_since >= team.up_delay;
}

bool meets_criteria(TeamUplink const &uplink, VSTeamPolicy const &policy) {
  auto const &link = uplink.link;
  auto const fails = [&](std::uint32_t criterion, bool failing) {
    return (policy.linkCriteria & criterion) != 0 && failing;
  };
  return !fails(TEAM_FRP_CRIT_LINK_SPEED, link.speed != policy.speed) &&
         !fails(TEAM_FRP_CRIT_LINK_SPEED_GTE, link.speed < policy.speed) &&
         !fails(TEAM_FRP_CRIT_LINK_DUPLEX, link.full_duplex != (policy.fullDuplex != 0)) &&
         !fails(TEAM_FRP_CRIT_LACP_PORT_DOWN, uplink.aggregated && !link.partner) &&
         !fails(TEAM_FRP_CRIT_BEACON_STATE, !link.beacons) &&
         !fails(TEAM_FRP_CRIT_LINK_ERR, link.error_percent > policy.percentError) &&
         !fails(TEAM_FRP_CRIT_PORT_BLOCKED, uplink.blocked) &&
         !fails(TEAM_FRP_CRIT_DRV_PRESENT, !link.driver);
}

bool is_usable(Team const &team, TeamUplink const &uplink, VSTeamPolicy const &policy) {
  return uplink.link.up() && is_settled(team, uplink.link) && meets_criteria(uplink, policy);
}

std::optional<std::size_t> place_of(Team const &team, std::string_view name) {
  auto const found =
      std::find_if(team.uplinks.begin(), team.uplinks.end(), [&](TeamUplink const &uplink) {
        return uplink.port == name || uplink.identifier == name || uplink.name == name;
      });
  if (found == team.uplinks.end()) {
    return std::nullopt;
  }
  return static_cast<std::size_t>(found - team.uplinks.begin());
}

// The uplinks of the group of that name that are up.
std::vector<std::size_t> places_in_group(Team const &team, std::string_view name) {
  std::vector<std::size_t> places;
  auto const lag = std::find_if(team.lags.begin(), team.lags.end(),
                                [&](auto const &known) { return known.name == name; });
  if (lag != team.lags.end()) {
    for (auto const &uplink : lag->uplinks) {
      if (auto const place = place_of(team, uplink);
          place && would_aggregate(team.uplinks[*place].link)) {
        places.push_back(*place);
      }
    }
  }
  return places;
}

// What a policy can use under a name of its own; nothing if nothing is usable.
std::optional<Slot> slot_called(Team const &team, std::string_view name,
                                VSTeamPolicy const &policy) {
  auto const place = place_of(team, name);
  Slot slot{.uplinks = place ? std::vector{*place} : places_in_group(team, name), .since = {}};
  std::erase_if(slot.uplinks,
                [&](std::size_t at) { return !is_usable(team, team.uplinks[at], policy); });
  if (slot.uplinks.empty()) {
    return std::nullopt;
  }
  slot.since = ClockTime::max();
  for (auto const at : slot.uplinks) {
    slot.since = std::min(slot.since, team.uplinks[at].link.up_since);
  }
  return slot;
}

// Whom a policy names, and how many of them it wants in use.
struct Named {
  std::vector<std::string_view> names;
  std::size_t active;
};

Named named_by(Team const &team, VSTeamPolicy const &policy) {
  Named named{.names = {}, .active = policy.numActive};
  auto const count = std::size_t{policy.numActive} + policy.numStandby;
  // Only a state that this host did not write holds more than it accepts.
  if (count > std::size(policy.uplinkPortName)) {
    throw Refused(QEX_INVALID_METADATA, "a teaming policy in the state is damaged");
  }
  for (auto const &name : std::span(policy.uplinkPortName).first(count)) {
    named.names.push_back(text_in(name));
  }
  if (named.names.empty()) {
    for (auto const &uplink : team.uplinks) {
      named.names.push_back(uplink.name);
    }
    named.active = named.names.size();
  }
  return named;
}

}  // namespace

void set_link(storage::ChangingTransaction &transaction, std::string_view uplink,
              Link const &link) {
  auto const before = storage::find_link(transaction, uplink).value_or(Link{});
  auto changed = link;
  changed.up_since = link.up() && !before.up() ? clock_now(transaction) : before.up_since;
  storage::put_link(transaction, uplink, changed);
}

Team team_of(storage::Transaction &transaction, storage::SwitchKey key, LinkOf const &link_of) {
  Team team{.uplinks = {},
            .lags = storage::all_lags(transaction, key),
            .policy = effective(transaction, of_switch, storage::PropertyOwner::global(key)),
            .now = clock_now(transaction),
            .up_delay = ClockTime(runtime_number(transaction, VS_RT_OPT_TEAM_POLICY_UP_DELAY))};
  for (auto const &[name, number] : storage::uplinks_of(transaction, key)) {
    auto const port = get_port(transaction, number);
    auto const blocked = effective(transaction, ports::blocked, owner_of(port));
    team.uplinks.push_back({.name = name,
                            .port = alias_of(transaction, port).value_or(port.identifier),
                            .identifier = port.identifier,
                            .link = link_of(transaction, name),
                            .aggregated = storage::is_in_lag(transaction, name),
                            .blocked = blocked != 0});
  }
  return team;
}

std::optional<ClockTime> until_next_settles(Team const &team) {
  std::optional<ClockTime> least;
  for (auto const &uplink : team.uplinks) {
    if (uplink.link.up() && !is_settled(team, uplink.link)) {
      auto const left = uplink.link.up_since + team.up_delay - team.now;
      least = std::min(least.value_or(left), left);
    }
  }
  return least;
}

UsableSlots usable_slots(Team const &team, VSTeamPolicy const &policy) {
  auto const named = named_by(team, policy);
  std::vector<Slot> slots;
  for (auto const name : named.names) {
    if (auto slot = slot_called(team, name, policy)) {
      slots.push_back(*std::move(slot));
    }
  }
  if ((policy.flags & TEAM_FRP_FLAG_ROLLING) != 0) {
    std::stable_sort(slots.begin(), slots.end(),
                     [](Slot const &a, Slot const &b) { return a.since < b.since; });
  }
  // A policy that has standby uplinks only uses one of them.
  auto const in_use = std::min(slots.size(), std::max<std::size_t>(named.active, 1));
  return {.slots = std::move(slots), .in_use = in_use};
}

std::vector<Slot> slots_in_use(Team const &team, VSTeamPolicy const &policy) {
  auto usable = usable_slots(team, policy);
  usable.slots.resize(usable.in_use);
  return std::move(usable.slots);
}

std::optional<std::size_t> uplink_for(std::vector<Slot> const &slots, VSTeamPolicy const &policy,
                                      storage::PortNumber number) {
  if (slots.empty()) {
    return std::nullopt;
  }
  auto const spread = static_cast<std::uint32_t>(number);
  auto const share = [spread](std::size_t of) {
    return of == 1 ? 0 : spread % static_cast<std::uint32_t>(of);
  };
  auto const &slot = slots[uses_first_slot(policy) ? 0 : share(slots.size())];
  // A group spreads the ports over its uplinks, whatever the policy does with the slots.
  return slot.uplinks[share(slot.uplinks.size())];
}

std::optional<std::size_t> bound_uplink_in(Team const &team, std::string_view name) {
  VSTeamPolicy const only_the_link{};
  auto const place = place_of(team, name);
  return place && is_usable(team, team.uplinks[*place], only_the_link) ? place : std::nullopt;
}

OwnTeaming own_teaming(storage::Transaction &transaction, storage::Port const &port) {
  auto const owner = owner_of(port);
  return {.policy = find_value(transaction, policy, owner),
          .uplink = find_value(transaction, bound_uplink, owner)};
}

std::optional<std::size_t> uplink_with(Team const &team, OwnTeaming const &own,
                                       std::vector<Slot> const &shared,
                                       storage::PortNumber number) {
  if (own.uplink) {
    return bound_uplink_in(team, *own.uplink);
  }
  if (own.policy) {
    return uplink_for(slots_in_use(team, *own.policy), *own.policy, number);
  }
  return uplink_for(shared, team.policy, number);
}

}  // namespace simhost::teaming
