// What a switch is to its frames: what compile() makes flows of. Plain values, which know neither
// the state nor a plane; read_network() fills them.
#pragma once

#include <bitset>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "planes/openvswitch/multicast/groups.h"
#include "planes/openvswitch/openflow/port.h"
#include "planes/openvswitch/openflow/value.h"

namespace simhost::openvswitch {

using openflow::EthernetAddress;

/// A set of VLANs; 0 stands for frames without a tag.
using Vlans = std::bitset<4096>;

/// An uplink that has a device, or one tunnel of an uplink that is tunnels.
struct Uplink {
  openflow::Port port = 0;
  std::uint32_t number = 0;  ///< of its port of the switch
  bool blocked = false;
  std::uint32_t lag = 0;  ///< the link-aggregation group that it is in; 0 for none
  /// Of that group, so that the network takes it for one link with the others in it.
  bool has_partner = false;

  /// Open vSwitch takes one that waits for its partner for dead.
  [[nodiscard]] bool is_watched() const { return lag == 0 || has_partner; }

  bool operator==(Uplink const &) const = default;
};

/// Uplinks that are one link to the network: one, or those of a link-aggregation group.
using Slot = std::vector<openflow::Port>;

/// How a team chooses among the slots that are in use.
enum class Balance {
  first,      ///< the first one
  share,      ///< by the share of the port, see Port::share
  source,     ///< by the source address of the frame
  addresses,  ///< by the IP addresses; the network takes the uplinks for one link
  /// To the one that leads to its receiver, or to all: each leads to another host of the switch,
  /// none of which passes on what it gets over one.
  mesh,
};

/// The uplinks that ports use, in the order of their policy. Which of them meet the criteria, and
/// which come first, is decided before.
struct Team {
  Balance balance = Balance::first;
  std::vector<Slot> in_use;
  std::vector<Slot> standby;  ///< step in, in this order, when none in use has a link
  bool goes_by_load = false;  ///< whoever knows it gives the ports their shares

  bool operator==(Team const &) const = default;
};

/// The kinds of private VLAN, by the numbers that registers hold.
enum class PrivateKind : std::uint8_t { none = 0, promiscuous = 1, isolated = 2, community = 3 };

/// A private VLAN: the promiscuous one of a primary VLAN is the primary VLAN itself.
struct PrivateVlan {
  std::uint16_t primary = 0;
  std::uint16_t secondary = 0;
  PrivateKind kind = PrivateKind::none;

  bool operator==(PrivateVlan const &) const = default;
};

/// What a port does with tags.
struct PortVlan {
  std::uint16_t vlan = 0;  ///< of frames without a tag
  /// The VLANs of frames that the client tags by itself; nothing for a client that does not.
  std::optional<Vlans> carried = std::nullopt;
  bool must_be_private = false;  ///< passes nothing while the VLAN is not one of the switch's map
  std::optional<std::uint8_t> priority = std::nullopt;  ///< instead of that of the client's tags
  bool nested = false;                                  ///< frames may have a second tag

  bool operator==(PortVlan const &) const = default;
};

/// What becomes of frames from an address that there is no room for.
enum class WhenFull { allow, drop };

struct Learning {
  std::uint32_t limit = 0;
  WhenFull when_full = WhenFull::allow;

  bool operator==(Learning const &) const = default;
};

/// A port with a client.
struct Port {
  openflow::Port port = 0;
  std::uint32_t number = 0;  ///< of the switch
  /// The client's address; the first that it sends from, while it is not known.
  std::optional<EthernetAddress> address = std::nullopt;
  PortVlan vlan = {};
  bool blocked = false;
  bool address_changed = false;   ///< although the client may not: nothing passes
  bool may_forge = true;          ///< may send from other addresses than its own
  bool promiscuous = false;       ///< gets all frames of its VLANs
  bool floods = false;            ///< gets frames for unknown addresses
  bool is_sink = false;           ///< gets those that no other port takes
  bool takes_all_groups = false;  ///< gets the frames of all groups
  /// The addresses of groups whose frames it asks for; none while it does not say.
  std::optional<std::vector<EthernetAddress>> asked_groups = std::nullopt;
  bool transmits_by_uplink = false;  ///< whatever it sends goes out over an uplink, and only there
  std::optional<Learning> learning = std::nullopt;
  /// Of the switch's teams; none: it reaches no uplink.
  std::optional<std::size_t> team = std::nullopt;
  std::uint32_t share = 0;    ///< which of the team's slots it uses: the remainder by their count
  bool mirrors_only = false;  ///< gets nothing but what is mirrored to it
  bool sends_nothing = false;

