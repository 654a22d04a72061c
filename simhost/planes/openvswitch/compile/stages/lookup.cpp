// Where a frame's destination is.
#include <utility>

#include "planes/openvswitch/compile/own_addresses.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// The later table of two that know an address has the last word.
Actions look_up(Addresses const &addresses, std::uint8_t next) {
  Actions actions;
  if (addresses.fixed_ones_move) {
    append(actions, {go_to(table::kFirstAddresses), go_to(table::kFixedAddresses),
                     go_to(table::kLearnedAddresses)});
  } else {
    // A client may have been seen beyond the uplinks before it came.
    append(actions, {go_to(table::kLearnedAddresses), go_to(table::kFirstAddresses),
                     go_to(table::kFixedAddresses)});
  }
  actions.push_back(go_to(next));
  return actions;
}

template <typename Device>
void let_in(Program &program, Device const &device, Actions const &actions) {
  add_by_receivers(program, table::kLookup,
                   {.priority = 100, .match = from(device.port), .actions = actions}, kLetIn,
                   device.number);
}

void put(Program &program, std::uint16_t priority, Match match, openflow::Port place,
         std::uint32_t number) {
  program.add(table::kFixedAddresses, {.priority = priority,
                                       .match = std::move(match),
                                       .actions = {openflow::set(field::kDestination, place)},
                                       .cookie = cookie(Counted::port, number)});
}

void put(Program &program, FixedPlace const &fixed) {
  auto const match = with_address(Match(), Field::eth_dst, fixed);
  if (fixed.port != nullptr) {
    put(program, 300, match, fixed.port->port, fixed.port->number);
  } else {
    put(program, 300, match, fixed.is_beyond ? kBeyond : kNowhere, 0);
  }
}

}  // namespace

void compile_lookup(Plan const &plan, Program &program) {
  for (auto const &uplink : plan.network.uplinks) {
    if (!uplink.blocked) {
      let_in(program, uplink, look_up(plan.network.addresses, table::kReceiving));
    }
  }
  for (auto const &fixed : plan.fixed_places()) {
    put(program, fixed);
  }
}

void compile_lookup(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  if (sends_frames(port)) {
    let_in(program, port, look_up(plan.common.addresses, table::kDispatch));
  }
  for (auto const &domains : plan.among_others.own_domains) {
    put(program, 200, with_address(Match(), Field::eth_dst, *port.address, domains), port.port,
        port.number);
  }
}

}  // namespace simhost::openvswitch
