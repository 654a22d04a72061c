#include <stdexcept>

#include "planes/openvswitch/openflow/codec/actions.h"
#include "planes/openvswitch/openflow/codec/numbers.h"
#include "planes/openvswitch/openflow/codec/oxm.h"

namespace simhost::openflow {
namespace {

void require(bool holds, char const *why) {
  if (!holds) {
    throw std::invalid_argument(why);
  }
}

void require_bit(SubField const &part) {
  require(part.bits == 1, "a result takes one bit");
}

// A port in 16 bits, where reserved ones are the last.
std::uint16_t short_port(Port port) {
  require(port < 0xff00 || port >= kInPort, "there is no such port");
  return static_cast<std::uint16_t>(port);
}

class LearnedPut {
 public:
  explicit LearnedPut(Writer &out) : out_(out) {}

  void operator()(LearnedMatch const &match) const {
    put(kLearnedMatch, match.content, match.field);
  }
  void operator()(LearnedLoad const &load) const {
    put(kLearnedLoad, load.content, load.destination);
  }
  void operator()(LearnedOutput const &output) const {
    out_.u16(kLearnedOutput | output.port.bits);
    put_part(output.port);
  }

 private:
  void put(std::uint16_t kind, std::variant<SubField, Value> const &content,
           SubField const &destination) const {
    if (auto const *const source = std::get_if<SubField>(&content)) {
      require(source->bits == destination.bits, "what is learned has as many bits as its source");
      out_.u16(kind | destination.bits);
      put_part(*source);
    } else {
      auto const number = std::get<Value>(content);
      require((number & ~ones(destination.bits)) == 0, "the number has more bits than its place");
      out_.u16(kLearnedNumber | kind | destination.bits);
      // Whole words of 16 bits.
      out_.value(number, 2 * ((destination.bits + 15U) / 16U));
    }
    put_part(destination);
  }

  void put_part(SubField const &part) const {
    put_field_number(out_, part.field);
    out_.u16(part.first);
  }

  Writer &out_;
};

class ActionPut {
 public:
  explicit ActionPut(Writer &out) : out_(out) {}

  void operator()(Output const &output) const { put_output(output.port, 0); }
  void operator()(ToController const &output) const { put_output(kController, output.most_bytes); }
  void operator()(OutputFrom const &output) const {
    extended(ExtendedType::output_from, [&] {
      out_.u16(static_cast<std::uint16_t>(output.port.first << 6U | (output.port.bits - 1U)));
      put_field_number(out_, output.port.field);
      out_.u16(0xffff);  // of the frame for a controller
      out_.zeros(6);
    });
  }
  void operator()(OutputTruncated const &output) const {
    extended(ExtendedType::output_truncated, [&] {
      out_.u16(short_port(output.port));
      out_.u32(output.most_bytes);
    });
  }
  void operator()(ToGroup const &group) const {
    put(ActionType::group, [&] { out_.u32(group.group); });
  }
  void operator()(ToMeter const &meter) const {
    put(ActionType::meter, [&] { out_.u32(meter.meter); });
  }
  void operator()(Resubmit const &resubmit) const {
    require(resubmit.table != kSameTable, "there is no such table");
    extended(ExtendedType::resubmit, [&] {
      out_.u16(resubmit.in_port.value_or(kSamePort));
      out_.u8(resubmit.table);
      out_.zeros(3);
    });
  }
  void operator()(PushVlan const &push) const {
    put(ActionType::push_vlan, [&] { out_.u16(push.ether_type); });
  }
  void operator()(PopVlan const & /*pop*/) const {
    put(ActionType::pop_vlan, [] {});
  }
  void operator()(SetField const &set) const {
    put(ActionType::set_field, [&] { put_field(out_, set.field, {set.value, set.mask}); });
  }
  void operator()(Move const &move) const {
    require(move.source.bits == move.destination.bits, "as many bits are moved as there is room");
    put(ActionType::copy_field, [&] {
      out_.u16(move.source.bits);
      out_.u16(move.source.first);
      out_.u16(move.destination.first);
      out_.zeros(2);
      put_field_number(out_, move.source.field);
      put_field_number(out_, move.destination.field);
    });
  }
  void operator()(Push const &push) const { put_stack(ExtendedType::push, push.source); }
  void operator()(Pop const &pop) const { put_stack(ExtendedType::pop, pop.destination); }
  void operator()(Learn const &learn) const {
    bool const is_limited = learn.limit != 0 || learn.result;
    extended(is_limited ? ExtendedType::limited_learn : ExtendedType::learn, [&] {
      out_.u16(learn.idle_timeout);
      out_.u16(learn.hard_timeout);
      out_.u16(learn.priority);
      out_.u64(learn.cookie);
      out_.u16(static_cast<std::uint16_t>((learn.tells_removal ? kTellsRemoval : 0) |
                                          (learn.deletes_learned ? kDeletesLearned : 0) |
                                          (learn.result ? kWritesResult : 0)));
      out_.u8(learn.table);
      out_.zeros(5);  // with the timeouts after the end of a connection
      if (is_limited) {
        put_limit(learn);
      }
      for (auto const &spec : learn.specs) {
        std::visit(LearnedPut(out_), spec);
      }
    });
  }
  void operator()(Clone const &clone) const {
    extended(ExtendedType::clone, [&] {
      out_.zeros(6);
      put_actions(out_, clone.actions);
    });
  }
  void operator()(CheckPacketLarger const &check) const {
    require_bit(check.result);
    extended(ExtendedType::check_packet_larger, [&] {
      out_.u16(check.bytes);
      out_.u16(check.result.first);
      put_field_number(out_, check.result.field);
      out_.zeros(10);
    });
  }
  void operator()(Note const &note) const {
    extended(ExtendedType::note, [&] { out_.append(note.bytes); });
  }

 private:
  template <typename Payload>
  void put(ActionType type, Payload const &payload) const {
    auto const start = out_.size();
    out_.u16(static_cast<std::uint16_t>(type));
    out_.u16(0);
    payload();
    out_.pad(start);
    out_.put_length(start + 2, start);
  }

  template <typename Payload>
  void extended(ExtendedType type, Payload const &payload) const {
    put(ActionType::experimenter, [&] {
      out_.u32(kOpenVswitch);
      out_.u16(static_cast<std::uint16_t>(type));
      payload();
    });
  }

  void put_output(Port port, std::uint16_t most_bytes) const {
    put(ActionType::output, [&] {
      out_.u32(port);
      out_.u16(most_bytes);
    });
  }

  void put_stack(ExtendedType type, SubField const &part) const {
    extended(type, [&] {
      out_.u16(part.first);
      put_field_number(out_, part.field);
      out_.u16(part.bits);
    });
  }

  void put_limit(Learn const &learn) const {
    out_.u32(learn.limit);
    out_.u16(learn.result ? learn.result->first : 0);
    out_.zeros(2);
    if (learn.result) {
      require_bit(*learn.result);
      put_field_number(out_, learn.result->field);
    }
  }

  Writer &out_;
};

}  // namespace

void put_actions(Writer &out, Actions const &actions) {
  for (auto const &action : actions) {
    std::visit(ActionPut(out), static_cast<Action::variant const &>(action));
  }
}

}  // namespace simhost::openflow
