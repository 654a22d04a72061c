// Numbers of ports, of a bridge and reserved ones.
#pragma once

#include <cstdint>

namespace simhost::openflow {

/// Open vSwitch's own are 1 to 0xfeff.
using Port = std::uint32_t;

inline constexpr Port kInPort = 0xfffffff8;  // the one that the frame came in at
inline constexpr Port kTable = 0xfffffff9;
inline constexpr Port kNormal = 0xfffffffa;
inline constexpr Port kFlood = 0xfffffffb;
inline constexpr Port kAllPorts = 0xfffffffc;
inline constexpr Port kController = 0xfffffffd;
inline constexpr Port kLocal = 0xfffffffe;
inline constexpr Port kAnyPort = 0xffffffff;

using GroupId = std::uint32_t;

inline constexpr GroupId kAllGroups = 0xfffffffc;
inline constexpr GroupId kAnyGroup = 0xffffffff;

}  // namespace simhost::openflow
