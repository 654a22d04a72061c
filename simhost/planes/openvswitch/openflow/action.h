// What a flow or a bucket does with a frame.
#pragma once

#include <compare>
#include <cstdint>
#include <optional>
#include <variant>
#include <vector>

#include "planes/openvswitch/openflow/field.h"
#include "planes/openvswitch/openflow/port.h"

namespace simhost::openflow {

/// Not at the port that the frame came in at; there only kInPort leads.
struct Output {
  Port port;
  friend auto operator<=>(Output const &, Output const &) = default;
};

/// At the port whose number the bits are.
struct OutputFrom {
  SubField port;
  friend auto operator<=>(OutputFrom const &, OutputFrom const &) = default;
};

/// At most the frame's first bytes, 14 at least.
struct OutputTruncated {
  Port port;
  std::uint16_t most_bytes;
  friend auto operator<=>(OutputTruncated const &, OutputTruncated const &) = default;
};

/// As a packet-in. Open vSwitch may send the whole frame all the same.
struct ToController {
  std::uint16_t most_bytes = 0xffff;
  friend auto operator<=>(ToController const &, ToController const &) = default;
};

struct ToGroup {
  GroupId group;
  friend auto operator<=>(ToGroup const &, ToGroup const &) = default;
};

/// Only the first action of a list; drops what is over the meter's rate.
struct ToMeter {
  std::uint32_t meter;
  friend auto operator<=>(ToMeter const &, ToMeter const &) = default;
};

/// Looks the frame up in a table and goes on with the next action after that.
struct Resubmit {
  std::uint8_t table;
  std::optional<std::uint16_t> in_port = std::nullopt;  // as if it came in there
  friend auto operator<=>(Resubmit const &, Resubmit const &) = default;
};

struct PushVlan {
  std::uint16_t ether_type = 0x8100;  // or 0x88a8
  friend auto operator<=>(PushVlan const &, PushVlan const &) = default;
};

/// The outermost tag; refused where the flow does not ask for one.
struct PopVlan {
  friend auto operator<=>(PopVlan const &, PopVlan const &) = default;
};

struct SetField {
  Field field;
  Value value;  // zero wherever the mask is
  Value mask;   // the bits that are set
  friend auto operator<=>(SetField const &, SetField const &) = default;
};

/// Sets a field as a whole. Throws std::invalid_argument for bits that it has not.
SetField set(Field field, Value value);
/// Sets some bits, from a number whose lowest bit is for the lowest of them. Likewise.
SetField load(SubField destination, Value value);

/// As many bits as there are in both.
struct Move {
  SubField source;
  SubField destination;
  friend auto operator<=>(Move const &, Move const &) = default;
};

/// Puts bits on the frame's stack, which is empty at first, or takes as many from it again.
struct Push {
  SubField source;
  friend auto operator<=>(Push const &, Push const &) = default;
};
struct Pop {
  SubField destination;
  friend auto operator<=>(Pop const &, Pop const &) = default;
};

/// A part of a flow that is learned; numbers have their lowest bit for the lowest of the bits.
struct LearnedMatch {
  SubField field;
  std::variant<SubField, Value> content;  // of the frame that teaches, or a number
  friend auto operator<=>(LearnedMatch const &, LearnedMatch const &) = default;
};
struct LearnedLoad {
  SubField destination;
  std::variant<SubField, Value> content;
  friend auto operator<=>(LearnedLoad const &, LearnedLoad const &) = default;
};
struct LearnedOutput {
  SubField port;
  friend auto operator<=>(LearnedOutput const &, LearnedOutput const &) = default;
};

/// Adds a flow, or begins its timeouts anew.
struct Learn {
  std::uint8_t table;
  std::uint16_t priority = 0x8000;
  std::uint64_t cookie = 0;
  std::uint16_t idle_timeout = 0;  // seconds, 0 for never
  std::uint16_t hard_timeout = 0;
  bool tells_removal = false;    // as Flow::tells_removal
  bool deletes_learned = false;  // with the flow that has this action
  std::uint32_t limit = 0;  // how many flows of the table may have the cookie, 0 for any number
  std::optional<SubField> result = std::nullopt;  // a bit: whether the limit allowed it
  std::vector<std::variant<LearnedMatch, LearnedLoad, LearnedOutput>> specs{};
  friend auto operator<=>(Learn const &, Learn const &) = default;
};

class Action;
using Actions = std::vector<Action>;

/// On a copy of the frame and its metadata.
struct Clone {
  Actions actions;
};
bool operator==(Clone const &one, Clone const &other);
std::strong_ordering operator<=>(Clone const &one, Clone const &other);

/// Sets a bit to whether the frame, without its tag, has more bytes.
struct CheckPacketLarger {
  std::uint16_t bytes;
  SubField result;
  friend auto operator<=>(CheckPacketLarger const &, CheckPacketLarger const &) = default;
};

/// Does nothing; the switch keeps the bytes, and zeros after them up to 6 more than a multiple
/// of 8.
struct Note {
  std::vector<std::uint8_t> bytes;
  friend auto operator<=>(Note const &, Note const &) = default;
};

/// One of them. An empty list drops the frame.
class Action : public std::variant<Output, OutputFrom, OutputTruncated, ToController, ToGroup,
                                   ToMeter, Resubmit, PushVlan, PopVlan, SetField, Move, Push, Pop,
                                   Learn, Clone, CheckPacketLarger, Note> {
 public:
  using variant::variant;
};

/// Does `what` with each Learn of a list, with those in its Clones too.
template <typename What>
void for_each_learn(Actions const &actions, What const &what) {
  for (auto const &action : actions) {
    if (auto const *const learn = std::get_if<Learn>(&action)) {
      what(*learn);
    } else if (auto const *const clone = std::get_if<Clone>(&action)) {
      for_each_learn(clone->actions, what);
    }
  }
}

}  // namespace simhost::openflow
