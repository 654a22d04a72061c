// What several stages have to know of a network, worked out once.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <vector>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/compile/vlan_masks.h"
#include "planes/openvswitch/compile/ways.h"

namespace simhost::openvswitch {

/// A VLAN among the switch's private ones.
struct VlanKind {
  std::uint16_t domain = 0;  ///< its primary VLAN, or itself
  PrivateKind kind = PrivateKind::none;
};

/// Where a port puts frames without a tag, and which it has besides.
struct Carried {
  std::optional<std::uint16_t> untagged;
  Vlans tagged;  ///< neither 0 nor `untagged` among them
};

/// The known address of a client in some of its VLANs. Of several ports with one address in one
/// VLAN the first has it.
struct OwnAddress {
  Port const *port;
  EthernetAddress address;
  VlanMask domains;
};

/// Likewise an address that stays where it is put.
struct FixedPlace {
  EthernetAddress address;
  std::uint16_t domain;
  bool is_beyond;    ///< the uplinks
  Port const *port;  ///< null also for one without a device
};

class Plan {
 public:
  /// `given` must outlive it.
  explicit Plan(Network const &given);

  Network const &network;
  Ways const ways;

  [[nodiscard]] VlanKind const &kind_of(std::uint16_t vlan) const { return kinds_[vlan]; }
  /// The private VLANs and their primary ones.
  [[nodiscard]] std::vector<std::uint16_t> const &private_vlans() const { return private_vlans_; }
  [[nodiscard]] std::vector<OwnAddress> const &own_addresses() const { return own_addresses_; }
  [[nodiscard]] std::vector<FixedPlace> const &fixed_places() const { return fixed_places_; }
  /// Whether ports get only frames of the groups that they ask for.
  [[nodiscard]] bool filters_by_address() const;
  /// Whether something of a port has to be looked at when a frame of its VLAN comes, in table
  /// kDelivery.
  [[nodiscard]] bool is_looked_at(Port const &port) const;
  /// Whether what is sent to a port is counted, in table kSending: a flood takes a lookup more for
  /// each such port, and a frame has so many.
  [[nodiscard]] bool counts_sent(Port const &port) const;
  /// Whether a switch outside may send this one's frames back: over another uplink, or because
  /// their receiver is here.
  [[nodiscard]] bool frames_may_return() const;
  /// How long a learned address stays, in seconds; 0 for as long as nobody takes it.
  [[nodiscard]] std::uint16_t hard_timeout() const;

 private:
  void note_private_vlans();
  void note_addresses();
  [[nodiscard]] Vlans domains_of(Port const &port) const;
  void note_fixed_addresses();
  void note_lookups();
  [[nodiscard]] std::size_t index_of(Port const &port) const {
    return static_cast<std::size_t>(&port - network.ports.data());
  }

  std::array<VlanKind, 4096> kinds_{};
  std::vector<std::uint16_t> private_vlans_;
  std::vector<OwnAddress> own_addresses_;
  std::vector<FixedPlace> fixed_places_;
  std::vector<bool> looked_at_;    // in the order of the ports
  std::size_t counted_ports_ = 0;  // the first of them
};

/// Whether nothing passes a port.
bool is_closed(Port const &port);
/// Whether a port has a VLAN at all, and takes part in what happens there.
bool has_vlan(Plan const &plan, Port const &port);
bool takes_frames(Plan const &plan, Port const &port);
bool sends_frames(Port const &port);
/// Of a port whose client tags its frames.
Carried carried_by(PortVlan const &vlan);

}  // namespace simhost::openvswitch
