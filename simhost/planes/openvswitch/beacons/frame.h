// The frames that beacons are: of Ethernet's type for local experiments, to a group of the daemon's
// own, so that nobody's client takes them for anything.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "planes/openvswitch/beacons/hearing.h"
#include "planes/openvswitch/openflow/value.h"

namespace simhost::beacons {

inline constexpr std::uint16_t kEthernetType = 0x88b5;
/// Any daemon's group begins so.
inline constexpr openflow::EthernetAddress kGroups{0x03, 0x62, 0x63, 0, 0, 0};
inline constexpr openflow::Value kGroupsMask = openflow::ones(48) ^ openflow::ones(24);

/// What a daemon knows its beacons by: chosen at random, so that nobody else has it who has not
/// seen one.
using Key = std::array<std::uint8_t, 16>;

/// The group to which beacons with this key go.
openflow::EthernetAddress group_of(Key const &key);

struct Beacon {
  std::uint64_t of_switch = 0;
  Link link = 0;

  bool operator==(Beacon const &) const = default;
};

/// `port` makes the source another one for each device that sends the beacon.
std::vector<std::uint8_t> to_frame(Key const &key, Beacon const &beacon, std::uint16_t port);
/// Nothing for any other frame.
std::optional<Beacon> find_beacon(Key const &key, std::span<std::uint8_t const> frame);

}  // namespace simhost::beacons
