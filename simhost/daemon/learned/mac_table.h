// What a bridge has learned, as those see it who ask where addresses are.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <utility>
#include <vector>

#include "daemon/learned/ageing.h"
#include "planes/openvswitch/openflow/replies.h"

namespace simhost::daemon {

/// An address, in its VLAN.
using KnownAddress = std::pair<openflow::EthernetAddress, std::uint16_t>;

/// That by which a flow goes, as a source or a destination; nothing of one that goes by none, or in
/// whichever VLAN.
std::optional<KnownAddress> find_known_address(openflow::Match const &match, openflow::Field field);

/// An address that a bridge has learned.
struct Learned {
  openflow::EthernetAddress address;
  std::uint16_t vlan;
  std::uint32_t port;  ///< its number in the state; 0 beyond the uplinks
  std::uint32_t age;   ///< seconds since it was seen last, as a source
};

/// `flows` are those of table::kLearnedAddresses.
std::vector<Learned> learned_of(std::span<openflow::FlowEntry const> flows,
                                std::span<Source const> sources);

}  // namespace simhost::daemon
