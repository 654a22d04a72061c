// VSQEX_*: multicast filters.
#include <vector>

#include "abi/libvswitch/results.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "vswitch/queries.h"

namespace simhost {
namespace {

// The bytes of a group's address in the form of a mode. Snooping is not the form of one protocol.
std::size_t address_length(VSMcastFilterMode mode) {
  switch (mode) {
    case VS_MCAST_FILTER_MODE_LEGACY:
      return sizeof(qex_EthAddress);
    case VS_MCAST_FILTER_MODE_IGMP:
      return sizeof(qex_IPv4Address);
    case VS_MCAST_FILTER_MODE_MLD:
      return sizeof(qex_IPv6Address);
    default:
      refuse(QEX_BAD_PARAM);
  }
}

storage::PortNumber port_of(storage::Transaction &transaction, std::string_view alias,
                            qex_SwitchPortID port) {
  auto const key = get_running_switch(transaction, alias).key;
  return get_port(transaction, key, storage::PortNumber{port}).number;
}

std::vector<std::byte> joined(std::vector<AddressBytes> const &addresses) {
  std::vector<std::byte> all;
  for (auto const &address : addresses) {
    all.insert(all.end(), address.begin(), address.end());
  }
  return all;
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSQEX_GetMcastFilters(char const *switchName, qex_SwitchPortID port,
                                       VSMcastFilterMode mode, VSMcastFilters **filters) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(filters);
    auto const length = address_length(mode);
    auto &transaction = call.transaction();
    auto const groups =
        running_plane().groups(transaction, port_of(transaction, alias, port), length);
    output = allocate_counted<VSMcastFilters>(call, joined(groups), groups.size());
  });
}

QEX_ReturnStatus VSQEX_GetMcastFilterStats(char const *switchName, qex_SwitchPortID port,
                                           VSMcastFilterMode mode, unsigned char const *group,
                                           VSMcastFilterStats **stats) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(stats);
    auto const *const first = reinterpret_cast<std::byte const *>(&require(group));
    AddressBytes const address(first, first + address_length(mode));
    auto &transaction = call.transaction();
    auto const found =
        running_plane().group(transaction, port_of(transaction, alias, port), address);
    if (!found) {
      refuse(QEX_NOT_FOUND);
    }
    auto *const record =
        allocate_counted<VSMcastFilterStats>(call, joined(found->sources), found->sources.size());
    record->version = found->version;
    record->srcIPFilterMode = found->source_mode;
    record->updateTime = static_cast<qex_uint64>(found->updated / std::chrono::seconds(1));
    record->vni = found->vni;
    output = record;
  });
}

QEX_ReturnStatus VSQEX_GetMcastFilterMode(char const *switchName, int *mode) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const alias = require_text(switchName);
    auto &output = require(mode);
    auto &transaction = call.transaction();
    output =
        running_plane().multicast_mode(transaction, get_running_switch(transaction, alias).key);
  });
}

}  // extern "C"
}  // namespace simhost
