// The tables of all calls and of the records that they take and give.

#include <cstddef>

#include "nebpublic/handles.h"
#include "nebpublic/ports.h"
#include "qexapi/basics.h"
#include "recordings/core/shapes.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"

#include "tables.inc"

namespace recordings {

std::uint32_t bytes_of_form(std::int64_t form) {
  switch (form) {
    case VS_MCAST_FILTER_MODE_LEGACY:
      return sizeof(qex_EthAddress);
    case VS_MCAST_FILTER_MODE_IGMP:
      return sizeof(qex_IPv4Address);
    case VS_MCAST_FILTER_MODE_MLD:
      return sizeof(qex_IPv6Address);
    default:
      return 0;
  }
}

}  // namespace recordings
