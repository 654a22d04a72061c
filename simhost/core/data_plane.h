// Where the core meets what runs the switches. The core knows the configuration and asks; a data
// plane knows what goes on, reads the configuration from the state, and is told what callers do to
// it. Another data plane, one that moves frames, takes the place of the one here by defining
// data_plane().
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core/api.h"
#include "core/clock.h"
#include "store/ports.h"
#include "vswitch/mac_tables.h"

namespace simhost {

/// Where an address is reached: at a port, or through the switch's team of uplinks.
struct Place {
  store::SwitchKey switch_key;
  std::optional<store::PortNumber> port;  ///< none: the team
};

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

/// The bytes of an address as they go over the wire: 6 of Ethernet, 4 of IPv4, 16 of IPv6.
using AddressBytes = std::vector<std::byte>;

/// A multicast group that a port joined.
struct McastGroup {
  AddressBytes address;
  std::uint32_t version;      ///< of the protocol that joined
  std::uint32_t source_mode;  ///< a VSMcastSrcIPFilterMode
  std::uint32_t vni;
  ClockTime updated;
  std::vector<AddressBytes> sources;
};

/// What counts: a switch, one of its ports, or one of its mirror sessions.
struct CounterOwner {
  store::SwitchKey switch_key;
  std::optional<store::PortNumber> port = std::nullopt;
  std::string session = {};
};

/// The counters of an owner by the names of the fields in which callers see them; one that is
/// missing has counted nothing.
using Counters = std::map<std::string, std::uint64_t, std::less<>>;

class DataPlane {
 public:
  virtual ~DataPlane() = default;

  virtual bool link_is_up(store::Transaction &transaction, std::string_view uplink) = 0;
  /// Whether link aggregation uses the uplink; never for one that is in no group.
  virtual bool lacp_is_up(store::Transaction &transaction, std::string_view uplink) = 0;
  virtual void set_admin_state(store::Transaction &transaction, std::string_view uplink,
                               bool up) = 0;
  /// The groups of a switch, in the order in which they were made.
  virtual std::vector<Lag> lags(store::Transaction &transaction, store::SwitchKey switch_key) = 0;
  /// The uplink that carries what a port sends. Refuses an uplink port (QEX_NOT_SUPPORTED), a team
  /// without uplinks (QEX_ENETUNREACH), and one none of whose uplinks is in use (QEX_ENETDOWN).
  virtual std::string team_uplink(store::Transaction &transaction, store::Port const &port) = 0;

  /// The addresses of one type at a place, or of all, in the order of the addresses.
  virtual std::vector<VSMACEntry> addresses(store::Transaction &transaction, Place const &place,
                                            VSMACAddrType type) = 0;
  /// Puts a static or user address at a place; see the rules in dataplane/mac_tables.h.
  virtual void put_address(store::Transaction &transaction, Place const &place,
                           VSMACEntry const &entry) = 0;
  /// Refuses what is not there (QEX_NOT_FOUND).
  virtual void remove_address(store::Transaction &transaction, Place const &place,
                              VSMACEntry const &entry) = 0;
  virtual VSPMACLearningStats learning_stats(store::Transaction &transaction,
                                             Place const &place) = 0;

  /// The groups of a port with addresses of that many bytes, in the order of the addresses.
  virtual std::vector<AddressBytes> groups(store::Transaction &transaction, store::PortNumber port,
                                           std::size_t length) = 0;
  virtual std::optional<McastGroup> group(store::Transaction &transaction, store::PortNumber port,
                                          AddressBytes const &address) = 0;

  virtual Counters counters(store::Transaction &transaction, CounterOwner const &owner) = 0;

  /// What the host learned and counted goes; what is wired and configured stays.
  virtual void restart(store::Transaction &transaction) = 0;
};

/// The data plane of the host; lives as long as the process.
SIMHOST_API DataPlane &data_plane();

}  // namespace simhost
