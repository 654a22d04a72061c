// Matches with the known addresses of clients.
#pragma once

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// A match with an address as what `field` says, source or destination, in the VLANs that it is
/// known in.
inline Match with_address(Match match, openflow::Field field, OwnAddress const &own) {
  match.with(field, openflow::to_value(own.address));
  if (own.domain) {
    match.with(field::kDomain, *own.domain);
  }
  return match;
}

}  // namespace simhost::openvswitch
