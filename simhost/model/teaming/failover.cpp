// The team as it is, and once more for each uplink as it would be without it.
#include "model/teaming/failover.h"

#include <string_view>

#include "storage/running/devices.h"

namespace simhost::teaming {
namespace {

struct Carried {
  Team team;
  std::vector<Slot> slots;
};

// As if an uplink were switched off; none is called by an empty name.
Carried without(storage::Transaction &transaction, storage::SwitchKey key,
                std::string_view failed) {
  auto team = team_of(transaction, key, [&](storage::Transaction &from, std::string_view uplink) {
    auto link = storage::find_link(from, uplink).value_or(Link{});
    link.admin = link.admin && uplink != failed;
    return link;
  });
  auto slots = slots_in_use(team, team.policy);
  return {.team = std::move(team), .slots = std::move(slots)};
}

std::optional<std::string> carrier(Carried const &carried, OwnTeaming const &own,
                                   storage::PortNumber number) {
  auto const place = uplink_with(carried.team, own, carried.slots, number);
  return place ? std::optional(carried.team.uplinks[*place].name) : std::nullopt;
}

}  // namespace

std::vector<Failover> failovers(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const now = without(transaction, key, {});
  std::vector<Failover> found;
  for (auto const &uplink : now.team.uplinks) {
    auto const then = without(transaction, key, uplink.name);
    for (auto const &port : storage::ports_of(transaction, key)) {
      bool const is_connected = port.kind == storage::PortKind::client &&
                                storage::device_of(transaction, port.number).has_value();
      if (!is_connected) {
        continue;
      }
      auto const own = own_teaming(transaction, port);
      if (carrier(now, own, port.number) == uplink.name) {
        found.push_back({.uplink = uplink.name,
                         .port = port.identifier,
                         .meanwhile = carrier(then, own, port.number)});
      }
    }
  }
  return found;
}

}  // namespace simhost::teaming
