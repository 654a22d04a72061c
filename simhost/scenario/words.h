// Words of documents that belong to no setting, and the numbers they stand for.
#pragma once

#include <array>

#include "model/properties/form.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filters.h"

namespace simhost::scenario {

inline constexpr std::array<Word, 2> kUpDown{{{"up", 1}, {"down", 0}}};
inline constexpr std::array<Word, 2> kDuplex{{{"full", 1}, {"half", 0}}};
inline constexpr std::array<Word, 3> kAddressTypes{{{"static", VS_MAC_ADDR_TYPE_STATIC},
                                                    {"user", VS_MAC_ADDR_TYPE_USER},
                                                    {"learned", VS_MAC_ADDR_TYPE_LEARNED}}};
inline constexpr std::array<Word, 3> kSourceModes{
    {{"none", VS_MCAST_SRC_IP_FILTER_MODE_NONE},
     {"include", VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE},
     {"exclude", VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE}}};

}  // namespace simhost::scenario
