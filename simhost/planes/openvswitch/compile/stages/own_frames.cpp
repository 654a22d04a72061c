// Frames of this switch that the network sends back, over another uplink than they took: a client's
// own address does not come from outside. Of addresses that are learned, or not known, the last
// second or two count, so that a client that moved to another host is soon heard there.
#include "planes/openvswitch/compile/stages/own_addresses.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

Match from_uplink() {
  return Match().with(field::kOrigin, kFromUplink);
}

void drop_known(Program &program, OwnAddress const &own) {
  program.add(table::kOwnFrames, {.priority = 200,
                                  .match = with_address(from_uplink(), Field::eth_src, own),
                                  .actions = drop(),
                                  .cookie = cookie(Counted::own_frame, own.port->number)});
}

}  // namespace

void compile_own_frames(Plan const &plan, Program &program) {
  for (auto const &own : plan.own_addresses()) {
    // What goes out although its receiver is here has to come back.
    if (!own.port->transmits_by_uplink) {
      drop_known(program, own);
    }
  }
  if (plan.frames_may_return()) {
    program.add(table::kOwnFrames,
                {.priority = 100,
                 .match = from_uplink(),
                 .actions = {go_to(table::kRecentSources), go_to(table::kMirroring)}});
    program.add(table::kMirroring, {.priority = 200,
                                    .match = with_bits(Match(), field::kRecent,
                                                       static_cast<openflow::Value>(Recent::drops)),
                                    .actions = drop(),
                                    .cookie = cookie(Counted::own_frame)});
  }
  program.add(table::kOwnFrames, {.actions = {go_to(table::kMirroring)}});
}

}  // namespace simhost::openvswitch
