// Where addresses are: the switch learns them by itself, up to the limits of ports and of the
// uplinks. The limit of the switch is that of the table.
#include <algorithm>
#include <utility>

#include "planes/openvswitch/compile/own_addresses.h"
#include "planes/openvswitch/compile/stages/adding_up.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// In seconds: what a data path has not used for longer, it has no more, and nothing of it is to be
// added up.
constexpr std::uint16_t kLongestUnadded = 15;

// At a port: somebody may send from one address after the other.
constexpr std::uint32_t kMostRefused = 100;

openflow::Action learn(Common const &common, std::uint32_t number, openflow::Port place,
                       std::uint32_t limit) {
  return openflow::Learn{
      .table = table::kLearnedAddresses,
      .priority = 100,
      .cookie = cookie(Counted::learned, number),
      .hard_timeout = common.hard_timeout(),
      .deletes_learned = true,
      .limit = limit,
      .result = field::kVerdict,
      .specs = {in_domain(),
                openflow::LearnedMatch{.field = openflow::whole(Field::eth_dst),
                                       .content = openflow::whole(Field::eth_src)},
                openflow::LearnedLoad{.destination = openflow::part(field::kDestination, 0, 15),
                                      .content = openflow::Value{place}}}};
}

void add(Program &program, std::uint8_t where, std::uint16_t priority, Match const &match,
         Actions actions, std::uint32_t number) {
  program.add(where, {.priority = priority,
                      .match = match,
                      .actions = std::move(actions),
                      .cookie = cookie(Counted::port, number)});
}

// An address that stays where it is teaches nothing.
void pass_over_fixed(Plan const &plan, Program &program) {
  for (auto const &fixed : plan.fixed_places()) {
    add(program, table::kLearning, 210, with_address(Match(), Field::eth_src, fixed),
        {go_to(table::kLookup)}, 0);
  }
}

void pass_over_own(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  for (auto const &domains : plan.among_others.own_domains) {
    add(program, table::kLearning, 200,
        with_address(Match(), Field::eth_src, *port.address, domains), {go_to(table::kLookup)},
        port.number);
  }
}

// One that moves when it is seen elsewhere moves back when it is seen here.
void learn_own_again(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  for (auto const &domains : plan.among_others.own_domains) {
    auto const match = with_address(from(port.port), Field::eth_src, *port.address, domains);
    add(program, table::kLearning, 220, questions(match), {go_to(table::kLookup)}, port.number);
    add(program, table::kLearning, 200, match,
        {learn(plan.common, port.number, port.port, 0), go_to(table::kLookup)}, port.number);
  }
}

// A table that is full, unlike a limit of a port, does not tell: so those of the switch are counted
// once more, where all have one cookie. Here they are looked up as sources, not as destinations:
// how long nobody asked for one says when it was seen last.
openflow::Action count_for_switch(Plan const &plan) {
  return openflow::Learn{
      .table = table::kCountedSources,
      .priority = 100,
      .cookie = cookie(Counted::counted_source),
      .hard_timeout = plan.common.hard_timeout(),
      .deletes_learned = true,
      .limit = plan.network.addresses.limit,
      .result = field::kVerdict,
      .specs = {
          in_domain(),
          openflow::LearnedMatch{.field = openflow::whole(Field::eth_src),
                                 .content = openflow::whole(Field::eth_src)},
          openflow::LearnedLoad{.destination = field::kIsCounted, .content = openflow::Value{1}}}};
}

// Whether there is room for a source, whoever asks knows.
void ask(Program &program, Match const &match, std::uint32_t number) {
  program.add(table::kLearning, {.priority = 150,
                                 .match = questions(match),
                                 .actions = {go_to(table::kLookup)},
                                 .cookie = cookie(Counted::learned, number)});
}

// A source that has no room by the time its frames are added up had none.
void take_room(Plan const &plan, Program &program) {
  auto const count = count_for_switch(plan);
  program.add(table::kTakingRoom, {.priority = 100,
                                   .match = with_bits(Match(), field::kIsCounted, 1),
                                   .actions = {count, go_to(table::kLookup)}});
  program.add(table::kTakingRoom, {.actions = {openflow::load(field::kAddsUp, 0), count,
                                               does_it_add_up(), go_to(table::kSwitchLimit)}});
  program.add(table::kSwitchLimit,
              {.priority = 200,
               .match = with_bits(Match(), field::kAddsUp, 1),
               .actions = {openflow::load(field::kAddsUp, 0), openflow::load(field::kVerdict, 0),
                           go_to(table::kSwitchLimit)}});
}

