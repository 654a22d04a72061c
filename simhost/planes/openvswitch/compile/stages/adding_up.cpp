// A table that holds a flow, and may hold no more.
#include "planes/openvswitch/compile/stages/adding_up.h"

#include <utility>

#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// In seconds: longer than it takes Open vSwitch to add up what came before.
constexpr std::uint16_t kJustNow = 3;

openflow::Action remember_moved(openflow::Value just_moved) {
  return openflow::Learn{
      .table = table::kMovedSources,
      .priority = 100,
      .cookie = cookie(Counted::moved_source),
      .hard_timeout = kJustNow,
      .deletes_learned = true,
      .specs = {in_domain(),
                openflow::LearnedMatch{.field = openflow::whole(Field::eth_src),
                                       .content = openflow::whole(Field::eth_src)},
                openflow::LearnedLoad{.destination = field::kStays, .content = openflow::Value{1}},
                openflow::LearnedLoad{.destination = field::kJustMoved, .content = just_moved}}};
}

// A source that nobody knows was refused, or has aged. One that is elsewhere was learned when its
// frame came, or is remembered as one that was not.
void judge_what_adds_up(Program &program) {
  auto const adds_up = with_bits(Match(), field::kAddsUp, 1);
  program.add(table::kAddingUp,
              {.priority = 200,
               .match = Match(adds_up).with(field::kDestination, 0),
               .actions = {go_to(table::kTeaching), openflow::load(field::kVerdict, 0),
                           go_to(table::kLimits)}});
  program.add(table::kAddingUp,
              {.priority = 100,
               .match = adds_up,
               .actions = {openflow::set(field::kDestination, 0), go_to(table::kMovedSources),
                           go_to(table::kTeaching), openflow::load(field::kVerdict, 1),
                           go_to(table::kRefusedSources), go_to(table::kLimits)},
               .cookie = cookie(Counted::adding_up)});
}

void judge_frames(Program &program) {
  program.add(table::kAddingUp,
              {.priority = 150,
               .match = with_bits(Match().with(field::kDestination, 0), field::kAddsUp, 0),
               .actions = {go_to(table::kTeaching), go_to(table::kLimits)}});
  program.add(table::kAddingUp,
              {.actions = {openflow::set(field::kDestination, 0), go_to(table::kTeaching),
                           remember_moved(1), go_to(table::kLimits)}});
}

// The table changes with the first thing that is added up, so that Open vSwitch looks once more at
// all that came from where the source was: it keeps nothing of which no more frames have come, and
// the next one is heard if the source comes back.
void keep_moved(Program &program) {
  auto const stays = openflow::ones(1) << field::kStays.first;
  auto const just_moved = openflow::ones(1) << field::kJustMoved.first;
  program.add(table::kTeaching,
              {.priority = 210,
               .match = Match().with(field::kFacts, stays | just_moved, stays | just_moved),
               .actions = {remember_moved(0)}});
  program.add(table::kTeaching, {.priority = 200, .match = with_bits(Match(), field::kStays, 1)});
}

}  // namespace

openflow::Action does_it_add_up() {
  auto const origin = openflow::whole(field::kOrigin);
  return openflow::Learn{.table = table::kAddingUp,
                         .cookie = cookie(Counted::adding_up),
                         .limit = 1,
                         .result = field::kAddsUp,
                         .specs = {openflow::LearnedMatch{.field = origin, .content = origin}}};
}

Actions look_up_source(std::uint8_t table) {
  auto const destination = openflow::whole(Field::eth_dst);
  return {openflow::Push{destination},
          openflow::Move{.source = openflow::whole(Field::eth_src), .destination = destination},
          go_to(table), openflow::Pop{destination}};
}

Actions learn_source() {
  auto actions = look_up_source(table::kLearnedAddresses);
  actions.push_back(go_to(table::kSourcePlaces));
  return actions;
}

void teach(Program &program, Match const &here, openflow::Port place, openflow::Action learn,
           std::uint64_t cookie) {
  program.add(table::kSourcePlaces,
              {.priority = 200,
               .match = Match(here).with(field::kDestination, place),
               .actions = {openflow::set(field::kDestination, 0), go_to(table::kTeaching),
                           openflow::load(field::kVerdict, 1), go_to(table::kLimits)},
               .cookie = cookie});
  program.add(table::kTeaching,
              {.priority = 100, .match = here, .actions = {std::move(learn)}, .cookie = cookie});
}

void compile_adding_up(Plan const & /*plan*/, Program &program) {
  program.add(table::kSourcePlaces, {.actions = {does_it_add_up(), go_to(table::kAddingUp)}});
  judge_what_adds_up(program);
  judge_frames(program);
  keep_moved(program);
}

}  // namespace simhost::openvswitch
