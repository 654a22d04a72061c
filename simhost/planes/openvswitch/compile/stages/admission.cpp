// What may come in at all.
#include "planes/openvswitch/beacons/frame.h"
#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

constexpr openflow::EthernetAddress kLinkLocal{0x01, 0x80, 0xc2, 0, 0, 0};
constexpr openflow::Value kLinkLocalMask = openflow::ones(48) ^ openflow::ones(4);
constexpr std::uint16_t kReservedVlan = 4095;

// The type of a frame's content is that of a tag where there are more of them than are looked at.
constexpr std::uint16_t kTagTypes[]{0x8100, 0x88a8};

void refuse(Program &program, std::uint16_t priority, Match const &match, std::uint64_t cookie) {
  program.add(table::kAdmission,
              {.priority = priority, .match = match, .actions = drop(), .cookie = cookie});
}

void refuse_malformed(Plan const &plan, Program &program) {
  auto const reserved = cookie(Counted::reserved);
  refuse(program, 900, Match().with(Field::eth_dst, openflow::to_value(kLinkLocal), kLinkLocalMask),
         reserved);
  refuse(program, 890, Match().with(Field::eth_src, kGroupBit, kGroupBit), reserved);
  refuse(program, 890, Match().with(Field::eth_src, 0), reserved);
  auto const too_many =
      has_use_for_second_tags(plan.network) ? reserved : cookie(Counted::nested_tag);
  for (auto const type : kTagTypes) {
    refuse(program, 880, Match().with(Field::eth_type, type), too_many);
  }
  refuse(program, 870, Match().vlan(kReservedVlan), reserved);
}

Match beacons_to(openflow::EthernetAddress const &group, openflow::Value mask) {
  return Match()
      .with(Field::eth_type, beacons::kEthernetType)
      .with(Field::eth_dst, openflow::to_value(group), mask);
}

// This switch's own go up, where they come in from outside; no other beacon goes any further.
void hear_beacons(Plan const &plan, Program &program) {
  refuse(program, 890, beacons_to(beacons::kGroups, beacons::kGroupsMask),
         cookie(Counted::reserved));
  if (!plan.network.beacons) {
    return;
  }
  auto const own = beacons_to(*plan.network.beacons, openflow::ones(48));
  for (auto const &uplink : plan.network.uplinks) {
    if (!uplink.blocked) {
      program.add(table::kAdmission, {.priority = 895,
                                      .match = Match(own).with(Field::in_port, uplink.port),
                                      .actions = {openflow::ToController{}},
                                      .cookie = cookie(Counted::port, uplink.number)});
    }
  }
}

void admit(Program &program, Uplink const &uplink) {
  auto const match = from(uplink.port);
  if (uplink.blocked) {
    refuse(program, 500, match, cookie(Counted::blocked, uplink.number));
    return;
  }
  program.add(table::kAdmission,
              {.priority = 500,
               .match = match,
               .actions = {openflow::set(field::kOrigin, kFromUplink), go_to(table::kSources)},
               .cookie = cookie(Counted::port, uplink.number)});
}

}  // namespace

void compile_admission(Plan const &plan, Program &program) {
  // All other rules stay as they are, with what they counted and what was learned.
  if (plan.network.disabled) {
    refuse(program, 1000, Match(), cookie(Counted::disabled));
  }
  refuse_malformed(plan, program);
  hear_beacons(plan, program);
  for (auto const &uplink : plan.network.uplinks) {
    admit(program, uplink);
  }
}

void compile_admission(PortPlan const &plan, Program &program) {
  auto const &port = plan.port;
  auto const match = from(port.port);
  if (!sends_frames(port)) {
    refuse(program, 500, match, cookie(Counted::blocked, port.number));
    return;
  }
  program.add(table::kAdmission, {.priority = 500,
                                  .match = match,
                                  .actions = {go_to(table::kSources)},
                                  .cookie = cookie(Counted::port, port.number)});
}

}  // namespace simhost::openvswitch
