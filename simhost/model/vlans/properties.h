// Settings of VLANs: those of ports, and the private VLANs of switches.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "base/vlan.h"
#include "model/properties/descriptor.h"
#include "qexapi/protocols.h"
#include "qexapi/switch_ports.h"
#include "qexapi/switch_properties.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/properties.h"

namespace simhost::vlans {

/// Of a VLAN that has tags.
inline constexpr qex_uint16 kLeast = 1;
inline constexpr qex_uint16 kGreatest = kGreatestVlan;
/// How many numbers a VLAN field can hold; no list of VLANs is longer.
inline constexpr int kNumbers = 4096;

/// Refuses a VLAN past the greatest (QEX_BAD_VLANID); 0 is none.
SIMHOST_API void check_vlan(qex_uint16 vlan);

inline constexpr std::int32_t kNoPriority = -1;

/// The VLANs of a port. The priority is a property of its own, which goes with them.
struct SIMHOST_API PortVlans {
  static constexpr std::string_view kBytes = "VSPortVlanPolicy and its ranges";

  qex_uint16 vlan = 0;
  std::int32_t priority = kNoPriority;
  bool guest_tagging = false;
  bool private_vlan = false;
  std::vector<qex_NEBPortVIDRange> ranges = {};

  [[nodiscard]] Bytes to_bytes() const;
  /// Refuses another size than the count of the ranges makes, and unknown bits (QEX_BAD_PARAM).
  static PortVlans from(BytesView bytes);

  [[nodiscard]] std::optional<std::int32_t> priority_if_any() const {
    return priority == kNoPriority ? std::nullopt : std::optional(priority);
  }
  void join_priority(std::int32_t other) { priority = other; }
};

/// The rules of a port's VLANs: refuses VLANs past the greatest (QEX_BAD_VLANID), ranges whose ends
/// or which themselves are not in rising order or that share a VLAN, ranges beside a private VLAN
/// (QEX_BAD_PARAM).
SIMHOST_API void check_port_vlans(PortVlans const &port);
/// Refuses a private VLAN that is not in the switch's map (QEX_BAD_VLANID).
SIMHOST_API void check_is_in_map(Setting const &setting);

using PrivateVlans = std::vector<VSPvlanMapEntry>;

/// The rules of a map: refuses VLANs that are none (QEX_BAD_VLANID); unknown types, a promiscuous
/// entry of two VLANs or another entry of one, a VLAN that is secondary twice or both secondary and
/// primary, two isolated VLANs of one primary (QEX_BAD_PARAM).
SIMHOST_API void check_private_vlans(PrivateVlans const &map);

/// What a port's VLANs are in the form of all kinds of switch.
SIMHOST_API Bytes read_vlan_info(storage::Transaction &transaction,
                                 storage::PropertyOwner const &owner);

inline constexpr auto priority =
    property<std::int32_t>(VSPROP_PORT_PRIORITY)
        .of_port()
        .typed()
        .within(QEX_VLAN_PRIORITY_MINIMUM, QEX_VLAN_PRIORITY_MAXIMUM)
        .defaults_to(kNoPriority)
        .frames_obey()
        .says("the priority of the port's frames; without effect where no frames move");

inline constexpr auto kRange =
    form::range<&qex_NEBPortVIDRange::minVID, &qex_NEBPortVIDRange::maxVID>(0, kGreatest);
inline constexpr std::array kMembers{
    form::sparse("id", form::number<&PortVlans::vlan>(0, kGreatest), "the port's VLAN; 0 is none"),
    form::sparse("trunk", form::list<form::VectorField<&PortVlans::ranges>>(kRange, UINT16_MAX),
                 "VLANs that its client tags itself, numbers and ranges in rising order"),
    form::sparse(
        "priority",
        form::number<&PortVlans::priority>(QEX_VLAN_PRIORITY_MINIMUM, QEX_VLAN_PRIORITY_MAXIMUM),
        "the priority of its frames", kNoPriority),
    form::sparse("private", form::boolean<&PortVlans::private_vlan>(),
                 "whether the VLAN is one of the switch's `private_vlans`"),
    form::sparse("guest_tagging", form::boolean<&PortVlans::guest_tagging>(),
                 "whether its client tags its frames itself"),
};

inline constexpr auto of_port =
    property<PortVlans>(VSPROP_PORT_VLAN)
        .of_port()
        .typed()
        .obeys<check_port_vlans>()
        .fits(check_is_in_map)
        .json("vlan", form::record_or_first<PortVlans>(kMembers))
        .json_of_uplink_port("vlan")
        .together_with<std::int32_t, &PortVlans::priority_if_any, &PortVlans::join_priority>(
            priority, "priority")
        .frames_obey()
        .says("the VLANs of the port, all of them; a number is the `id` alone");

inline constexpr auto nested_tag = property<qex_Bool>(VSPROP_PORT_VLAN_NESTEDTAG)
                                       .of_port()
                                       .typed()
                                       .defaults_to(0)
                                       .json("nested_tag")
                                       .json_of_uplink_port("nested_tag")
                                       .frames_obey()
                                       .says(
                                           "whether frames of the port may have two tags; "
                                           "without effect where no frames move");

inline constexpr auto info = property<Bytes>(QEX_NEBPROP_PORT_VLAN)
                                 .of_port()
                                 .transient()
                                 .computed_by(read_vlan_info)
                                 .in_bytes("qex_NEBPortVlanInfo and its ranges")
                                 .says(
                                     "the VLANs of the port, as switches of every kind have "
                                     "them");

inline constexpr auto client_vlan = property<qex_uint16>(QEX_NEBPROP_PORT_QEXNIC_VLANID)
                                        .of_port()
                                        .config()
                                        .within(0, kGreatest, QEX_BAD_VLANID)
                                        .says("the VLAN of the port's own client");

inline constexpr std::array<Word, 3> kTypes{{{"promiscuous", VSPORT_PVLAN_TYPE_PROMISC},
                                             {"isolated", VSPORT_PVLAN_TYPE_ISOLATED},
                                             {"community", VSPORT_PVLAN_TYPE_COMMUNITY}}};
inline constexpr std::array kEntryMembers{
    form::required_member("primary", form::number<&VSPvlanMapEntry::primaryVID>(kLeast, kGreatest),
                          "the VLAN that others see"),
    form::required_member("secondary",
                          form::number<&VSPvlanMapEntry::secondaryVID>(kLeast, kGreatest),
                          "the VLAN inside it, of a promiscuous entry the same"),
    form::required_member("type", form::choice<&VSPvlanMapEntry::pvlanType>(kTypes),
                          "what the ports of the secondary VLAN may reach"),
};
inline constexpr auto kEntry = form::record<VSPvlanMapEntry>(kEntryMembers);

inline constexpr auto private_vlans =
    property<PrivateVlans>(VSPROP_PVLAN_MAP)
        .of_switch()
        .typed()
        .obeys<check_private_vlans>()
        .in_bytes("VSPvlanMapEntry for each entry")
        .json("private_vlans", form::list<form::WholeVector<PrivateVlans>>(kEntry, kNumbers))
        .frames_obey()
        .says("the private VLANs of the switch, all of them");

inline constexpr std::array<Descriptor const *, 6> kProperties{
    &private_vlans, &of_port, &priority, &nested_tag, &info, &client_vlan};

}  // namespace simhost::vlans
