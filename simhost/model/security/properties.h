// Settings of security: what the client of a port may not do.
#pragma once

#include <array>

#include "model/properties/descriptor.h"
#include "vswitch/port_policies.h"
#include "vswitch/properties.h"

namespace simhost::security {

inline constexpr std::array<Word, 3> kForbidden{
    {{"promiscuous", VSPORT_SECURITY_DISALLOW_PROMISC},
     {"mac_changes", VSPORT_SECURITY_DISALLOW_MAC_CHANGE},
     {"forged_transmits", VSPORT_SECURITY_DISALLOW_FORGED_SRC}}};

inline constexpr auto forbids =
    property<VSPropSecurity>(VSPROP_PORT_SECURITY)
        .of_port()
        .typed()
        .defaults_to({.flags = 0})
        .json("forbids", form::bits<&VSPropSecurity::flags>(kForbidden))
        .frames_obey()
        .frames_cannot(
            "`mac_changes`: whose device is no other end of a veth pair, changes it unseen")
        .says(
            "what the client of the port may not do; `promiscuous` keeps it out of promiscuous "
            "mirror sessions, the others are without effect where no frames move");

inline constexpr std::array<Descriptor const *, 1> kProperties{&forbids};

}  // namespace simhost::security
