#ifndef VSWITCH_PROPERTIES_H
#define VSWITCH_PROPERTIES_H

/**
 * @file
 * Keys of the properties that this kind of switch has.
 */

/** The class of the switch's port sets, and the name of the switch's kind. */
#define PS_CLASS_NAME "cswitch"
#define SWNAME "CSwitch"

/** Properties of a switch and of its ports. */
#define VSPROP_MTU "com.quorix.vswitch.mtu"
#define VSPROP_PVLAN_MAP "com.quorix.vswitch.pvlanMap"
#define VSPROP_MULTICAST_FILTER "com.quorix.vswitch.multicastFilter"
#define VSPROP_SWITCH_TEAMING "com.quorix.vswitch.teaming"
#define VSPROP_SWITCH_FORWARDING_DISABLED "com.quorix.vswitch.disabled"
#define VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS "com.quorix.vswitch.uplinkMirrorSessions"
#define VSPROP_SWITCH_MAC_LEARNING "com.quorix.vswitch.macLearning"
#define VSPROP_PORT_SECURITY "com.quorix.vswitch.port.security"
#define VSPROP_PORT_TEAMING_POLICY "com.quorix.vswitch.port.teaming.policy"
#define VSPROP_PORT_TEAMING_OVERRIDE "com.quorix.vswitch.port.teaming.override"
#define VSPROP_PORT_VLAN "com.quorix.vswitch.port.vlan"
#define VSPROP_PORT_PRIORITY "com.quorix.vswitch.port.priority"
#define VSPROP_PORT_TX_UPLINK "com.quorix.vswitch.port.txUplink"
#define VSPROP_PORT_MIRROR_SESSIONS "com.quorix.vswitch.port.mirrorSessions"
#define VSPROP_PORT_VLAN_NESTEDTAG "com.quorix.vswitch.port.vlanNestedTag"
#define VSPROP_PORT_EXTRA_ETH_FRP "com.quorix.vswitch.port.extraEthFRP"
#define VSPROP_PORT_MAC_MANAGEMENT "com.quorix.vswitch.port.macManagement"
#define VSPROP_PORT_MAC_LEARNING_STATS "com.quorix.vswitch.port.macLearningStats"
#define VSPROP_SWITCH_STATUS "com.quorix.common.opaqueDvs.status.component.vswitch"

#endif  // VSWITCH_PROPERTIES_H
