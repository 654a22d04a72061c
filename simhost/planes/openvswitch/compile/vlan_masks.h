// Sets of VLANs as few matches.
#pragma once

#include <cstdint>
#include <vector>

#include "planes/openvswitch/compile/network.h"

namespace simhost::openvswitch {

/// In a VlanMask: all of them count.
inline constexpr std::uint16_t kWholeVlan = 0xfff;

/// VLANs whose numbers have some bits in common.
struct VlanMask {
  std::uint16_t vlan;
  std::uint16_t mask;  ///< the bits that count

  friend bool operator==(VlanMask const &, VlanMask const &) = default;
};

/// The VLANs of a set, 0 left out, in rising order. The masks may hold 0 and 4095 as well: what
/// asks them has dealt with frames without a VLAN before, and 4095 is none.
std::vector<VlanMask> masks_of(Vlans const &vlans);
/// Likewise with 0, which is in a mask only if it is in the set.
std::vector<VlanMask> masks_with_0_of(Vlans const &vlans);

}  // namespace simhost::openvswitch
