// What rules have to know of a network, worked out once. What is made of a port for itself is made
// of its own plan, in which nothing else is known: so it is the same as long as that is.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/compile/outlets.h"
#include "planes/openvswitch/compile/program.h"
#include "planes/openvswitch/compile/vlan_masks.h"
#include "planes/openvswitch/compile/ways.h"

namespace simhost::openvswitch {

/// A VLAN among the switch's private ones.
struct VlanKind {
  std::uint16_t domain = 0;  ///< its primary VLAN, or itself
  PrivateKind kind = PrivateKind::none;

  bool operator==(VlanKind const &) const = default;
};

/// Where a port puts frames without a tag, and which it has besides.
struct Carried {
  std::optional<std::uint16_t> untagged;
  Vlans tagged;  ///< neither 0 nor `untagged` among them
};

/// Likewise an address that stays where it is put.
struct FixedPlace {
  EthernetAddress address;
  std::uint16_t domain;
  bool is_beyond;    ///< the uplinks
  Port const *port;  ///< null also for one without a device
};

/// What all ports of a switch have in common.
class Common {
 public:
  Common() = default;
  explicit Common(Network const &network);

  std::uint16_t mtu = 0;
  Addresses addresses;
  std::vector<Mirror> mirrors;
  bool hears_igmp = false;
  bool hears_mld = false;
  bool has_uplinks = false;
  bool any_promiscuous = false;  ///< some port gets all frames of its VLANs
  /// Whether a switch outside may send this one's frames back: over another uplink, or because
  /// their receiver is here.
  bool frames_may_return = false;

  [[nodiscard]] VlanKind const &kind_of(std::uint16_t vlan) const { return kinds_[vlan]; }
  /// The private VLANs and their primary ones.
  [[nodiscard]] std::vector<std::uint16_t> const &private_vlans() const { return private_vlans_; }
  /// How long a learned address stays, in seconds; 0 for as long as nobody takes it.
  [[nodiscard]] std::uint16_t hard_timeout() const;

  bool operator==(Common const &) const = default;

 private:
  void note_private_vlans(Network const &network);

  std::vector<VlanKind> kinds_;
  std::vector<std::uint16_t> private_vlans_;
};

/// What is known of a port only beside the others of its switch.
struct AmongOthers {
  /// The VLANs in which the address of its client is known: of several ports with one address in
  /// one VLAN the first has it.
  std::vector<VlanMask> own_domains;
  std::optional<std::uint32_t> way;  ///< the number; none if it reaches no uplink
  Actions out;                       ///< what goes this way
  /// Whether what is sent to it is counted, in table kSending: a flood takes a lookup more for
  /// each such port, and a frame has so many.
  bool counts_sent = false;

  bool operator==(AmongOthers const &) const = default;
};

/// All that rules of one port depend on.
struct PortPlan {
  Common const &common;
  Port const &port;
  AmongOthers among_others;
};

class Plan {
 public:
  /// `given` must outlive it.
  explicit Plan(Network const &given);

  Network const &network;
  Common const common;
  Ways const ways;
  Outlets const outlets;

  /// In their order.
  [[nodiscard]] std::vector<PortPlan> const &ports() const { return ports_; }
  [[nodiscard]] std::vector<FixedPlace> const &fixed_places() const { return fixed_places_; }
  /// Whether ports get only frames of the groups that they ask for.
  [[nodiscard]] bool filters_by_address() const;
  /// Whether something of a port has to be looked at when a frame of its VLAN comes, in table
  /// kDelivery.
  [[nodiscard]] bool is_looked_at(Port const &port) const;
  /// See AmongOthers.
  [[nodiscard]] bool counts_sent(Port const &port) const;

 private:
  void note_ports();
  void note_addresses();
  [[nodiscard]] Vlans domains_of(Port const &port) const;
  void note_fixed_addresses();
  void note_lookups();
  [[nodiscard]] std::size_t index_of(Port const &port) const {
    return static_cast<std::size_t>(&port - network.ports.data());
  }

  std::vector<PortPlan> ports_;
  std::vector<FixedPlace> fixed_places_;
  std::vector<bool> looked_at_;    // in the order of the ports
  std::size_t counted_ports_ = 0;  // the first of them
};

/// Whether nothing passes a port.
bool is_closed(Port const &port);
/// Whether a port has a VLAN at all, and takes part in what happens there.
bool has_vlan(Common const &common, Port const &port);
bool takes_frames(Common const &common, Port const &port);
bool sends_frames(Port const &port);
/// Of a port whose client tags its frames.
Carried carried_by(PortVlan const &vlan);

}  // namespace simhost::openvswitch
