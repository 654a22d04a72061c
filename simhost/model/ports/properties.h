// Settings of ports that belong to no policy: what they are called, who is there, how they are.
#pragma once

#include <array>

#include "model/ports/ports.h"
#include "model/ports/runtime_state.h"
#include "model/properties/descriptor.h"
#include "nebpublic/ports.h"
#include "qexapi/links.h"
#include "qexapi/switch_ports.h"
#include "qexapi/switch_properties.h"

namespace simhost::ports {

inline constexpr auto alias = property<std::string>(QEX_NEBPROP_PORT_ALIAS)
                                  .of_port()
                                  .config()
                                  .up_to(kLongestName)
                                  .defaults_to("")
                                  .fits(check_port_alias)
                                  .json("alias")
                                  .json_of_uplink_port("name")
                                  .says(
                                      "what people call the port; of an uplink port its name, by "
                                      "which teaming knows it");
inline constexpr auto connection =
    property<qex_uint32>(QEX_NEBPROP_PORT_CONNECTID)
        .of_port()
        .config()
        .typed()
        .defaults_to(0)
        .json("connection")
        .says("the number that the client of the port must show, its connect identifier");
inline constexpr auto blocked =
    property<qex_Bool>(QEX_NEBPROP_PORT_BLOCK)
        .of_port()
        .defaults_to(0)
        .json("blocked")
        .json_of_uplink_port("blocked")
        .frames_obey()
        .says("whether the port is blocked, which its status says as well");

inline constexpr auto type = property<qex_uint32>(QEX_NEBPROP_PORT_TYPE)
                                 .of_port()
                                 .transient()
                                 .within(DVSPORT_TYPE_ACTIVE, DVSPORT_TYPE_LOCALCACHE)
                                 .defaults_to(DVSPORT_TYPE_ACTIVE)
                                 .says("what the port is to this host");
inline constexpr auto client =
    property<Bytes>(QEX_NEBPROP_PORT_VNIC_CONNECTEE)
        .of_port()
        .runtime()
        .any_bytes("the form belongs to the client; that it is set means that there is one");
inline constexpr auto link = property<qex_uint32>(QEX_NEBPROP_PORT_LINK_STATUS)
                                 .of_port()
                                 .runtime()
                                 .within(QEX_LINK_STATE_DOWN, QEX_LINK_STATE_UP)
                                 .computed_by(read_link_status, write_link_status)
                                 .says(
                                     "the link: of an uplink port that of its uplink, only read; "
                                     "of another up while it has a client whose side is up, which "
                                     "setting it sets. Cannot be cleared");
inline constexpr auto status = property<qex_NEBPortStatus>(QEX_NEBPROP_PORT_STATUS)
                                   .of_port()
                                   .transient()
                                   .computed_by(read_port_status)
                                   .says("in use with an uplink or a client, the link, blocked");
inline constexpr auto statistics = property<qex_NEBPortStatistics>(QEX_NEBPROP_PORT_STATISTICS)
                                       .of_port()
                                       .runtime()
                                       .computed_by(read_port_statistics)
                                       .says("the counters of the port");
inline constexpr auto persistent =
    property<qex_Bool>(QEX_NEBPROP_PORT_PERSIST).of_port().transient().says("kept without effect");
inline constexpr auto passthrough_allowed =
    property<qex_Bool>(QEX_NEBPROP_PORT_PTALLOWED).of_port().config().says("kept without effect");
inline constexpr auto passthrough_allowed_now = property<qex_Bool>(QEX_NEBPROP_PORT_PTALLOWEDRT)
                                                    .of_port()
                                                    .runtime()
                                                    .says("kept without effect");
inline constexpr auto blocked_until_ready = property<qex_Bool>(QEX_NEBPORT_FORWARD_NOT_READY_BLOCK)
                                                .of_port()
                                                .config()
                                                .says(
                                                    "whether a port that is not ready holds "
                                                    "packets back; kept without effect");

inline constexpr auto group =
    property<Bytes>(QEX_NEBPROP_PORT_PORTGROUP)
        .of_port()
        .config()
        .any_bytes("the form belongs to the manager of the groups, which the host does not know");
inline constexpr auto overlay =
    property<Bytes>(QEX_NEBPROP_PORT_OVERLAY)
        .of_port()
        .config()
        .any_bytes("the form belongs to the overlay's agent; no overlay is modelled");
inline constexpr auto filter_agents =
    property<Bytes>(QEX_NEBPROP_PORT_DVFILTER)
        .of_port()
        .any_bytes("the form belongs to the filters' agents; none is modelled");
inline constexpr auto resource_pools =
    property<Bytes>(QEX_NEBPROP_PORT_RESPOOLS_CFG)
        .of_port()
        .config()
        .any_bytes("no header declares a form; resource pools are not modelled");
inline constexpr auto resource_pool =
    property<Bytes>(QEX_NEBPROP_PORT_RESPOOL_ASSOC)
        .of_port()
        .config()
        .any_bytes("no header declares a form; resource pools are not modelled");
inline constexpr auto shaped_input =
    property<Bytes>(QEX_NEBPROP_PORT_SHAPER_INPUT)
        .of_port()
        .any_bytes("no header declares a form; shaping is not modelled");
inline constexpr auto shaped_broadcast =
    property<Bytes>(QEX_NEBPROP_PORT_SHAPER_BROADCAST)
        .of_port()
        .any_bytes("no header declares a form; shaping is not modelled");
inline constexpr auto shaped_output =
    property<Bytes>(QEX_NEBPROP_PORT_SHAPER_OUTPUT)
        .of_port()
        .any_bytes("no header declares a form; shaping is not modelled");

inline constexpr std::array<Descriptor const *, 20> kProperties{&alias,
                                                                &connection,
                                                                &blocked,
                                                                &type,
                                                                &client,
                                                                &link,
                                                                &status,
                                                                &statistics,
                                                                &persistent,
                                                                &passthrough_allowed,
                                                                &passthrough_allowed_now,
                                                                &blocked_until_ready,
                                                                &group,
                                                                &overlay,
                                                                &filter_agents,
                                                                &resource_pools,
                                                                &resource_pool,
                                                                &shaped_input,
                                                                &shaped_broadcast,
                                                                &shaped_output};

}  // namespace simhost::ports
