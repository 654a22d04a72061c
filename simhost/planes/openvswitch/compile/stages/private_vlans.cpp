// The primary VLAN and the kind of each private VLAN, wherever a frame of it comes from.
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {

void compile_private_vlans(Plan const &plan, Program &program) {
  // Not by way of kDropped: flows of both results of a check of the size count each frame.
  program.add(table::kPrivateVlans, {.priority = 1000,
                                     .match = with_bits(Match(), field::kTooLarge, 1),
                                     .cookie = cookie(Counted::too_large)});
  for (auto const vlan : plan.common.private_vlans()) {
    auto const &kind = plan.common.kind_of(vlan);
    program.add(
        table::kPrivateVlans,
        {.priority = 100,
         .match = Match().with(field::kVlan, vlan),
         .actions = {openflow::set(field::kDomain, kind.domain),
                     openflow::set(field::kPrivateKind, static_cast<openflow::Value>(kind.kind)),
                     go_to(table::kOwnFrames)}});
  }
  program.add(table::kPrivateVlans,
              {.actions = {openflow::Move{.source = vlan_bits(field::kVlan),
                                          .destination = vlan_bits(field::kDomain)},
                           go_to(table::kOwnFrames)}});
}

}  // namespace simhost::openvswitch
