// The flows and groups of a switch as they are put together.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/openflow/action.h"
#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/group.h"
#include "planes/openvswitch/openflow/match.h"

namespace simhost::openvswitch {

using openflow::Actions;
using openflow::Match;

/// What a flow does, and what it counts.
struct Rule {
  std::uint16_t priority = 0;
  Match match = {};
  Actions actions = {};  ///< none: nothing more becomes of the frame here
  std::uint64_t cookie = 0;
};

class Program {
 public:
  void add(std::uint8_t table, Rule rule);
  void add(openflow::Group group) { groups_.push_back(std::move(group)); }

  /// In no order: to sort all of a switch takes as long as all stages.
  std::vector<openflow::Flow> take_flows() { return std::move(flows_); }
  /// In their order.
  std::vector<openflow::Group> take_groups();

 private:
  std::vector<openflow::Flow> flows_;
  std::vector<openflow::Group> groups_;
};

inline openflow::Action go_to(std::uint8_t table) {
  return openflow::Resubmit{.table = table};
}

/// For a frame that is not let in.
inline Actions drop() {
  return {go_to(table::kDropped)};
}

/// `more` after `actions`.
inline Actions &append(Actions &actions, Actions const &more) {
  actions.insert(actions.end(), more.begin(), more.end());
  return actions;
}

/// The bits of a register that hold a VLAN.
inline openflow::SubField vlan_bits(openflow::Field field) {
  return {.field = field, .first = 0, .bits = kVlanBits};
}

/// In a flow that is learned: frames of the VLAN of the one that teaches.
inline openflow::LearnedMatch in_domain() {
  return {.field = vlan_bits(field::kDomain), .content = vlan_bits(field::kDomain)};
}

/// Frames that come in at a device.
inline Match from(openflow::Port port) {
  return Match().with(openflow::Field::in_port, port);
}

/// A match with some bits of a field.
inline Match with_bits(Match match, openflow::SubField bits, openflow::Value value) {
  match.with(bits.field, value << bits.first, openflow::ones(bits.bits) << bits.first);
  return match;
}

/// Frames that are questions.
inline Match questions(Match match) {
  match.with(openflow::Field::pkt_mark, kQuestion, kQuestionBits);
  return match;
}
/// Likewise those of which that is known: kHasNoRoom or kIsNotFirst.
inline Match questions(Match match, std::uint32_t known) {
  match.with(openflow::Field::pkt_mark, kQuestion | known, kQuestionBits | known);
  return match;
}

/// Of an address: it is that of many.
inline constexpr openflow::Value kGroupBit = openflow::Value{1} << 40U;

/// A match with frames to more than one receiver.
inline Match to_many(Match match) {
  match.with(openflow::Field::eth_dst, kGroupBit, kGroupBit);
  return match;
}

/// Out to the device of a port or an uplink.
inline Actions send_to(openflow::Port port) {
  return {openflow::set(field::kReceiver, port), go_to(table::kSending)};
}

/// Frames for one receiver, for several and for all are counted apart: adds a flow for each, of
/// `rule` but for the cookies.
struct ByReceivers {
  Counted one;
  Counted several;
  Counted all;
};
/// Of frames that are let in.
inline constexpr ByReceivers kLetIn{
    .one = Counted::in_unicast, .several = Counted::in_multicast, .all = Counted::in_broadcast};
void add_by_receivers(Program &program, std::uint8_t table, Rule const &rule,
                      ByReceivers const &counted, std::uint32_t number);

/// Adds the tag that a frame has outside, from registers; `vlan` has the VLAN. Takes it away again
/// after `output`, for those that come after.
Actions with_tag(openflow::Field vlan, Actions const &output);
/// Likewise the tag of a frame that has no VLAN but a priority.
Actions with_priority_tag(Actions const &output);

}  // namespace simhost::openvswitch
