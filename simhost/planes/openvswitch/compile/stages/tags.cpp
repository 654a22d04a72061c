// From the tags of frames to VLANs and priorities in registers.
#include <algorithm>
#include <optional>
#include <utility>

#include "planes/openvswitch/compile/stages/stages.h"

namespace simhost::openvswitch {
namespace {

using openflow::Field;

// In front of the packet, without tags.
constexpr std::uint16_t kHeader = 14;

enum class Tag { none, goes };

// The priority is the outermost tag's, unless the port has one of its own.
void take_priority(Actions &actions, std::optional<std::uint8_t> own, Tag tag) {
  if (own) {
    actions.emplace_back(openflow::set(field::kPriority, *own));
  } else if (tag != Tag::none) {
    actions.emplace_back(openflow::Move{.source = openflow::part(Field::vlan_tci, 13, 15),
                                        .destination = openflow::part(field::kPriority, 0, 2)});
  }
}

// Into a VLAN that the tag does not say.
Actions put_in(std::uint16_t vlan, std::optional<std::uint8_t> priority, Tag tag) {
  Actions actions;
  take_priority(actions, priority, tag);
  if (tag == Tag::goes) {
    actions.emplace_back(openflow::PopVlan{});
  }
  actions.emplace_back(openflow::set(field::kVlan, vlan));
  actions.push_back(go_to(table::kNestedTags));
  return actions;
}

// Likewise, but its tag stays, as the second one. Whether one more comes after it is seen when it
// is off.
Actions put_above_tag(std::uint16_t vlan, std::optional<std::uint8_t> priority) {
  Actions actions{openflow::Move{.source = openflow::part(Field::vlan_tci, 0, 15),
                                 .destination = openflow::part(field::kClientTag, 0, 15)}};
  take_priority(actions, priority, Tag::goes);
  append(actions,
         {openflow::PopVlan{}, openflow::set(field::kVlan, vlan), go_to(table::kClientTags)});
  return actions;
}

// Into the VLAN that it says.
Actions put_where_tagged(std::optional<std::uint8_t> priority) {
  Actions actions{openflow::Move{.source = openflow::part(Field::vlan_tci, 0, kVlanBits - 1),
                                 .destination = vlan_bits(field::kVlan)}};
  take_priority(actions, priority, Tag::goes);
  actions.emplace_back(openflow::PopVlan{});
  actions.push_back(go_to(table::kNestedTags));
  return actions;
}

class PortTags {
 public:
  PortTags(Program &program, Port const &port) : program_(program), port_(port) {}

  void take_untagged(std::uint16_t vlan) {
    auto const priority = port_.vlan.priority;
    add(200, at_port().untagged(), put_in(vlan, priority, Tag::none));
    add(200, at_port().vlan(0), put_in(vlan, priority, Tag::goes));
  }
  void take_as_second_tag(std::uint16_t vlan) {
    add(100, at_port().tagged(), put_above_tag(vlan, port_.vlan.priority));
  }
  void take_tagged(VlanMask const &mask) {
    add(100, at_port().vlan(mask.vlan, mask.mask), put_where_tagged(port_.vlan.priority));
  }
  void drop_priority_tagged() { drop_frames(200, at_port().vlan(0)); }
  void drop_others() { drop_frames(50, at_port()); }

 private:
  [[nodiscard]] Match at_port() const { return from(port_.port); }
  void add(std::uint16_t priority, Match const &match, Actions actions) {
    program_.add(table::kTags, {.priority = priority,
                                .match = match,
                                .actions = std::move(actions),
                                .cookie = cookie(Counted::port, port_.number)});
  }
  void drop_frames(std::uint16_t priority, Match const &match) {
    program_.add(table::kTags, {.priority = priority,
                                .match = match,
                                .actions = drop(),
                                .cookie = cookie(Counted::wrong_tag, port_.number)});
  }