// What is learned tells nothing of an address that is elsewhere: it may have moved there since, or
// have come there because there was no room for it here.
openflow::Action remember_refused(Port const &port) {
  return openflow::Learn{
      .table = table::kRefusedSources,
      .priority = 100,
      .cookie = cookie(Counted::refused_source, port.number),
      .hard_timeout = kLongestUnadded,
      .deletes_learned = true,
      .limit = kMostRefused,
      .specs = {
          openflow::LearnedMatch{.field = openflow::whole(Field::in_port),
                                 .content = openflow::Value{port.port}},
          in_domain(),
          openflow::LearnedMatch{.field = openflow::whole(Field::eth_src),
                                 .content = openflow::whole(Field::eth_src)},
          openflow::LearnedLoad{.destination = field::kVerdict, .content = openflow::Value{0}}}};
}

void judge(Program &program, std::uint8_t where, Port const &port, Actions actions) {
  bool const allows = port.learning->when_full == WhenFull::allow;
  append(actions, allows ? Actions{go_to(table::kLookup)} : drop());
  program.add(where, {.priority = 100,
                      .match = with_bits(from(port.port), field::kVerdict, 0),
                      .actions = std::move(actions),
                      .cookie = cookie(allows ? Counted::limit_allowed : Counted::limit_dropped,
                                       port.number)});
}

void learn_at(Common const &common, Program &program, Port const &port) {
  bool const may_have_some = port.learning->limit != 0 && common.addresses.limit != 0;
  if (may_have_some) {
    add(program, table::kLearning, 100, from(port.port), learn_source(), port.number);
    teach(program, from(port.port), port.port,
          learn(common, port.number, port.port, port.learning->limit),
          cookie(Counted::port, port.number));
    ask(program, from(port.port), port.number);
    add(program, table::kLearning, 160, questions(from(port.port), kHasNoRoom),
        {openflow::load(field::kVerdict, 0), go_to(table::kSwitchLimit)}, port.number);
  } else {
    add(program, table::kLearning, 100, from(port.port),
        {openflow::load(field::kVerdict, 0), go_to(table::kLimits)}, port.number);
  }
  judge(program, table::kLimits, port, may_have_some ? Actions{remember_refused(port)} : Actions());
  judge(program, table::kSwitchLimit, port, {});
}

bool learns(Network const &network) {
  auto const &addresses = network.addresses;
  return addresses.aging != 0 && addresses.limit != 0 &&
         ((addresses.uplink_limit != 0 && !network.uplinks.empty()) ||
          std::ranges::any_of(network.ports,
                              [](Port const &port) { return port.learning.has_value(); }));
}

void learn_beyond(Plan const &plan, Program &program) {
  add(program, table::kLearning, 300,
      with_bits(Match(), field::kRecent, static_cast<openflow::Value>(Recent::is_on_way)),
      {go_to(table::kLookup)}, 0);
  auto const &addresses = plan.network.addresses;
  if (addresses.uplink_limit != 0 && addresses.limit != 0) {
    auto const learn_from = [&](Match const &match, openflow::Port place) {
      ask(program, match, 0);
      add(program, table::kLearning, 100, match, learn_source(), 0);
      teach(program, match, place, learn(plan.common, 0, place, addresses.uplink_limit),
            cookie(Counted::port));
    };
    // What is not learned takes no room of the switch.
    program.add(table::kLimits,
                {.priority = 100,
                 .match = with_bits(Match().with(field::kOrigin, kFromUplink), field::kVerdict, 0),
                 .actions = {go_to(table::kLookup)}});
    if (plan.network.is_mesh()) {
      for (auto const &tunnel : plan.network.uplinks) {
        learn_from(from(tunnel.port), tunnel.port);
      }
    } else {
      learn_from(Match().with(field::kOrigin, kFromUplink), kBeyond);
    }
  }
}

}  // namespace

void compile_learning(Plan const &plan, Program &program) {
  auto const &addresses = plan.network.addresses;
  if (addresses.aging != 0) {
    if (!addresses.fixed_ones_move) {
      pass_over_fixed(plan, program);
    }
    if (!plan.network.uplinks.empty()) {
      learn_beyond(plan, program);
    }
  }
  program.add(table::kLearning, {.actions = {go_to(table::kLookup)}});
  if (learns(plan.network)) {
    program.add(table::kLimits,
                {.actions = {go_to(table::kCountedSources), go_to(table::kTakingRoom)}});
    take_room(plan, program);
    program.add(table::kSwitchLimit, {.actions = {go_to(table::kLookup)}});
  }
}

void compile_learning(PortPlan const &plan, Program &program) {
  auto const &addresses = plan.common.addresses;
  if (addresses.aging == 0) {
    return;
  }
  if (addresses.fixed_ones_move) {
    learn_own_again(plan, program);
  } else {
    pass_over_own(plan, program);
  }
  if (sends_frames(plan.port) && plan.port.learning) {
    learn_at(plan.common, program, plan.port);
  }
}

}  // namespace simhost::openvswitch
