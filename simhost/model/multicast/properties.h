// Settings of multicast: how a switch filters it.
#pragma once

#include <array>

#include "model/properties/descriptor.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/properties.h"

namespace simhost::multicast {

inline constexpr std::array<Word, 4> kModes{{{"legacy", VS_MCAST_FILTER_MODE_LEGACY},
                                             {"snooping", VS_MCAST_FILTER_MODE_SNOOPING},
                                             {"igmp", VS_MCAST_FILTER_MODE_IGMP},
                                             {"mld", VS_MCAST_FILTER_MODE_MLD}}};

inline constexpr auto filter_mode = property<qex_uint32>(VSPROP_MULTICAST_FILTER)
                                        .of_switch()
                                        .typed()
                                        .among(kModes)
                                        .defaults_to(VS_MCAST_FILTER_MODE_LEGACY)
                                        .json("multicast")
                                        .frames_obey()
                                        .says("how the switch filters multicast");

inline constexpr std::array<Descriptor const *, 1> kProperties{&filter_mode};

}  // namespace simhost::multicast
