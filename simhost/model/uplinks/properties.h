// Settings of uplink ports: what they are called.
#pragma once

#include <array>

#include "model/ports/ports.h"
#include "model/properties/descriptor.h"
#include "qexapi/switch_properties.h"

namespace simhost::uplinks {

inline constexpr auto names =
    property<Bytes>(QEX_NEBPROP_SWITCH_UPLINKPORTS)
        .of_switch()
        .typed()
        .computed_by(read_uplink_names, write_uplink_names)
        .in_bytes("VSUplinkPorts")
        .says("the names of the uplink ports; setting it adds, renames and removes ports");

inline constexpr auto identifiers =
    property<Bytes>(QEX_NEBPROP_HOST_UPLINKPORTS)
        .of_host()
        .typed()
        .computed_by(read_uplink_ids, write_uplink_ids)
        .in_bytes("VSUplinkPortIds")
        .says("the identifiers of the uplink ports; setting it adds and removes ports");

inline constexpr std::array<Descriptor const *, 2> kProperties{&names, &identifiers};

}  // namespace simhost::uplinks
