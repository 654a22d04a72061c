// The stages of the pipeline in the order in which a frame passes them. Each adds the rules of its
// own tables.
#pragma once

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

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
void compile_delivery(Plan const &plan, Program &program);
void compile_teams(Plan const &plan, Program &program);
void compile_mirrors(Plan const &plan, Program &program);
void compile_remote_mirrors(Plan const &plan, Program &program);
void compile_counting(Plan const &plan, Program &program);

}  // namespace simhost::openvswitch
