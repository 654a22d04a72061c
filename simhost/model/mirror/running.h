// Mirror sessions as they run: those in the tables of a switch's ports that are not disabled.
#pragma once

#include <string>
#include <vector>

#include "base/api.h"
#include "storage/ports.h"
#include "vswitch/mirror.h"

namespace simhost {

/// A session of a port's table and its entities, in the order of the table.
struct SIMHOST_API MirrorSession {
  storage::Port port;
  DVMirrorSession record;
  std::vector<DVMirrorEntity> destinations;

  [[nodiscard]] std::string sid() const;
  [[nodiscard]] bool runs() const;
  /// Whether it stands for a port in promiscuous mode.
  [[nodiscard]] bool is_promiscuous() const;
};

/// The sessions of a switch, disabled ones included, in the order of the ports and of their tables.
SIMHOST_API std::vector<MirrorSession> mirrors_of(storage::Transaction &transaction,
                                                  storage::SwitchKey key);
/// The ports that see frames in promiscuous mode, in the order of their numbers: the destinations
/// of promiscuous sessions that run, or for one without destinations the port that has it. A port
/// that is gone, or whose security policy says VSPORT_SECURITY_DISALLOW_PROMISC, sees none.
SIMHOST_API std::vector<storage::PortNumber> promiscuous_ports(storage::Transaction &transaction,
                                                               storage::SwitchKey key);

}  // namespace simhost