  bool operator==(Port const &) const = default;
};

/// An address that stays where it is put.
struct FixedAddress {
  EthernetAddress address = {};
  std::uint16_t vlan = 0;
  std::optional<std::uint32_t> port = std::nullopt;  ///< its number; none: beyond the uplinks

  bool operator==(FixedAddress const &) const = default;
};

/// What a mirror session copies from.
struct MirrorSources {
  std::vector<openflow::Port> ports;
  std::vector<openflow::Port> uplinks;
  std::vector<std::uint16_t> vlans;

  bool operator==(MirrorSources const &) const = default;
};

/// How copies for collectors are wrapped.
enum class Wrapping : std::uint8_t { gre, erspan2, erspan3 };

/// A machine that gets copies over the underlay.
struct Collector {
  std::variant<openflow::Ipv4Address, openflow::Ipv6Address> address;
  bool is_reached = true;  ///< otherwise it gets none

  bool operator==(Collector const &) const = default;
};

struct Mirror {
  std::uint32_t id = 0;  ///< not 0, and of no other session of the switch
  std::string sid = {};  ///< for those who count
  MirrorSources
      received;        ///< to clients of ports; from the wires of uplinks; over uplinks in VLANs
  MirrorSources sent;  ///< by clients of ports; to the wires of uplinks; by ports in VLANs
  std::vector<openflow::Port> to_ports;
  std::vector<openflow::Port> to_uplinks;
  std::uint16_t remote_vlan = 0;  ///< the tag that copies have on uplinks; 0: none but their own
  /// Whose frames from uplinks are copies that others made, for this session.
  std::vector<std::uint16_t> taken_vlans = {};
  std::vector<Collector> collectors = {};
  Wrapping wrapping = Wrapping::gre;  ///< of copies for collectors
  std::uint32_t key = 0;              ///< of GRE; of ERSPAN the session
  std::uint16_t most_bytes = 0;       ///< of a frame; 0 for all
  bool keeps_vlan = false;            ///< copies have the tag of the frame's VLAN

  bool operator==(Mirror const &) const = default;
};

/// How addresses are learned.
struct Addresses {
  std::uint32_t aging = 300;  ///< seconds; 0: nothing is learned
  std::uint32_t limit = 65536;
  std::uint32_t uplink_limit = 16384;  ///< of those beyond the uplinks
  bool fixed_ones_move = false;        ///< when they are seen elsewhere

  bool operator==(Addresses const &) const = default;
};

/// Which frames of groups go where. While no family is heard of, ports get those that they ask for,
/// and all if they do not say; else those of their members, sources looked at, and of their
/// routers.
struct Multicast {
  bool hears_igmp = false;
  bool hears_mld = false;
  multicast::Groups groups = {};  ///< by the numbers of ports

  [[nodiscard]] bool hears(multicast::Family family) const {
    return family == multicast::Family::ipv4 ? hears_igmp : hears_mld;
  }

  bool operator==(Multicast const &) const = default;
};

struct Network {
  bool disabled = false;
  bool asks_for_beacons = false;  ///< some team does
  /// The group to which this switch's beacons go; nothing while it sends none.
  std::optional<EthernetAddress> beacons = std::nullopt;
  std::uint16_t mtu = 1500;  ///< bytes of a packet
  std::vector<PrivateVlan> private_vlans;
  std::vector<Uplink> uplinks;
  std::vector<Team> teams;
  std::vector<Port> ports;  ///< those that have a device
  Addresses addresses;
  std::vector<FixedAddress> fixed_addresses;
  std::vector<Mirror> mirrors;
  Multicast multicast;

  /// Whether its uplinks are tunnels.
  [[nodiscard]] bool is_mesh() const {
    return !teams.empty() && teams.front().balance == Balance::mesh;
  }

  bool operator==(Network const &) const = default;
};

}  // namespace simhost::openvswitch
