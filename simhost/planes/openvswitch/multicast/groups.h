// Where frames of groups are wanted.
#pragma once

#include <compare>
#include <cstdint>
#include <vector>

#include "planes/openvswitch/multicast/address.h"

namespace simhost::multicast {

/// A port in one of its VLANs.
struct Place {
  std::uint32_t port = 0;  ///< its number of the switch
  std::uint16_t vlan = 0;  ///< the primary one of a private VLAN

  friend auto operator<=>(Place const &, Place const &) = default;
};

/// From whom frames are wanted: from those sources, or from all others.
struct Sources {
  bool are_excluded = false;
  std::vector<Address> listed{};  ///< in their order

  friend auto operator<=>(Sources const &, Sources const &) = default;
};

struct Member {
  std::uint32_t port = 0;
  Sources sources;

  friend auto operator<=>(Member const &, Member const &) = default;
};

struct Group {
  std::uint16_t vlan = 0;
  Address address;
  std::vector<Member> members;  ///< in the order of their ports

  friend auto operator<=>(Group const &, Group const &) = default;
};

/// A router wants all groups of its family.
struct Router {
  Place place;
  Family family{};

  friend auto operator<=>(Router const &, Router const &) = default;
};

/// All of them in their order.
struct Groups {
  std::vector<Group> groups{};
  std::vector<Router> routers{};
  std::vector<Place> undecided{};  ///< whose clients had no time yet to say what they want

  friend auto operator<=>(Groups const &, Groups const &) = default;
};

}  // namespace simhost::multicast
