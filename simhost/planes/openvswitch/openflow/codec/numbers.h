// The numbers of flows and their actions that both directions need.
#pragma once

#include <cstdint>

namespace simhost::openflow {

/// The instruction that a flow has its actions in.
inline constexpr std::uint16_t kApplyActions = 4;

/// The flag of a flow that tells of its removal.
inline constexpr std::uint16_t kSendFlowRemoved = 1;

enum class ActionType : std::uint16_t {
  output = 0,
  push_vlan = 17,
  pop_vlan = 18,
  group = 22,
  set_field = 25,
  copy_field = 28,
  meter = 29,
  experimenter = 0xffff,
};

/// Of Open vSwitch as an experimenter.
enum class ExtendedType : std::uint16_t {
  note = 8,
  resubmit = 14,
  output_from = 15,
  learn = 16,
  push = 27,
  pop = 28,
  output_truncated = 39,
  clone = 42,
  limited_learn = 45,
  check_packet_larger = 49,
};

inline constexpr std::uint32_t kOpenVswitch = 0x2320;

/// Flags of both kinds of learn.
inline constexpr std::uint16_t kTellsRemoval = 1;
inline constexpr std::uint16_t kDeletesLearned = 2;
inline constexpr std::uint16_t kWritesResult = 4;

/// What begins each item of what is learned, beside a number of bits.
inline constexpr std::uint16_t kLearnedNumber = 0x2000;
inline constexpr std::uint16_t kLearnedMatch = 0x0000;
inline constexpr std::uint16_t kLearnedLoad = 0x0800;
inline constexpr std::uint16_t kLearnedOutput = 0x1000;
inline constexpr std::uint16_t kLearnedKind = 0x1800;
inline constexpr std::uint16_t kLearnedBits = 0x07ff;

/// The port of a resubmit that stays as it is, in 16 bits.
inline constexpr std::uint16_t kSamePort = 0xfff8;
inline constexpr std::uint8_t kSameTable = 0xff;

}  // namespace simhost::openflow
