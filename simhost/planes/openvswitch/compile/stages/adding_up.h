// Open vSwitch lets the first frame of a kind pass all tables, and later passes them once more by
// itself, to add up the next ones and to see whether they still go where they went. Then no Learn
// tells whether it found room: what was learned does. And what frames said that came before others
// must not be learned after them.
#pragma once

#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// Writes kAddsUp: learns what there never is room for. Open vSwitch keeps no cached flow that did
/// this longer than frames of it come, so that sources that are known are not to be asked.
openflow::Action does_it_add_up();

/// Asks a table of addresses for the source: it writes kDestination.
Actions look_up_source(std::uint8_t table);

/// Goes to kLimits with a verdict about a source that may be learned where its frame comes in.
Actions learn_source();

/// The flow by which a place learns, and the one by which a source is known to be there: `learn`
/// writes kVerdict.
void teach(Program &program, Match const &here, openflow::Port place, openflow::Action learn,
           std::uint64_t cookie);

}  // namespace simhost::openvswitch
