// What ports and uplinks count of what is sent to them, and of what they are not let send.
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

template <typename Device>
void count_dropped(Program &program, Device const &device) {
  program.add(table::kDropped, {.priority = 100,
                                .match = from(device.port),
                                .cookie = cookie(Counted::dropped, device.number)});
}

template <typename Device>
void send(Program &program, Device const &device) {
  add_by_receivers(program, table::kSending,
                   {.priority = 100,
                    .match = Match().with(field::kReceiver, device.port),
                    .actions = {openflow::Output{.port = device.port}}},
                   {.one = Counted::out_unicast,
                    .several = Counted::out_multicast,
                    .all = Counted::out_broadcast},
                   device.number);
}

// The switch sends nothing back to where it came from, but would count it.
void keep_own_frames(Program &program, Port const &port) {
  program.add(table::kSending, {.priority = 200,
                                .match = from(port.port).with(field::kReceiver, port.port),
                                .cookie = cookie(Counted::port, port.number)});
}

}  // namespace

void compile_counting(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    count_dropped(program, uplink);
    if (!uplink.blocked) {
      send(program, uplink);
    }
  }
}

void compile_counting(PortPlan const &plan, Program &program) {
  count_dropped(program, plan.port);
  if (takes_frames(plan.common, plan.port) && plan.among_others.counts_sent) {
    keep_own_frames(program, plan.port);
    send(program, plan.port);
  }
}

}  // namespace simhost::openvswitch
