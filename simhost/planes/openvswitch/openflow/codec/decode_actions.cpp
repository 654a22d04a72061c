#include <fmt/format.h>

#include "planes/openvswitch/openflow/codec/actions.h"
#include "planes/openvswitch/openflow/codec/foreign.h"
#include "planes/openvswitch/openflow/codec/numbers.h"
#include "planes/openvswitch/openflow/codec/oxm.h"

namespace simhost::openflow {
namespace {

constexpr std::size_t kActionHeader = 8;  // the least that an action has
constexpr unsigned kDeepest = 16;         // clones in clones

Actions take_nested(Reader &in, unsigned depth);

SubField checked(Field field, unsigned first, unsigned bits) {
  if (bits == 0 || first + bits > info(field).bits) {
    throw Malformed("a part of a field is not in it");
  }
  return {field, static_cast<std::uint8_t>(first), static_cast<std::uint8_t>(bits)};
}

SubField take_part(Reader &in, unsigned bits) {
  auto const field = take_field_number(in);
  return checked(field, in.u16(), bits);
}

Port long_port(std::uint16_t port) {
  return port >= kSamePort ? 0xffff0000U | port : port;
}

Action take_output(Reader &in) {
  auto const port = in.u32();
  auto const most_bytes = in.u16();
  if (port == kController) {
    return ToController{most_bytes};
  }
  return Output{port};
}

Action take_set_field(Reader &in) {
  auto const [field, content] = take_field(in);
  return SetField{field, content.value, content.mask};
}

Action take_move(Reader &in) {
  unsigned const bits = in.u16();
  unsigned const source_first = in.u16();
  unsigned const destination_first = in.u16();
  in.skip(2);
  auto const source = take_field_number(in);
  auto const destination = take_field_number(in);
  return Move{checked(source, source_first, bits), checked(destination, destination_first, bits)};
}

Action take_resubmit(Reader &in) {
  auto const port = in.u16();
  auto const table = in.u8();
  if (table == kSameTable) {
    throw Foreign("resubmit to the same table");
  }
  return Resubmit{table, port == kSamePort ? std::nullopt : std::optional(port)};
}

Action take_output_from(Reader &in) {
  unsigned const place = in.u16();
  auto const field = take_field_number(in);
  return OutputFrom{checked(field, place >> 6U, (place & 0x3fU) + 1)};
}

Action take_output_truncated(Reader &in) {
  auto const port = long_port(in.u16());
  auto const most_bytes = in.u32();
  if (most_bytes > 0xffff) {
    throw Foreign("output of so many bytes");
  }
  return OutputTruncated{port, static_cast<std::uint16_t>(most_bytes)};
}

Action take_check(Reader &in) {
  auto const bytes = in.u16();
  unsigned const first = in.u16();
  auto const field = take_field_number(in);
  return CheckPacketLarger{bytes, checked(field, first, 1)};
}

SubField take_stacked(Reader &in) {
  unsigned const first = in.u16();
  auto const field = take_field_number(in);
  return checked(field, first, in.u16());
}

std::variant<SubField, Value> take_learned_content(Reader &in, std::uint16_t header,
                                                   unsigned bits) {
  if ((header & kLearnedNumber) == 0) {
    return take_part(in, bits);
  }
  if (bits > 8 * sizeof(Value)) {
    throw Malformed("a number that is learned has too many bits");
  }
  constexpr std::size_t kWord = 16;
  auto const number = in.value(2 * ((bits + kWord - 1) / kWord));
  return number & ones(bits);
}

void take_learned(Reader &in, Learn &learn) {
  while (in.size() >= sizeof(std::uint16_t)) {
    auto const header = in.u16();
    // What pads the action.
    if (header == 0) {
      return;
    }
    unsigned const bits = header & kLearnedBits;
    auto const kind = header & kLearnedKind;
    if (kind == kLearnedOutput && (header & kLearnedNumber) == 0) {
      learn.specs.emplace_back(LearnedOutput{take_part(in, bits)});
      continue;
    }
    auto const content = take_learned_content(in, header, bits);
    if (kind == kLearnedMatch) {
      learn.specs.emplace_back(LearnedMatch{take_part(in, bits), content});
    } else if (kind == kLearnedLoad) {
      learn.specs.emplace_back(LearnedLoad{take_part(in, bits), content});
    } else {
      throw Foreign(fmt::format("learning with {:#06x}", header));
    }
  }
}

Action take_learn(Reader &in, bool is_limited) {
  Learn learn{};
  learn.idle_timeout = in.u16();
  learn.hard_timeout = in.u16();
  learn.priority = in.u16();
  learn.cookie = in.u64();
  auto const flags = in.u16();
  learn.tells_removal = (flags & kTellsRemoval) != 0;
  learn.deletes_learned = (flags & kDeletesLearned) != 0;
  learn.table = in.u8();
  in.skip(1);
  if (in.u32() != 0) {
    throw Foreign("learning with timeouts for the end of a connection");
  }
  if (is_limited) {
    learn.limit = in.u32();
    unsigned const first = in.u16();
    in.skip(2);
    if ((flags & kWritesResult) != 0) {
      auto const field = take_field_number(in);
      learn.result = checked(field, first, 1);
    }
  }
  take_learned(in, learn);
  return learn;
}

Action take_extended(Reader &in, unsigned depth) {
  auto const experimenter = in.u32();
  auto const type = in.u16();
  if (experimenter != kOpenVswitch) {
    throw Foreign(fmt::format("an action of the experimenter {:#x}", experimenter));
  }
  switch (static_cast<ExtendedType>(type)) {
    case ExtendedType::note:
      return Note{{in.rest().begin(), in.rest().end()}};
    case ExtendedType::resubmit:
      return take_resubmit(in);
    case ExtendedType::output_from:
      return take_output_from(in);
    case ExtendedType::push:
      return Push{take_stacked(in)};
    case ExtendedType::pop:
      return Pop{take_stacked(in)};
    case ExtendedType::learn:
      return take_learn(in, false);
    case ExtendedType::limited_learn:
      return take_learn(in, true);
    case ExtendedType::output_truncated:
      return take_output_truncated(in);
    case ExtendedType::clone:
      in.skip(6);
      return Clone{take_nested(in, depth + 1)};
    case ExtendedType::check_packet_larger:
      return take_check(in);
  }
  throw Foreign(fmt::format("action {} of Open vSwitch", type));
}

Action take_action(Reader &in, unsigned depth) {
  auto const type = in.u16();
  in.skip(2);
  switch (static_cast<ActionType>(type)) {
    case ActionType::output:
      return take_output(in);
    case ActionType::push_vlan:
      return PushVlan{in.u16()};
    case ActionType::pop_vlan:
      return PopVlan{};
    case ActionType::group:
      return ToGroup{in.u32()};
    case ActionType::set_field:
      return take_set_field(in);
    case ActionType::copy_field:
      return take_move(in);
    case ActionType::meter:
      return ToMeter{in.u32()};
    case ActionType::experimenter:
      return take_extended(in, depth);
  }
  throw Foreign(fmt::format("action {}", type));
}

Actions take_nested(Reader &in, unsigned depth) {
  if (depth > kDeepest) {
    throw Foreign("actions in actions without end");
  }
  Actions actions;
  while (!in.empty()) {
    auto item = take_item(in, 2, kActionHeader);
    actions.push_back(take_action(item, depth));
  }
  return actions;
}

}  // namespace

Actions take_actions(Reader &in) {
  return take_nested(in, 0);
}

}  // namespace simhost::openflow
