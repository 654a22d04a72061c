// Settings of switches as a whole.
#pragma once

#include <array>

#include "model/properties/descriptor.h"
#include "model/switches/switches.h"
#include "qexapi/switch_ports.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"

namespace simhost::switches {

inline constexpr auto alias = property<std::string>(QEX_NEBPROP_SWITCH_ALIAS)
                                  .of_switch()
                                  .up_to(kLongestAlias)
                                  .computed_by(read_alias, write_alias)
                                  .says("the switch's own alias, to be set but not cleared");
inline constexpr auto version = property<qex_uint32>(QEX_NEBPROP_SWITCH_VERSION)
                                    .of_switch()
                                    .computed_by(read_version, write_version)
                                    .says("the switch's own version, to be set but not cleared");
inline constexpr auto portset = property<std::string>(QEX_NEBPROP_HOST_PROXY)
                                    .of_host()
                                    .up_to(kLongestPortset)
                                    .computed_by(read_portset)
                                    .says("the name of the set of ports");

inline constexpr auto mtu = property<qex_uint32>(VSPROP_MTU)
                                .of_switch()
                                .typed()
                                .within(1280, 9190)
                                .defaults_to(1500)
                                .json("mtu")
                                .always_said()
                                .frames_obey()
                                .says("bytes of the largest packet");
inline constexpr auto disabled = property<qex_Bool>(VSPROP_SWITCH_FORWARDING_DISABLED)
                                     .of_switch()
                                     .defaults_to(0)
                                     .json("disabled")
                                     .frames_obey()
                                     .says(
                                         "whether the switch forwards nothing; without "
                                         "effect where no frames move");

inline constexpr auto host_status =
    property<qex_uint32>(QEX_NEBPROP_HOST_STATUS)
        .of_host()
        .transient()
        .within(QEX_NEB_STATUS_OK, QEX_NEB_STATUS_DOWN)
        .says(
            "how well the host's part of the switch is; what was set, for nothing here decides "
            "it");
inline constexpr auto status =
    property<qex_uint32>(VSPROP_SWITCH_STATUS)
        .of_host()
        .transient()
        .within(QEX_NEB_STATUS_OK, QEX_NEB_STATUS_DOWN)
        .says("how well the switch is; what was set, for nothing here decides it");
inline constexpr auto portset_state =
    property<qex_uint32>(QEX_NEBPROP_HOST_PROXY_STATE)
        .of_host()
        .transient()
        .within(QEX_NEBPORTSET_STATE_DEACTIVE, QEX_NEBPORTSET_STATE_HOTSWAP)
        .says("the state of the set of ports; what was set, for nothing here decides it");

inline constexpr auto overlay =
    property<Bytes>(QEX_NEBPROP_SWITCH_OVERLAY)
        .of_switch()
        .any_bytes("the form belongs to the overlay's agent; no overlay is modelled");
inline constexpr auto resource_pools =
    property<Bytes>(QEX_NEBPROP_SWITCH_RESPOOLS_LIST)
        .of_switch()
        .any_bytes("no header declares a form; resource pools are not modelled");
inline constexpr auto resource_scheduler =
    property<Bytes>(QEX_NEBPROP_SWITCH_RESPOOLS_SCHED)
        .of_switch()
        .any_bytes("no header declares a form; resource pools are not modelled");
inline constexpr auto link_discovery =
    property<Bytes>(QEX_CISCO_PROP_SWITCH_CDP)
        .of_switch()
        .any_bytes("no header declares a form; link discovery is not modelled");

inline constexpr std::array<Descriptor const *, 12> kProperties{&alias,
                                                                &version,
                                                                &mtu,
                                                                &disabled,
                                                                &overlay,
                                                                &resource_pools,
                                                                &resource_scheduler,
                                                                &link_discovery,
                                                                &portset,
                                                                &host_status,
                                                                &portset_state,
                                                                &status};

}  // namespace simhost::switches
