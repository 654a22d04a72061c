// What is known of the source of a frame where it comes in, before it does.
#pragma once

#include <cstdint>
#include <set>

#include "daemon/learned/memory.h"

namespace simhost::daemon {

struct SourceFacts {
  std::set<std::uint16_t> learned = {};  ///< at the port: in these VLANs, see kDomain
  bool is_not_first = false;    ///< a client without a known address sent from another one first
  std::uint64_t at_port = 0;    ///< addresses that are learned
  std::uint64_t on_switch = 0;  ///< likewise in all
};

/// The port is 0 for all that is beyond the uplinks.
SourceFacts facts_of_source(Memory const &memory, storage::SwitchKey key, std::uint32_t port,
                            openflow::EthernetAddress const &address);

}  // namespace simhost::daemon
