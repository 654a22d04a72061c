// What is known of the source of a frame where it comes in, before it does.
#pragma once

#include <cstdint>

#include "daemon/learned/memory.h"

namespace simhost::daemon {

struct SourceFacts {
  bool is_learned = false;      ///< at the port
  bool is_not_first = false;    ///< a client without a known address sent from another one first
  std::uint64_t at_port = 0;    ///< addresses that are learned
  std::uint64_t on_switch = 0;  ///< likewise in all
};

SourceFacts facts_of_source(Memory const &memory, storage::SwitchKey key, std::uint32_t port,
                            openflow::EthernetAddress const &address);

}  // namespace simhost::daemon
