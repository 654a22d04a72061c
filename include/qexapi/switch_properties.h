#ifndef QEXAPI_SWITCH_PROPERTIES_H
#define QEXAPI_SWITCH_PROPERTIES_H

/**
 * @file
 * Keys of the properties that distributed switches of every kind have.
 */

/** Properties of a switch, of the host's part of it, and of its ports. */
#define QEX_NEBPROP_SWITCH_ALIAS "com.quorix.common.alias"
#define QEX_NEBPROP_SWITCH_VERSION "com.quorix.common.version"
#define QEX_NEBPROP_SWITCH_UPLINKPORTS "com.quorix.common.uplinkPorts"
#define QEX_NEBPROP_SWITCH_OVERLAY "com.quorix.common.overlay"
#define QEX_NEBPROP_SWITCH_RESPOOLS_LIST "com.quorix.common.respools.list"
#define QEX_NEBPROP_SWITCH_RESPOOLS_SCHED "com.quorix.common.respools.sched"
#define QEX_NEBPROP_HOST_STATUS "com.quorix.common.host.volatile.status"
#define QEX_NEBPROP_HOST_PROXY_STATE "com.quorix.common.host.portset.volatile.state"
#define QEX_NEBPROP_HOST_PROXY "com.quorix.common.host.portset"
#define QEX_NEBPROP_HOST_UPLINKPORTS "com.quorix.common.host.uplinkPorts"
#define QEX_NEBPROP_PORT_STATUS "com.quorix.common.port.volatile.status"
#define QEX_NEBPROP_PORT_TYPE "com.quorix.common.port.volatile.type"
#define QEX_NEBPROP_PORT_VLAN "com.quorix.common.port.volatile.vlan"
#define QEX_NEBPROP_PORT_PERSIST "com.quorix.common.port.volatile.persist"
#define QEX_NEBPROP_PORT_PTALLOWED "com.quorix.common.port.ptAllowed"
#define QEX_NEBPROP_PORT_PTALLOWEDRT "com.quorix.common.port.ptAllowedRT"
#define QEX_NEBPROP_PORT_STATISTICS "com.quorix.common.port.statistics"
#define QEX_NEBPROP_PORT_ALIAS "com.quorix.common.port.alias"
#define QEX_NEBPROP_PORT_CONNECTID "com.quorix.common.port.connectid"
#define QEX_NEBPROP_PORT_QEXNIC_VLANID "com.quorix.common.port.qexnicVlanID"
#define QEX_NEBPROP_PORT_VNIC_CONNECTEE "com.quorix.common.port.vnicConnectee"
#define QEX_NEBPROP_PORT_PORTGROUP "com.quorix.common.port.portgroupid"
#define QEX_NEBPROP_PORT_BLOCK "com.quorix.common.port.block"
#define QEX_NEBPROP_PORT_LINK_STATUS "com.quorix.common.port.linkstatus"
#define QEX_NEBPROP_PORT_RESPOOLS_CFG "com.quorix.common.port.respools.cfg"
#define QEX_NEBPROP_PORT_RESPOOL_ASSOC "com.quorix.common.port.respool.assoc"
#define QEX_NEBPROP_PORT_SHAPER_INPUT "com.quorix.common.port.shaper.input"
#define QEX_NEBPROP_PORT_SHAPER_BROADCAST "com.quorix.common.port.shaper.broadcast"
#define QEX_NEBPROP_PORT_SHAPER_OUTPUT "com.quorix.common.port.shaper.output"
#define QEX_NEBPROP_PORT_OVERLAY "com.quorix.common.port.overlay"
#define QEX_NEBPROP_PORT_DVFILTER "com.quorix.common.port.dvfilter"

/** Whether a port that is not ready holds packets back. */
#define QEX_NEBPORT_FORWARD_NOT_READY_BLOCK "com.quorix.port.forward.not.ready.block"

/** Link discovery of a switch. */
#define QEX_CISCO_PROP_SWITCH_CDP "com.cisco.svs.switch.cdp"

#endif  // QEXAPI_SWITCH_PROPERTIES_H
