// The stages of the pipeline in the order in which a frame passes them. Each adds the rules of its
// own tables: those of the switch, or those that one port has for itself.
#pragma once

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

/// Whether a port takes frames with a second tag, or a mirror session may copy them, or put a tag
/// above another. Where nobody does, Open vSwitch is to tell one tag apart: while it tells two, a
/// flow that it remembers of a frame with one passes all that differ from that by a second one.
bool has_use_for_second_tags(Network const &network);

void compile_admission(Plan const &plan, Program &program);
void compile_sources(Plan const &plan, Program &program);
void compile_tags(Plan const &plan, Program &program);
void compile_private_vlans(Plan const &plan, Program &program);
void compile_own_frames(Plan const &plan, Program &program);
void compile_adding_up(Plan const &plan, Program &program);
void compile_learning(Plan const &plan, Program &program);
void compile_lookup(Plan const &plan, Program &program);
void compile_receiving(Plan const &plan, Program &program);
void compile_dispatch(Plan const &plan, Program &program);
void compile_groups(Plan const &plan, Program &program);
void compile_lists(Plan const &plan, Program &program);
void compile_teams(Plan const &plan, Program &program);
void compile_mirrors(Plan const &plan, Program &program);
void compile_remote_mirrors(Plan const &plan, Program &program);
void compile_counting(Plan const &plan, Program &program);

void compile_admission(PortPlan const &plan, Program &program);
void compile_sources(PortPlan const &plan, Program &program);
void compile_tags(PortPlan const &plan, Program &program);
void compile_own_frames(PortPlan const &plan, Program &program);
void compile_mirrors(PortPlan const &plan, Program &program);
void compile_learning(PortPlan const &plan, Program &program);
void compile_lookup(PortPlan const &plan, Program &program);
void compile_dispatch(PortPlan const &plan, Program &program);
void compile_delivery(PortPlan const &plan, Program &program);
void compile_teams(PortPlan const &plan, Program &program);
void compile_counting(PortPlan const &plan, Program &program);

}  // namespace simhost::openvswitch
