// Which groups a port may join.
#include "planes/stored/multicast.h"

#include <algorithm>

#include "base/outcomes.h"
#include "model/options/runtime_options.h"
#include "qexapi/protocols.h"
#include "storage/store.h"
#include "vswitch/mcast_filters.h"

namespace simhost::stored {
namespace {

constexpr std::size_t kIPv4Length = sizeof(qex_IPv4Address);
constexpr std::size_t kIPv6Length = sizeof(qex_IPv6Address);
constexpr std::size_t kEthernetLength = sizeof(qex_EthAddress);
constexpr std::size_t kIgmpVersions = 3;
constexpr std::size_t kMldVersions = 2;

bool is_multicast(AddressBytes const &address) {
  auto const first = address.empty() ? 0U : std::to_integer<unsigned>(address.front());
  switch (address.size()) {
    case kEthernetLength:
      return (first & 1U) != 0;
    case kIPv4Length:
      return (first & 0xF0U) == 0xE0U;
    case kIPv6Length:
      return first == 0xFFU;
    default:
      return false;
  }
}

void check(storage::Transaction &transaction, McastGroup const &group) {
  auto const length = group.address.size();
  bool const ethernet = length == kEthernetLength;
  bool const alike = std::all_of(group.sources.begin(), group.sources.end(),
                                 [&](auto const &source) { return source.size() == length; });
  if (!is_multicast(group.address) || !alike || (ethernet && !group.sources.empty())) {
    throw Refused(QEX_INVALID_ADDRESS);
  }
  // A filter of Ethernet addresses comes from no protocol.
  auto const versions = ethernet ? 0 : length == kIPv4Length ? kIgmpVersions : kMldVersions;
  if (group.version > versions || group.source_mode > VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const most =
      length == kIPv4Length ? VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM : VS_RT_OPT_MLD_V2_MAX_SRC_IP_NUM;
  if (group.sources.size() > static_cast<std::size_t>(runtime_number(transaction, most))) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
}

}  // namespace

void join(storage::ChangingTransaction &transaction, storage::PortNumber port,
          McastGroup const &group) {
  check(transaction, group);
  auto joined = group;
  joined.updated = clock_now(transaction);
  storage::remove_group(transaction, port, group.address);
  storage::insert_group(transaction, port, joined);
}

void leave(storage::ChangingTransaction &transaction, storage::PortNumber port,
           AddressBytes const &address) {
  if (!storage::remove_group(transaction, port, address)) {
    throw Refused(QEX_NOT_FOUND);
  }
}

}  // namespace simhost::stored
