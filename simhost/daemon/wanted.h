// What a state wants of an Open vSwitch: a bridge for each switch that runs and has a device.
#pragma once

#include <chrono>
#include <cstdint>
#include <exception>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "clock/clock.h"
#include "daemon/compiler.h"
#include "daemon/counting/bridge_totals.h"
#include "planes/openvswitch/compile/announcement.h"
#include "planes/openvswitch/rows/rows.h"
#include "storage/ports.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::daemon {

/// How what a client sends leaves a bridge, as far as others have to be told of it.
struct Carried {
  std::uint32_t number;              ///< of its port of the switch
  std::string device;                ///< of the port
  std::vector<std::uint32_t> links;  ///< see Way::links; none: it reaches nobody beyond
  /// Of each, Open vSwitch is to see the link of an uplink before frames go as they are to.
  std::vector<openvswitch::Slot> slots;
  bool is_announced;              ///< when that changes
  openvswitch::Announced client;  ///< with its address if that is known, else zero
  openvswitch::PortVlan vlan;     ///< in which VLANs it is announced

  [[nodiscard]] bool has_address() const { return client.address != openflow::EthernetAddress{}; }
};

struct WantedBridge {
  storage::SwitchKey key;
  std::string alias;
  openvswitch::BridgeRow row;
  std::map<std::string, std::uint32_t> ports;  ///< the numbers of those that devices are at
  PortNumbers numbers;                         ///< likewise, of uplink ports too
  openvswitch::CountedSessions sessions;
  std::chrono::seconds aging;  ///< of what is learned
  Flows flows;                 ///< but for the marker of the change
  std::vector<Carried> carried = {};
  std::optional<storage::Fabric> fabric = std::nullopt;
  std::uint16_t mtu = 0;
  int multicast_mode = 0;  ///< VSMcastFilterMode
  /// The host was restarted, and has counted nothing since: what is learned is not to be known.
  bool forgets = false;
};

/// A switch that cannot be run as it is, and why. Its bridge goes on as it was.
struct Unfit {
  storage::SwitchKey key;
  std::string alias;
  std::string bridge;
  std::string why;
};

Unfit unfit(WantedBridge const &bridge, std::exception const &why);

/// The bridge that carries tunnels.
struct WantedUnderlay {
  openvswitch::BridgeRow row;
  storage::Underlay address;  ///< of the machine there
};

struct Wanted {
  std::uint64_t change = 0;
  std::vector<WantedBridge> bridges;
  std::optional<WantedUnderlay> underlay = std::nullopt;
  std::vector<Unfit> unfit;
  std::set<storage::SwitchKey> switches = {};  ///< all of the state, also those that do not run
  std::uint32_t most_tags = 0;
  /// How many moves of a switch are announced in a second, and for how long one is tried.
  std::uint32_t most_announced = 0;
  std::chrono::seconds announced_for{};
  /// When something else is wanted although nobody changes anything.
  std::optional<ClockTime> lasts = std::nullopt;

  /// These are wanted in vain.
  void leave_out(std::vector<Unfit> const &refused);
};

/// Whether a device can be put at a bridge.
using IsThere = std::function<bool(std::string const &device)>;

/// The address of the client at a device, where anybody sees it.
using AddressAt =
    std::function<std::optional<openflow::EthernetAddress>(std::string const &device)>;

/// Puts into a network what frames told of it.
using Complete = std::function<void(storage::SwitchKey key, openvswitch::Network &network)>;

/// `host` tells the bridges of this host from those of others in one namespace.
Wanted wanted_of(storage::Transaction &transaction, std::string_view host,
                 std::string const &datapath, IsThere const &is_there, AddressAt const &address_at,
                 Compiler &compiler, Complete const &complete);

/// The bridge of a switch.
std::string bridge_name(std::string_view host, std::string const &identifier);

/// A number that is another one for another text, as good as always.
std::uint64_t fingerprint(std::string_view text);

}  // namespace simhost::daemon
