// The words of scenario documents and what they stand for.
#pragma once

#include <array>
#include <cstdint>

#include "scenario/document.h"
#include "storage/properties.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/mcast_filters.h"

namespace simhost::scenario {

inline constexpr std::array<Choice<bool>, 2> kUpDown{{{"up", true}, {"down", false}}};
inline constexpr std::array<Choice<bool>, 2> kDuplex{{{"full", true}, {"half", false}}};
inline constexpr std::array<Choice<VSMACAddrType>, 3> kAddressTypes{
    {{"static", VS_MAC_ADDR_TYPE_STATIC},
     {"user", VS_MAC_ADDR_TYPE_USER},
     {"learned", VS_MAC_ADDR_TYPE_LEARNED}}};
inline constexpr std::array<Choice<std::uint32_t>, 4> kFilterModes{
    {{"legacy", VS_MCAST_FILTER_MODE_LEGACY},
     {"snooping", VS_MCAST_FILTER_MODE_SNOOPING},
     {"igmp", VS_MCAST_FILTER_MODE_IGMP},
     {"mld", VS_MCAST_FILTER_MODE_MLD}}};
inline constexpr std::array<Choice<std::uint32_t>, 3> kSourceModes{
    {{"none", VS_MCAST_SRC_IP_FILTER_MODE_NONE},
     {"include", VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE},
     {"exclude", VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE}}};
inline constexpr std::array<Choice<storage::PropertyType>, 4> kPropertyTypes{
    {{"config", storage::PropertyType::config},
     {"runtime", storage::PropertyType::runtime},
     {"volatile", storage::PropertyType::transient},
     {"policy", storage::PropertyType::policy}}};

}  // namespace simhost::scenario
