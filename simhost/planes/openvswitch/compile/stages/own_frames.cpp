// Frames of this switch that the network sends back, over another uplink than they took: an address
// that is here does not come from outside. Of addresses that are learned, or not known, the last
// second or two count, so that a client that moved to another host is soon heard there.
#include "planes/openvswitch/compile/own_addresses.h"
#include "planes/openvswitch/compile/stages/recent_sources.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

Match from_uplink() {
  return Match().with(field::kOrigin, kFromUplink);
}

// What goes out although its receiver is here has to come back.
bool never_returns(Port const &port) {
  return !port.transmits_by_uplink;
}

void drop_own(Program &program, std::uint16_t priority, Match const &match, Port const &port) {
  program.add(table::kOwnFrames, {.priority = priority,
                                  .match = match,
                                  .actions = drop(),
                                  .cookie = cookie(Counted::own_frame, port.number)});
}

void drop_fixed(Plan const &plan, Program &program, Actions const &others) {
  if (plan.network.addresses.fixed_ones_move) {
    return;
  }
  for (auto const &fixed : plan.fixed_places()) {
    auto const match = with_address(from_uplink(), Field::eth_src, fixed);
    if (fixed.port != nullptr && never_returns(*fixed.port)) {
      drop_own(program, 210, match, *fixed.port);
    } else {
      program.add(table::kOwnFrames, {.priority = 210, .match = match, .actions = others});
    }
  }
}

openflow::Action remember(Port const &port) {
  auto learn =
      recent_source(port.number, port.transmits_by_uplink ? Recent::is_on_way : Recent::drops);
  if (port.transmits_by_uplink) {
    learn.specs.emplace_back(
        openflow::LearnedLoad{.destination = openflow::part(field::kSender, 0, 15),
                              .content = openflow::Value{port.port}});
  }
  return learn;
}

// Of a port that sends from its known address only, nothing has to be remembered.
bool is_remembered(Port const &port) {
  return sends_frames(port) && (port.transmits_by_uplink || port.may_forge || !port.address);
}

void remember_at(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  if (is_remembered(port)) {
    program.add(table::kRemembering, {.priority = 100,
                                      .match = from(port.port),
                                      .actions = {remember(port), go_to(table::kLearning)},
                                      .cookie = cookie(Counted::port, port.number)});
  }
  if (!never_returns(port)) {
    return;
  }
  for (auto const &domains : plan.among_others.own_domains) {
    program.add(table::kRemembering,
                {.priority = 200,
                 .match = with_address(from(port.port), Field::eth_src, *port.address, domains),
                 .actions = {go_to(table::kLearning)},
                 .cookie = cookie(Counted::port, port.number)});
  }
}

}  // namespace

openflow::Learn recent_source(std::uint32_t number, Recent recent) {
  return {.table = table::kRecentSources,
          .priority = 100,
          .cookie = cookie(Counted::recent_source, number),
          .hard_timeout = 1,
          .deletes_learned = true,
          .specs = {in_domain(),
                    openflow::LearnedMatch{.field = openflow::whole(Field::eth_src),
                                           .content = openflow::whole(Field::eth_src)},
                    openflow::LearnedLoad{.destination = field::kRecent,
                                          .content = static_cast<openflow::Value>(recent)}}};
}

void compile_own_frames(Plan const &plan, Program &program) {
  Actions others{go_to(table::kMirroring)};
  if (plan.common.frames_may_return) {
    others.insert(others.begin(), go_to(table::kRecentSources));
    program.add(table::kOwnFrames, {.priority = 100, .match = from_uplink(), .actions = others});
    program.add(table::kMirroring, {.priority = 200,
                                    .match = with_bits(Match(), field::kRecent,
                                                       static_cast<openflow::Value>(Recent::drops)),
                                    .actions = drop(),
                                    .cookie = cookie(Counted::own_frame)});
    program.add(
        table::kRemembering,
        {.priority = 300, .match = questions(Match()), .actions = {go_to(table::kLearning)}});
  }
  drop_fixed(plan, program, others);
  program.add(table::kOwnFrames, {.actions = {go_to(table::kMirroring)}});
  program.add(table::kRemembering, {.actions = {go_to(table::kLearning)}});
}

void compile_own_frames(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  if (plan.common.frames_may_return) {
    remember_at(plan, program);
  }
  if (!never_returns(port)) {
    return;
  }
  for (auto const &domains : plan.among_others.own_domains) {
    drop_own(program, 200, with_address(from_uplink(), Field::eth_src, *port.address, domains),
             port);
  }
}

}  // namespace simhost::openvswitch
