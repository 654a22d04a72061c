// Numbers by which a process tells whether what it keeps of the state still holds: whatever changed
// it, in this process or another one. They are random, so that none comes again, not even after a
// transaction that was rolled back.
#pragma once

#include <cstdint>

#include "storage/switches.h"

namespace simhost::storage {

struct Generations {
  /// Of the team of uplinks: its uplink ports, links, groups, teaming, and the host's settings.
  std::int64_t team;
  /// Of the ports for clients: which there are, and those with teaming of their own.
  std::int64_t ports;

  bool operator==(Generations const &) const = default;
};

/// The switch must be there.
Generations get_generations(Transaction &transaction, SwitchKey key);

/// Another number for a state that another store committed something to, whatever it was.
std::int64_t commits_of_others(Transaction &transaction);

}  // namespace simhost::storage
