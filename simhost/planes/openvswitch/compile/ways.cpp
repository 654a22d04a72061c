// From teams and shares to ways.
#include "planes/openvswitch/compile/ways.h"

#include <algorithm>
#include <utility>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::openvswitch {
namespace {

// Past the numbers of the ways of a switch's own team, which has as many slots as there are
// devices.
constexpr std::uint32_t kOwnTeams = 0x1000000;
static_assert(kGreatestPort + 1 < kOwnTeams);
static_assert(kOwnTeams + kGreatestPort < kSendingGroups);

// No port has the number of a group.
constexpr std::uint32_t kFirstLag = 0x10000;
static_assert(kGreatestPort < kFirstLag);

bool chooses_by_port(Team const &team) {
  return team.balance == Balance::first || team.balance == Balance::share;
}

// The slot of those in use at which a port begins.
std::uint32_t begin_of(Team const &team, std::uint32_t share) {
  return team.balance == Balance::share ? share % static_cast<std::uint32_t>(team.in_use.size())
                                        : 0;
}

std::vector<Slot> slots_of(Team const &team, std::uint32_t begin) {
  auto slots = team.in_use;
  if (chooses_by_port(team)) {
    std::rotate(slots.begin(), slots.begin() + static_cast<std::ptrdiff_t>(begin), slots.end());
    slots.insert(slots.end(), team.standby.begin(), team.standby.end());
  }
  return slots;
}

std::uint32_t number_of(Port const &port, std::uint32_t begin) {
  return port.team == 0 ? begin + 1 : kOwnTeams + port.port;
}

}  // namespace

bool Way::is_at(Uplink const &uplink, std::size_t slot) const {
  auto const &uplinks = slots[slot];
  return std::find(uplinks.begin(), uplinks.end(), uplink.port) != uplinks.end() ||
         (uplink.has_partner && links[slot] == kFirstLag + uplink.lag);
}

Ways::Ways(Network const &network) {
  for (auto const &uplink : network.uplinks) {
    uplinks_.emplace(uplink.port, &uplink);
  }
  // The ways of the switch's own team come first, so that a port with a team of its own that does
  // the same goes one of them.
  for (bool const own : {false, true}) {
    for (auto const &port : network.ports) {
      if (port.team && (*port.team != 0) == own) {
        add(network, port);
      }
    }
  }
}

void Ways::add(Network const &network, Port const &port) {
  auto const &team = network.teams[*port.team];
  if (team.in_use.empty()) {
    return;
  }
  auto const begin = begin_of(team, port.share);
  Way way{.number = number_of(port, begin),
          .balance = team.balance == Balance::share ? Balance::first : team.balance,
          .slots = slots_of(team, begin),
          .links = {}};
  leave_out_dead(way);
  for (auto const &slot : way.slots) {
    way.links.push_back(link_of(slot));
  }
  auto const same = std::find_if(ways_.begin(), ways_.end(), [&](Way const &other) {
    return other.balance == way.balance && other.slots == way.slots;
  });
  of_ports_[port.port] = static_cast<std::size_t>(same - ways_.begin());
  if (same == ways_.end()) {
    ways_.push_back(std::move(way));
  }
}

std::uint32_t Ways::link_of(Slot const &slot) const {
  auto const uplink = uplinks_.find(slot.front());
  return uplink != uplinks_.end() && uplink->second->has_partner
             ? kFirstLag + uplink->second->lag
             : *std::min_element(slot.begin(), slot.end());
}

// Those that no group of Open vSwitch would choose: whoever is to use one uses it alone.
void Ways::leave_out_dead(Way &way) const {
  auto const is_dead = [&](Slot const &slot) {
    auto const uplink = uplinks_.find(slot.front());
    return uplink != uplinks_.end() && !uplink->second->is_watched();
  };
  bool const is_all = std::all_of(way.slots.begin(), way.slots.end(), is_dead);
  if (is_all || (!way.spreads_frames() && is_dead(way.slots.front()))) {
    way.slots.resize(1);
  } else {
    std::erase_if(way.slots, is_dead);
  }
}

Way const *Ways::of(Port const &port) const {
  auto const found = of_ports_.find(port.port);
  return found == of_ports_.end() ? nullptr : &ways_[found->second];
}

}  // namespace simhost::openvswitch
