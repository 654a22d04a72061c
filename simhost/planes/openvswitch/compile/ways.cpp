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
static_assert((kGreatestPort + 1) * kMostInSlot < kOwnTeams);
static_assert(kOwnTeams + kGreatestPort < kSendingGroups);

// Where a port begins: at a slot of those in use, and at an uplink of each slot.
struct Begin {
  std::uint32_t slot = 0;
  std::uint32_t uplink = 0;
};

bool chooses_by_port(Team const &team) {
  return team.balance == Balance::first || team.balance == Balance::share;
}

Begin begin_of(Team const &team, std::uint32_t share) {
  Begin begin;
  if (team.balance == Balance::share) {
    begin.slot = share % static_cast<std::uint32_t>(team.in_use.size());
  }
  if (chooses_by_port(team)) {
    begin.uplink = share % static_cast<std::uint32_t>(team.in_use[begin.slot].size());
  }
  return begin;
}

template <typename Values>
void rotate(Values &values, std::uint32_t by) {
  auto const first = static_cast<std::ptrdiff_t>(by % values.size());
  std::rotate(values.begin(), values.begin() + first, values.end());
}

std::vector<Slot> slots_of(Team const &team, Begin const &begin) {
  auto slots = team.in_use;
  if (chooses_by_port(team)) {
    rotate(slots, begin.slot);
    slots.insert(slots.end(), team.standby.begin(), team.standby.end());
    for (auto &slot : slots) {
      rotate(slot, begin.uplink);
    }
  }
  return slots;
}

std::uint32_t number_of(Port const &port, Begin const &begin) {
  return port.team == 0 ? begin.slot * kMostInSlot + begin.uplink + 1 : kOwnTeams + port.port;
}

}  // namespace

openflow::Port name_of(Slot const &slot) {
  return *std::min_element(slot.begin(), slot.end());
}

Ways::Ways(Network const &network) {
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
          .slots = slots_of(team, begin)};
  auto const same = std::find_if(ways_.begin(), ways_.end(), [&](Way const &other) {
    return other.balance == way.balance && other.slots == way.slots;
  });
  of_ports_[port.port] = static_cast<std::size_t>(same - ways_.begin());
  if (same == ways_.end()) {
    ways_.push_back(std::move(way));
  }
}

Way const *Ways::of(Port const &port) const {
  auto const found = of_ports_.find(port.port);
  return found == of_ports_.end() ? nullptr : &ways_[found->second];
}

}  // namespace simhost::openvswitch
