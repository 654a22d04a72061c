// What would carry the ports of a switch if an uplink failed.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "model/teaming/team.h"

namespace simhost::teaming {

/// A port that an uplink carries, and what would carry it without that one, if anything did.
struct Failover {
  std::string uplink;
  std::string port;
  std::optional<std::string> meanwhile;

  bool operator==(Failover const &) const = default;
};

/// For each uplink that is up, of the ports that have a device. Nothing is changed.
std::vector<Failover> failovers(storage::Transaction &transaction, storage::SwitchKey key);

}  // namespace simhost::teaming
