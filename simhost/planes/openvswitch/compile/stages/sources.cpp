// From which addresses a client may send. One whose address is not known has the first that it
// sends from: a flow that is learned in a table of its own, where there is room for one of each
// port. Another table says that there is none left, as Open vSwitch forgets how frames went that
// were to be learned where there was no room, whenever it looks.
#include "planes/openvswitch/compile/stages/adding_up.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// In the VLAN of the port, unless in all.
void add_domain(Common const &common, Port const &port, openflow::Learn &learn) {
  if (!port.vlan.carried) {
    learn.specs.emplace_back(
        openflow::LearnedMatch{.field = vlan_bits(field::kDomain),
                               .content = openflow::Value{common.kind_of(port.vlan.vlan).domain}});
  }
}

openflow::Action learn_first_address(Common const &common, Port const &port) {
  openflow::Learn learn{
      .table = table::kFirstAddresses,
      .priority = 100,
      .cookie = cookie(Counted::first_address, port.number),
      .deletes_learned = true,
      .limit = 1,
      .result = field::kVerdict,
      .specs = {openflow::LearnedMatch{.field = openflow::whole(Field::eth_dst),
                                       .content = openflow::whole(Field::eth_src)},
                openflow::LearnedLoad{.destination = openflow::part(field::kDestination, 0, 15),
                                      .content = openflow::Value{port.port}}}};
  add_domain(common, port, learn);
  return learn;
}

// What goes with a first address: where that is to be learned anew, so is this.
openflow::Action learn_that_it_has_one(Common const &common, Port const &port) {
  openflow::Learn learn{.table = table::kPortsWithFirst,
                        .priority = 100,
                        .cookie = cookie(Counted::port_with_first, port.number),
                        .deletes_learned = true,
                        .specs = {openflow::LearnedMatch{.field = openflow::whole(Field::in_port),
                                                         .content = openflow::Value{port.port}},
                                  openflow::LearnedLoad{.destination = field::kHasFirst,
                                                        .content = openflow::Value{1}}}};
  add_domain(common, port, learn);
  return learn;
}

void drop_forged(Program &program, std::uint8_t where, Match const &match, Port const &port) {
  program.add(where, {.priority = 100,
                      .match = match,
                      .actions = drop(),
                      .cookie = cookie(Counted::forged, port.number)});
}

// Where it is known, which is all there is to go by when a frame is added up later.
Actions look_up_first(Common const &common, Port const &port) {
  Actions actions;
  if (!port.vlan.carried) {
    actions.push_back(openflow::set(field::kDomain, common.kind_of(port.vlan.vlan).domain));
  }
  if (!port.may_forge) {
    append(actions, look_up_source(table::kFirstAddresses));
  }
  append(actions, {go_to(table::kPortsWithFirst), go_to(table::kFirstAddress)});
  return actions;
}

// Whoever may send from any address is asked for the first one only.
void note_first_address(Common const &common, Program &program, Port const &port) {
  auto const at_port = from(port.port);
  program.add(table::kFirstAddress, {.priority = 150,
                                     .match = with_bits(at_port, field::kHasFirst, 1),
                                     .actions = {go_to(table::kTags)},
                                     .cookie = cookie(Counted::port, port.number)});
  program.add(table::kFirstAddress,
              {.priority = 100,
               .match = at_port,
               .actions = {learn_first_address(common, port), learn_that_it_has_one(common, port),
                           go_to(table::kTags)},
               .cookie = cookie(Counted::port, port.number)});
}

void judge_first_address(Common const &common, Program &program, Port const &port) {
  auto const at_port = from(port.port);
  program.add(table::kFirstAddress,
              {.priority = 200,
               .match = Match(at_port).with(field::kDestination, port.port),
               .actions = {openflow::set(field::kDestination, 0), go_to(table::kTags)},
               .cookie = cookie(Counted::port, port.number)});
  program.add(table::kFirstAddress,
              {.priority = 150,
               .match = with_bits(at_port, field::kHasFirst, 1),
               .actions = {openflow::set(field::kDestination, 0), go_to(table::kDropped)},
               .cookie = cookie(Counted::forged, port.number)});
  program.add(table::kFirstAddress,
              {.priority = 100,
               .match = at_port,
               .actions = {openflow::set(field::kDestination, 0), learn_first_address(common, port),
                           learn_that_it_has_one(common, port), does_it_add_up(),
                           go_to(table::kFirstOrForged)},
               .cookie = cookie(Counted::port, port.number)});
  drop_forged(program, table::kFirstOrForged, at_port, port);
}

// What the client's address is, whoever asks knows.
void ask_without_address(Program &program, Port const &port) {
  program.add(table::kSources, {.priority = 150,
                                .match = questions(from(port.port)),
                                .actions = {go_to(table::kTags)},
                                .cookie = cookie(Counted::first_address, port.number)});
  if (!port.may_forge) {
    program.add(table::kSources, {.priority = 160,
                                  .match = questions(from(port.port), kIsNotFirst),
                                  .actions = drop(),
                                  .cookie = cookie(Counted::forged, port.number)});
  }
}

void compile(Common const &common, Program &program, Port const &port) {
  auto const at_port = from(port.port);
  if (port.address_changed) {
    program.add(table::kSources, {.priority = 300,
                                  .match = at_port,
                                  .actions = drop(),
                                  .cookie = cookie(Counted::address_changed, port.number)});
  } else if (!port.address) {
    ask_without_address(program, port);
    program.add(table::kSources, {.priority = 100,
                                  .match = at_port,
                                  .actions = look_up_first(common, port),
                                  .cookie = cookie(Counted::port, port.number)});
    if (port.may_forge) {
      note_first_address(common, program, port);
    } else {
      judge_first_address(common, program, port);
    }
  } else if (!port.may_forge) {
    program.add(table::kSources,
                {.priority = 200,
                 .match = Match(at_port).with(Field::eth_src, openflow::to_value(*port.address)),
                 .actions = {go_to(table::kTags)},
                 .cookie = cookie(Counted::port, port.number)});
    drop_forged(program, table::kSources, at_port, port);
  }
}

}  // namespace

void compile_sources(Plan const & /*plan*/, Program &program) {
  program.add(table::kSources, {.actions = {go_to(table::kTags)}});
  program.add(table::kFirstAddress, {.actions = {go_to(table::kTags)}});
  // Known by the time it is added up, it was so before.
  auto const says = openflow::ones(1) << field::kVerdict.first;
  auto const adds_up = openflow::ones(1) << field::kAddsUp.first;
  program.add(table::kFirstOrForged, {.priority = 200,
                                      .match = Match().with(field::kFacts, says, says | adds_up),
                                      .actions = {go_to(table::kTags)}});
}

void compile_sources(PortPlan const &plan, Program &program) {
  if (sends_frames(plan.port)) {
    compile(plan.common, program, plan.port);
  }
}

}  // namespace simhost::openvswitch
