// Switches whose uplink leads to other hosts without a common layer 2: a tunnel to each of them,
// and what comes out of one goes into no other. Who has one is no longer told by anybody what comes
// over it.
#pragma once

#include <string>
#include <vector>

#include "base/api.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost {

struct FabricSpec {
  std::string uplink = {};  ///< its name on the host; empty: as it is, or chosen
  storage::Encapsulation encapsulation = storage::Encapsulation::vxlan;
  std::uint32_t key = 0;  ///< that all hosts of the switch use, and no other switch
  /// Of all hosts of the switch; this host has no tunnel to the one that its underlay has.
  std::vector<storage::AddressBytes> peers = {};
};

/// Gives a switch a fabric, in place of the one that it had, with an uplink of its own that is at
/// no port yet. Refuses a name that is too long (QEX_NAME_TOO_LONG) or another uplink's
/// (QEX_EXISTS), a key that another switch has (QEX_EXISTS), a peer that is there twice
/// (QEX_EXISTS) or no host at all (QEX_INVALID_ADDRESS), more peers than a switch can have
/// (QEX_LIMIT_EXCEEDED), and a stopped clock (QEX_NOT_SUPPORTED).
SIMHOST_API void set_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                            FabricSpec const &spec);
/// Puts its uplink at a port of the switch, unless it is at one.
SIMHOST_API void attach_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key);

/// What carries the tunnels of this host, in place of what did before. Refuses what no device can
/// be called and one that is a port's or an uplink's, as connect() does, an address that is no
/// host's (QEX_INVALID_ADDRESS), and a gateway of another family (QEX_INVALID_ADDRESS).
SIMHOST_API void set_underlay(storage::ChangingTransaction &transaction,
                              storage::Underlay const &underlay);

}  // namespace simhost
