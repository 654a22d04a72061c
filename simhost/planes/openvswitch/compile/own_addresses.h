// Matches with addresses that are known.
#pragma once

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// A match with an address as what `field` says, source or destination, in VLANs that it is known
/// in.
inline Match with_address(Match match, openflow::Field field, EthernetAddress const &address,
                          VlanMask const &domains) {
  match.with(field, openflow::to_value(address));
  if (domains.mask == kWholeVlan) {
    return match.with(field::kDomain, domains.vlan);
  }
  return match.with(field::kDomain, domains.vlan, domains.mask);
}
inline Match with_address(Match match, openflow::Field field, FixedPlace const &fixed) {
  return match.with(field, openflow::to_value(fixed.address)).with(field::kDomain, fixed.domain);
}

}  // namespace simhost::openvswitch
