// Where the core meets what runs the switches. The core knows the configuration and asks; a data
// plane knows what goes on, reads the configuration from the state, and is told what callers do to
// it. Which one runs is chosen when the process opens its host.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "clock/clock.h"
#include "storage/ports.h"
#include "storage/running/addresses.h"
#include "storage/running/counters.h"
#include "storage/running/multicast.h"
#include "vswitch/mac_tables.h"

namespace simhost {

using storage::AddressBytes;
using storage::CounterOwner;
using storage::McastGroup;
using storage::Place;

/// A link-aggregation group and its uplinks, each with whether aggregation uses it.
struct SIMHOST_API Lag {
  struct Member {
    std::string uplink;
    bool up;
  };

  std::uint32_t id;
  std::string name;
  std::vector<Member> members;

  /// A group carries frames while one of its uplinks does.
  [[nodiscard]] bool up() const;
};

/// The counters of an owner by the names of the fields in which callers see them; one that is
/// missing has counted nothing.
using Counters = std::map<std::string, std::uint64_t, std::less<>>;

class Plane {
 public:
  virtual ~Plane() = default;

  virtual bool link_is_up(storage::Transaction &transaction, std::string_view uplink) = 0;
  /// Whether link aggregation uses the uplink; never for one that is in no group.
  virtual bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) = 0;
  virtual void set_admin_state(storage::Transaction &transaction, std::string_view uplink,
                               bool up) = 0;
  /// The groups of a switch, in the order in which they were made.
  virtual std::vector<Lag> lags(storage::Transaction &transaction,
                                storage::SwitchKey switch_key) = 0;
  /// The uplink that carries what a port sends. Refuses an uplink port (QEX_NOT_SUPPORTED), a team
  /// without uplinks (QEX_ENETUNREACH), and one none of whose uplinks is in use (QEX_ENETDOWN).
  virtual std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) = 0;

  /// The addresses of one type at a place, or of all, in the order of the addresses.
  virtual std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                            VSMACAddrType type) = 0;
  /// Puts a static or user address at a place; see the rules in planes/stored/mac_tables.h.
  virtual void put_address(storage::Transaction &transaction, Place const &place,
                           VSMACEntry const &entry) = 0;
  /// Refuses what is not there (QEX_NOT_FOUND).
  virtual void remove_address(storage::Transaction &transaction, Place const &place,
                              VSMACEntry const &entry) = 0;
  virtual VSPMACLearningStats learning_stats(storage::Transaction &transaction,
                                             Place const &place) = 0;

  /// The groups of a port with addresses of that many bytes, in the order of the addresses.
  virtual std::vector<AddressBytes> groups(storage::Transaction &transaction,
                                           storage::PortNumber port, std::size_t length) = 0;
  virtual std::optional<McastGroup> group(storage::Transaction &transaction,
                                          storage::PortNumber port,
                                          AddressBytes const &address) = 0;

  virtual Counters counters(storage::Transaction &transaction, CounterOwner const &owner) = 0;

  /// What the host learned and counted goes; what is wired and configured stays.
  virtual void restart(storage::Transaction &transaction) = 0;
};

/// What runs the switches of this process. A plane must have been chosen.
SIMHOST_API Plane &running_plane();
/// Chooses it; `plane` must live as long as the process.
void run_on(Plane &plane);

}  // namespace simhost
