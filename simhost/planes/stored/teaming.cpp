// A team is looked at once for all ports that ask.
#include "planes/stored/teaming.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "base/bytes.h"
#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/options/runtime_options.h"
#include "planes/stored/counters.h"
#include "planes/stored/policies.h"
#include "vswitch/properties.h"

namespace simhost::stored {
namespace {

OwnTeaming own_teaming(storage::Transaction &transaction, storage::Port const &port) {
  auto const owner = owner_of(port);
  auto const bound = storage::find_property(transaction, owner, VSPROP_PORT_TEAMING_OVERRIDE);
  return {.policy = policy<VSTeamPolicy>(transaction, owner, VSPROP_PORT_TEAMING_POLICY),
          .uplink = bound ? std::optional(text_of(bound->value)) : std::nullopt};
}

// The switch whose ports a change of an uplink's link may move, if it is at one and that one runs.
std::optional<storage::SwitchKey> switch_running_over(storage::Transaction &transaction,
                                                      std::string_view uplink) {
  auto const at = storage::find_uplink(transaction, uplink);
  if (!at || !at->port) {
    return std::nullopt;
  }
  auto const key = storage::find_port(transaction, *at->port)->switch_key;
  return storage::find_switch(transaction, key)->row.associated ? std::optional(key) : std::nullopt;
}

void announce(storage::Transaction &transaction, storage::SwitchKey key, std::uint64_t moves) {
  auto const most =
      static_cast<std::uint64_t>(runtime_number(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL));
  if (auto const sent = std::min(moves, most); sent > 0) {
    CounterOwner const owner{.switch_key = key};
    add_to_counter(transaction, owner, counter_in(&VSRARPStats::rarpPktsSent), sent);
    set_counter(transaction, owner, counter_in(&VSRARPStats::rarpTime),
                static_cast<std::uint64_t>(clock_now(transaction).count()));
  }
}

}  // namespace

OwnTeamings own_teamings(storage::Transaction &transaction, storage::SwitchKey key) {
  OwnTeamings all;
  for (auto const &[port, value] :
       storage::port_properties(transaction, key, VSPROP_PORT_TEAMING_POLICY)) {
    all[static_cast<std::uint32_t>(port)].policy = record_in<VSTeamPolicy>(value);
  }
  for (auto const &[port, value] :
       storage::port_properties(transaction, key, VSPROP_PORT_TEAMING_OVERRIDE)) {
    all[static_cast<std::uint32_t>(port)].uplink = text_of(value);
  }
  return all;
}

Carriers::Carriers(Team team, OwnTeamings const &own)
    : team_(std::move(team)), shared_(slots_in_use(team_, team_.policy)), own_(own) {}

OwnTeaming const *Carriers::own_of(storage::PortNumber number) const {
  auto const found = own_.find(static_cast<std::uint32_t>(number));
  return found == own_.end() ? nullptr : &found->second;
}

std::string_view Carriers::of(storage::PortNumber number) const {
  auto const *const own = own_of(number);
  std::optional<std::size_t> place;
  if (own != nullptr && own->uplink) {
    place = bound_uplink(team_, *own->uplink);
  } else if (own != nullptr && own->policy) {
    place = uplink_for(slots_in_use(team_, *own->policy), *own->policy, number);
  } else {
    place = uplink_for(shared_, team_.policy, number);
  }
  return place ? std::string_view(team_.uplinks[*place].name) : std::string_view();
}

std::string Carriers::required_of(storage::Port const &port) const {
  if (port.kind == storage::PortKind::uplink) {
    throw Refused(QEX_NOT_SUPPORTED);
  }
  if (team_.uplinks.empty()) {
    throw Refused(QEX_ENETUNREACH);
  }
  auto const uplink = of(port.number);
  if (uplink.empty()) {
    throw Refused(QEX_ENETDOWN);
  }
  return std::string(uplink);
}

bool Carriers::announces(storage::PortNumber number) const {
  auto const *const own = own_of(number);
  auto const &policy = own != nullptr && own->policy ? *own->policy : team_.policy;
  return (policy.flags & TEAM_FRP_FLAG_NOTIFY_SWITCH) != 0;
}

std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) {
  OwnTeamings const own{{static_cast<std::uint32_t>(port.number), own_teaming(transaction, port)}};
  return Carriers(team_of(transaction, port.switch_key), own).required_of(port);
}

void change_link(storage::Transaction &transaction, std::string_view uplink, Link const &link) {
  auto const running = switch_running_over(transaction, uplink);
  if (!running) {
    set_link(transaction, uplink, link);
    return;
  }
  auto const key = *running;
  auto const own = own_teamings(transaction, key);
  Carriers const before(team_of(transaction, key), own);
  set_link(transaction, uplink, link);
  Carriers const after(team_of(transaction, key), own);
  auto const numbers = storage::client_numbers(transaction, key);
  auto const moved = std::count_if(numbers.begin(), numbers.end(), [&](storage::PortNumber number) {
    auto const carrier = after.of(number);
    return !carrier.empty() && after.announces(number) && carrier != before.of(number);
  });
  announce(transaction, key, static_cast<std::uint64_t>(moved));
}

}  // namespace simhost::stored
