// What a bridge has learned, as those see it who ask where addresses are.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "daemon/learned/ageing.h"
#include "planes/openvswitch/openflow/replies.h"

namespace simhost::daemon {

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
