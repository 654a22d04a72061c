// A team is looked at as a whole, once for all ports that ask.
#include "dataplane/teaming.h"

#include <algorithm>
#include <map>
#include <optional>
#include <span>
#include <vector>

#include "core/bytes.h"
#include "core/giving_up.h"
#include "core/known.h"
#include "core/ports.h"
#include "core/runtime_options.h"
#include "dataplane/counters.h"
#include "dataplane/policies.h"
#include "store/store.h"
#include "vswitch/properties.h"
#include "vswitch/teaming.h"

namespace simhost::dataplane {
namespace {

struct Uplink {
  std::string name;
  std::string port;   // identifier of the uplink port it is at,
  std::string alias;  // and the name of that port
  Link link;
  bool aggregated;
};

// What all ports of a switch have in common.
struct Team {
  std::vector<Uplink> uplinks;  // in the order of their ports
  std::vector<Lag> lags;
  std::optional<VSTeamPolicy> policy;
  ClockTime now;
  ClockTime up_delay;
};

// An uplink that carries frames, for the policy that names it or its group.
struct Usable {
  std::string_view uplink;
  ClockTime since;
};

Team team_of(store::Transaction &transaction, store::SwitchKey key) {
  Team team{.uplinks = {},
            .lags = lags_of(transaction, key),
            .policy = policy<VSTeamPolicy>(transaction, store::PropertyOwner::global(key),
                                           VSPROP_SWITCH_TEAMING),
            .now = clock_now(transaction),
            .up_delay = ClockTime(runtime_number(transaction, VS_RT_OPT_TEAM_POLICY_UP_DELAY))};
  for (auto const &[name, number] : store::uplinks_of(transaction, key)) {
    auto const port = known_port(transaction, number);
    team.uplinks.push_back({.name = name,
                            .port = port.identifier,
                            .alias = alias_of(transaction, port).value_or(""),
                            .link = link_of(transaction, name),
                            .aggregated = is_aggregated(transaction, name)});
  }
  return team;
}

constexpr VSTeamPolicy kDefaultPolicy{
    .loadBalance = TEAM_FRP_TYPE_LB_SRCID,
    .linkCriteria = TEAM_FRP_CRIT_LINK_STATE,
    .percentError = 0,
    .fullDuplex = 0,
    .speed = 0,
    .flags = TEAM_FRP_FLAG_ALL_AVAILABLE | TEAM_FRP_FLAG_NOTIFY_SWITCH,
    .numActive = 0,
    .numStandby = 0,
    .uplinkPortName = {},
};

VSTeamPolicy policy_of(store::Transaction &transaction, Team const &team, store::Port const &port) {
  auto const own =
      policy<VSTeamPolicy>(transaction, store::PropertyOwner::port(port.switch_key, port.number),
                           VSPROP_PORT_TEAMING_POLICY);
  if (own) {
    return *own;
  }
  return team.policy.value_or(kDefaultPolicy);
}

bool is_usable(Team const &team, Uplink const &uplink, VSTeamPolicy const &policy) {
  auto const &link = uplink.link;
  auto const wants = [&](std::uint32_t criterion) {
    return (policy.linkCriteria & criterion) != 0;
  };
  bool const lacp_down = uplink.aggregated && !link.partner;
  bool const settled = team.up_delay == ClockTime::zero() || link.up_since == ClockTime::zero() ||
                       team.now - link.up_since >= team.up_delay;
  return link.up() && settled && !(wants(TEAM_FRP_CRIT_LINK_SPEED) && link.speed != policy.speed) &&
         !(wants(TEAM_FRP_CRIT_LINK_SPEED_GTE) && link.speed < policy.speed) &&
         !(wants(TEAM_FRP_CRIT_LINK_DUPLEX) && link.full_duplex != (policy.fullDuplex != 0)) &&
         !(wants(TEAM_FRP_CRIT_LACP_PORT_DOWN) && lacp_down);
}

std::optional<Usable> usable_uplink(Team const &team, std::string_view name,
                                    VSTeamPolicy const &policy) {
  auto const found = std::find_if(
      team.uplinks.begin(), team.uplinks.end(),
      [&](Uplink const &uplink) { return uplink.port == name || uplink.name == name; });
  if (found == team.uplinks.end() || !is_usable(team, *found, policy)) {
    return std::nullopt;
  }
  return Usable{.uplink = found->name, .since = found->link.up_since};
}

// A group spreads the ports over those of its uplinks that are up.
std::optional<Usable> usable_in_lag(Team const &team, std::string_view name,
                                    VSTeamPolicy const &policy, store::PortNumber number) {
  auto const lag = std::find_if(team.lags.begin(), team.lags.end(),
                                [&](Lag const &known) { return known.name == name; });
  if (lag == team.lags.end()) {
    return std::nullopt;
  }
  std::vector<Usable> usable;
  for (auto const &member : lag->members) {
    if (auto const uplink = usable_uplink(team, member.uplink, policy); member.up && uplink) {
      usable.push_back(*uplink);
    }
  }
  if (usable.empty()) {
    return std::nullopt;
  }
  return usable[static_cast<std::uint32_t>(number) % usable.size()];
}

// Whom a policy names, and how many of them it wants in use.
struct Named {
  std::vector<std::string_view> names;
  std::size_t active;
};

Named named_by(Team const &team, VSTeamPolicy const &policy) {
  Named named{.names = {}, .active = policy.numActive};
  for (auto const &name :
       std::span(policy.uplinkPortName).first(std::size_t{policy.numActive} + policy.numStandby)) {
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

std::vector<Usable> uplinks_in_use(Team const &team, VSTeamPolicy const &policy,
                                   store::PortNumber number) {
  auto const named = named_by(team, policy);
  std::vector<Usable> usable;
  for (auto const name : named.names) {
    auto found = usable_uplink(team, name, policy);
    if (!found) {
      found = usable_in_lag(team, name, policy, number);
    }
    if (found) {
      usable.push_back(*found);
    }
  }
  if ((policy.flags & TEAM_FRP_FLAG_ROLLING) != 0) {
    std::stable_sort(usable.begin(), usable.end(),
                     [](Usable const &a, Usable const &b) { return a.since < b.since; });
  }
  // A policy that has standby uplinks only uses one of them.
  usable.resize(std::min(usable.size(), std::max<std::size_t>(named.active, 1)));
  return usable;
}

std::optional<std::string_view> chosen_by_policy(Team const &team, VSTeamPolicy const &policy,
                                                 store::PortNumber number) {
  auto const in_use = uplinks_in_use(team, policy, number);
  if (in_use.empty()) {
    return std::nullopt;
  }
  bool const first =
      policy.loadBalance == TEAM_FRP_TYPE_NONE || policy.loadBalance == TEAM_FRP_TYPE_FO_EXPLICIT;
  return in_use[first ? 0 : static_cast<std::uint32_t>(number) % in_use.size()].uplink;
}

std::optional<std::string_view> chosen(store::Transaction &transaction, Team const &team,
                                       store::Port const &port, VSTeamPolicy const &policy) {
  auto const bound =
      store::find_property(transaction, store::PropertyOwner::port(port.switch_key, port.number),
                           VSPROP_PORT_TEAMING_OVERRIDE);
  if (!bound) {
    return chosen_by_policy(team, policy, port.number);
  }
  VSTeamPolicy const only_the_link{};
  auto const uplink = usable_uplink(team, text_of(bound->value), only_the_link);
  return uplink ? std::optional(uplink->uplink) : std::nullopt;
}

// The uplink of each port whose policy wants moves to be announced; empty for none.
std::map<store::PortNumber, std::string> announced_choices(store::Transaction &transaction,
                                                           store::SwitchKey key) {
  auto const team = team_of(transaction, key);
  std::map<store::PortNumber, std::string> choices;
  for (auto const &port : store::ports_of(transaction, key)) {
    auto const policy = policy_of(transaction, team, port);
    if (port.kind == store::PortKind::client && (policy.flags & TEAM_FRP_FLAG_NOTIFY_SWITCH) != 0) {
      choices.emplace(port.number, chosen(transaction, team, port, policy).value_or(""));
    }
  }
  return choices;
}

void announce(store::Transaction &transaction, store::SwitchKey key, std::uint64_t moves) {
  auto const most =
      static_cast<std::uint64_t>(runtime_number(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL));
  if (auto const sent = std::min(moves, most); sent > 0) {
    CounterOwner const owner{.switch_key = key};
    add_to_counter(transaction, owner, "rarpPktsSent", sent);
    set_counter(transaction, owner, "rarpTime",
                static_cast<std::uint64_t>(clock_now(transaction).count()));
  }
}

}  // namespace

std::string team_uplink(store::Transaction &transaction, store::Port const &port) {
  if (port.kind == store::PortKind::uplink) {
    throw Refused(QEX_NOT_SUPPORTED);
  }
  auto const team = team_of(transaction, port.switch_key);
  if (team.uplinks.empty()) {
    throw Refused(QEX_ENETUNREACH);
  }
  auto const uplink = chosen(transaction, team, port, policy_of(transaction, team, port));
  if (!uplink) {
    throw Refused(QEX_ENETDOWN);
  }
  return std::string(*uplink);
}

void change_link(store::Transaction &transaction, std::string_view uplink, Link const &link) {
  auto const at = store::find_uplink(transaction, uplink);
  if (!at || !at->port) {
    put_link(transaction, uplink, link);
    return;
  }
  auto const key = store::find_port(transaction, *at->port)->switch_key;
  auto const before = announced_choices(transaction, key);
  put_link(transaction, uplink, link);
  auto const after = announced_choices(transaction, key);
  auto const moved = std::count_if(after.begin(), after.end(), [&](auto const &choice) {
    return !choice.second.empty() && choice.second != before.at(choice.first);
  });
  announce(transaction, key, static_cast<std::uint64_t>(moved));
}

}  // namespace simhost::dataplane