  Program &program_;
  Port const &port_;
};

void compile_access(PortTags &tags, PortVlan const &vlan) {
  tags.take_untagged(vlan.vlan);
  // Without a tag of its own outside, a frame's second tag would be its first.
  if (vlan.nested && vlan.vlan != 0) {
    tags.take_as_second_tag(vlan.vlan);
  }
}

void compile_trunk(PortTags &tags, PortVlan const &vlan) {
  auto const carried = carried_by(vlan);
  if (carried.untagged) {
    tags.take_untagged(*carried.untagged);
  } else {
    tags.drop_priority_tagged();
  }
  // A tag may also say the VLAN of frames without one.
  for (auto const &mask : masks_of(*vlan.carried)) {
    tags.take_tagged(mask);
  }
}

void compile_port(Common const &common, Program &program, Port const &port) {
  PortTags tags(program, port);
  if (has_vlan(common, port)) {
    if (port.vlan.carried) {
      compile_trunk(tags, port.vlan);
    } else {
      compile_access(tags, port.vlan);
    }
  }
  tags.drop_others();
}

void compile_uplinks(Program &program) {
  auto const from_uplink = Match().with(field::kOrigin, kFromUplink);
  program.add(table::kTags, {.priority = 10,
                             .match = Match(from_uplink).tagged(),
                             .actions = put_where_tagged(std::nullopt)});
  program.add(table::kTags, {.priority = 10,
                             .match = Match(from_uplink).untagged(),
                             .actions = {go_to(table::kNestedTags)}});
}

void compile_client_tags(Program &program) {
  program.add(table::kClientTags, {.priority = 100,
                                   .match = Match().tagged(),
                                   .actions = drop(),
                                   .cookie = cookie(Counted::nested_tag)});
  program.add(table::kClientTags,
              {.actions = {openflow::PushVlan{},
                           openflow::Move{.source = vlan_bits(field::kClientTag),
                                          .destination = openflow::whole(Field::vlan_vid)},
                           openflow::Move{.source = openflow::part(field::kClientTag, 13, 15),
                                          .destination = openflow::whole(Field::vlan_pcp)},
                           go_to(table::kNestedTags)}});
}

// While the tag is off, for some data paths count it as a part of the packet.
openflow::Action check_size(Common const &common) {
  return openflow::CheckPacketLarger{.bytes = static_cast<std::uint16_t>(common.mtu + kHeader),
                                     .result = field::kTooLarge};
}

void compile_nested_tags(Plan const &plan, Program &program) {
  program.add(table::kNestedTags, {.priority = 300,
                                   .match = Match().with(field::kVlan, 0).tagged(),
                                   .actions = drop(),
                                   .cookie = cookie(Counted::nested_tag)});
  auto const from_others =
      has_use_for_second_tags(plan.network) ? Match().with(field::kOrigin, kFromClient) : Match();
  program.add(table::kNestedTags, {.priority = 100,
                                   .match = Match(from_others).tagged(),
                                   .actions = drop(),
                                   .cookie = cookie(Counted::nested_tag)});
  program.add(table::kNestedTags,
              {.actions = {check_size(plan.common), go_to(table::kPrivateVlans)}});
}

void take_second_tag(Common const &common, Program &program, Port const &port) {
  program.add(table::kNestedTags, {.priority = 200,
                                   .match = from(port.port).tagged(),
                                   .actions = {check_size(common), go_to(table::kPrivateVlans)},
                                   .cookie = cookie(Counted::port, port.number)});
}

}  // namespace

bool has_use_for_second_tags(Network const &network) {
  return !network.mirrors.empty() ||
         std::ranges::any_of(network.ports, [](Port const &port) { return port.vlan.nested; });
}

void compile_tags(Plan const &plan, Program &program) {
  compile_uplinks(program);
  compile_client_tags(program);
  compile_nested_tags(plan, program);
}

void compile_tags(PortPlan const &plan, Program &program) {
  if (!sends_frames(plan.port)) {
    return;
  }
  compile_port(plan.common, program, plan.port);
  if (plan.port.vlan.nested) {
    take_second_tag(plan.common, program, plan.port);
  }
}

}  // namespace simhost::openvswitch
