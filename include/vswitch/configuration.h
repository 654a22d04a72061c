#ifndef VSWITCH_CONFIGURATION_H
#define VSWITCH_CONFIGURATION_H

/**
 * @file
 * Configuring distributed switches: VSDVS_*.
 *
 * Every call returns a status and reads or writes one property, whose key its group names. The
 * arguments are the caller's; they are read during the call and not kept. Texts are NUL-terminated
 * UTF-8. An output is meaningful only with QEX_OK. What an output pointer refers to was allocated
 * by the library and is released with VSDVS_FreeMemory.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`switchName`, `switchId`, `port`, `uplink`,
 *   `portsetName`)
 * - QEX_BAD_PARAM for a null where nothing allows it
 *
 * @param switchName alias of the switch
 * @param switchId identifier of the switch
 * @param port identifier of the port
 * @param uplink name of the uplink
 * @param portsetName name of the set of ports
 * @param enabled 1 or 0
 */

#include "qexapi/names.h"
#include "qexapi/status.h"
#include "qexapi/switch_ports.h"
#include "qexapi/types.h"
#include "vswitch/mac_learning.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/mirror.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/teaming.h"
#include "vswitch/uplinks.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Creates a distributed switch on this host.
 *
 * The module passes every argument through unchanged.
 *
 * - QEX_EXISTS if one of the three names is taken
 * - QEX_NAME_TOO_LONG if one is too long
 * - QEX_BAD_PARAM for a number out of its bounds
 * - QEX_NO_RESOURCES if there are not `uplinkCount` free uplinks
 *
 * @param alias name of the new switch, 1 to 127 bytes
 * @param switchId identifier of the distributed switch, up to 63 bytes; null or empty lets the host
 *                 choose
 * @param portsetName name of its set of ports, up to 127 bytes; null or empty lets the host choose
 * @param maxPorts room for ports, uplink ports not counted, at most 65,535; 0 is the default of 128
 * @param persistent whether the switch survives a restart of the host
 * @param version version of the distributed switch; 0 is VS_YKT_NEB_VERSION_20
 * @param mtu 1,280 to 9,190 bytes; 0 is the default of 1,500
 * @param uplinkCount free uplinks of the host to attach to uplink ports `uplink1`, `uplink2`, ...
 */
QEX_ReturnStatus VSDVS_CreateVSwitch(char const *alias, char const *switchId,
                                     char const *portsetName, qex_uint32 maxPorts,
                                     qex_Bool persistent, qex_uint32 version, qex_uint32 mtu,
                                     qex_uint32 uplinkCount);

/** Destroys a switch with its ports and properties. */
QEX_ReturnStatus VSDVS_DestroyVSwitch(char const *switchName);

/**
 * Adds a port to a switch.
 *
 * - QEX_EXISTS if `port` is taken
 * - QEX_NAME_TOO_LONG if `port` is longer than it may be
 * - QEX_LIMIT_EXCEEDED if the switch has no room for another
 *
 * @param port identifier of the new port, 1 to 47 bytes
 * @param connectId number that the port's client must show to connect; passed through unchanged
 */
QEX_ReturnStatus VSDVS_AddDVPort(char const *switchName, char const *port, qex_uint32 connectId);

/**
 * Adds a port that another system manages.
 *
 * - QEX_EXISTS if one of the two names is taken
 * - QEX_NAME_TOO_LONG if one is longer than it may be
 * - QEX_LIMIT_EXCEEDED if the switch has no room for another
 *
 * @param port identifier of the new port, 1 to 47 bytes
 * @param externalId the other system's name for it, 1 to 47 bytes; passed through unchanged
 */
QEX_ReturnStatus VSDVS_AddOpaqueDVPort(char const *switchName, char const *port,
                                       char const *externalId);

/**
 * Removes a port with its properties.
 *
 * - QEX_BUSY for an uplink port with its uplink
 */
QEX_ReturnStatus VSDVS_RemoveDVPort(char const *switchName, char const *port);

/** Puts the number that the running switch gave a port into `portID`. */
QEX_ReturnStatus VSDVS_DvPortIDToPortID(char const *switchName, char const *port, int *portID);

/** VSDVS_DvPortIDToPortID for a switch that is named by its identifier. */
QEX_ReturnStatus VSDVS_DvPortIDToPortIDFromDVSID(char const *switchId, char const *port,
                                                 int *portID);

/** Writes the alias of a set of ports into `aliasBuffer`: at most 128 bytes of text and a NUL. */
QEX_ReturnStatus VSDVS_GetAliasFromPortset(char const *portsetName, char *aliasBuffer);

/** Returns the uplink ports of a switch, as names and as identifiers in the same order. */
QEX_ReturnStatus VSDVS_GetSwitchUplinkPorts(char const *switchName, VSUplinkPorts **names,
                                            VSUplinkPortIds **ids);

/**
 * Makes the uplink ports of a switch those with `ids`; both lists hold as many entries.
 *
 * A port that the switch has keeps its uplink and gets its new name, a new one has no uplink, and
 * what is left out is removed.
 *
 * - QEX_EXISTS for a name or an identifier twice
 * - QEX_LIMIT_EXCEEDED for more than 32 ports
 */
QEX_ReturnStatus VSDVS_SetSwitchUplinkPorts(char const *switchName, VSUplinkPorts const *names,
                                            VSUplinkPortIds const *ids);

/**
 * Attaches an uplink of the host to an uplink port of a switch that has none, or to a new one.
 *
 * - QEX_EXISTS if the switch has the uplink
 * - QEX_BUSY if another switch has it
 * - QEX_LIMIT_EXCEEDED if the switch has 32 uplink ports, none of them free
 */
QEX_ReturnStatus VSDVS_AddSwitchUplinkPort(char const *switchName, char const *uplink);

/** Takes an uplink from a switch, with its uplink port. */
QEX_ReturnStatus VSDVS_RemoveSwitchUplinkPort(char const *switchName, char const *uplink);

/** Takes all uplinks and uplink ports from a switch. */
QEX_ReturnStatus VSDVS_ClearSwitchUplinkPorts(char const *switchName);

/** Reads the MTU of a switch, in bytes; VSPROP_MTU. */
QEX_ReturnStatus VSDVS_GetMTU(char const *switchName, qex_uint32 *mtu);

/**
 * Sets the MTU of a switch.
 *
 * - QEX_BAD_PARAM for an MTU out of its bounds
 *
 * @param mtu 1,280 to 9,190 bytes
 */
QEX_ReturnStatus VSDVS_SetMTU(char const *switchName, qex_uint32 mtu);

/** Fills `policy` with the teaming of a switch; VSPROP_SWITCH_TEAMING. */
QEX_ReturnStatus VSDVS_GetTeamingPolicy(char const *switchName, VSTeamPolicy *policy);

/**
 * Sets the teaming of a switch; the names need not exist yet.
 *
 * - QEX_LIMIT_EXCEEDED for more names than there are slots
 * - QEX_NAME_TOO_LONG for a name that fills its slot without a NUL
 * - QEX_BAD_PARAM for an unknown value or bit, and for an empty name or one that is there twice
 */
QEX_ReturnStatus VSDVS_SetTeamingPolicy(char const *switchName, VSTeamPolicy const *policy);

/** Returns the teaming of a switch to the default. */
QEX_ReturnStatus VSDVS_ClearTeamingPolicy(char const *switchName);

/** VSDVS_GetTeamingPolicy for a switch that is named by its identifier. */
QEX_ReturnStatus VSDVS_GetTeamingPolicyFromDVSID(char const *switchId, VSTeamPolicy *policy);

/**
 * Fills `policy` with the teaming of a port, its switch's if it has none of its own;
 * VSPROP_PORT_TEAMING_POLICY.
 */
QEX_ReturnStatus VSDVS_GetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy *policy);

/**
 * Sets the teaming of a port.
 *
 * - QEX_LIMIT_EXCEEDED for more names than there are slots
 * - QEX_NAME_TOO_LONG for a name that fills its slot without a NUL
 * - QEX_BAD_PARAM for an unknown value or bit, and for an empty name or one that is there twice
 */
QEX_ReturnStatus VSDVS_SetPortTeamingPolicy(char const *switchName, char const *port,
                                            VSTeamPolicy const *policy);

/** Returns a port to the teaming of its switch. */
QEX_ReturnStatus VSDVS_ClearPortTeamingPolicy(char const *switchName, char const *port);

/**
 * Reads the uplink port that a port uses whatever its teaming says, empty if there is none;
 * VSPROP_PORT_TEAMING_OVERRIDE.
 *
 * @param overrideBuffer room for 82 bytes: at most 81 bytes of text and a NUL
 */
QEX_ReturnStatus VSDVS_GetPortTeamingOverride(char const *switchName, char const *port,
                                              char *overrideBuffer);

/**
 * Binds a port to an uplink port whatever its teaming says.
 *
 * - QEX_NAME_TOO_LONG for a name of more than 81 bytes
 *
 * @param overrideName name of the uplink port
 */
QEX_ReturnStatus VSDVS_SetPortTeamingOverride(char const *switchName, char const *port,
                                              char const *overrideName);

/** Returns a port to its teaming. */
QEX_ReturnStatus VSDVS_ClearPortTeamingOverride(char const *switchName, char const *port);

/** Reads whether all that a port sends goes out of an uplink; VSPROP_PORT_TX_UPLINK. */
QEX_ReturnStatus VSDVS_GetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool *enabled);

/** Sets whether all that a port sends goes out of an uplink. */
QEX_ReturnStatus VSDVS_SetTxUplinkAlways(char const *switchName, char const *port,
                                         qex_Bool enabled);

/** Fills `learning` with the MAC learning of a switch; VSPROP_SWITCH_MAC_LEARNING. */
QEX_ReturnStatus VSDVS_GetMACLearning(char const *switchName, VSMACLearning *learning);

/**
 * Sets the MAC learning of a switch.
 *
 * - QEX_BAD_PARAM for an ageing time out of its bounds
 */
QEX_ReturnStatus VSDVS_SetMACLearning(char const *switchName, VSMACLearning const *learning);

/** Returns the MAC learning of a switch to the default. */
QEX_ReturnStatus VSDVS_ClearMACLearning(char const *switchName);

/** Fills `learning` with the MAC learning of a port, a part of VSPROP_PORT_MAC_MANAGEMENT. */
QEX_ReturnStatus VSDVS_GetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning *learning);

/**
 * Sets the MAC learning of a port.
 *
 * - QEX_LIMIT_EXCEEDED for more than VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX addresses
 * - QEX_BAD_PARAM for an unknown value
 */
QEX_ReturnStatus VSDVS_SetPortMACLearning(char const *switchName, char const *port,
                                          VSPMACLearning const *learning);

/** Fills `security` with the security policy of a port; VSPROP_PORT_SECURITY. */
QEX_ReturnStatus VSDVS_GetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity *security);

/**
 * Sets the security policy of a port.
 *
 * - QEX_BAD_PARAM for an unknown bit
 */
QEX_ReturnStatus VSDVS_SetPortSecurity(char const *switchName, char const *port,
                                       VSPropSecurity const *security);

/** Fills `filter` with the extra frames a port accepts; VSPROP_PORT_EXTRA_ETH_FRP. */
QEX_ReturnStatus VSDVS_GetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter *filter);

/**
 * Sets the extra frames a port accepts.
 *
 * - QEX_LIMIT_EXCEEDED for more addresses than there are places
 * - QEX_BAD_PARAM for an unknown bit and for an address that is not multicast
 */
QEX_ReturnStatus VSDVS_SetExtraEthFilter(char const *switchName, char const *port,
                                         VSExtraEthFilter const *filter);

/** Leaves a port with the frames for its client. */
QEX_ReturnStatus VSDVS_ClearExtraEthFilter(char const *switchName, char const *port);

/**
 * Reads whether a port takes the frames that no other port of its switch takes; the bit
 * QEX_ETH_FILTER_SINK of VSPROP_PORT_EXTRA_ETH_FRP.
 */
QEX_ReturnStatus VSDVS_IsSinkPortEnabled(char const *switchName, char const *port,
                                         qex_Bool *enabled);

/** Sets whether a port takes the frames that no other port of its switch takes. */
QEX_ReturnStatus VSDVS_ConfigureSinkPort(char const *switchName, char const *port,
                                         qex_Bool enabled);

/** Puts the VSMcastFilterMode of a switch into `mode`; VSPROP_MULTICAST_FILTER. */
QEX_ReturnStatus VSDVS_GetMcastFilterMode(char const *switchName, int *mode);

/**
 * Sets how a switch filters multicast.
 *
 * - QEX_BAD_PARAM for an unknown mode
 */
QEX_ReturnStatus VSDVS_SetMcastFilterMode(char const *switchName, VSMcastFilterMode mode);

/**
 * Returns the VLANs of a port, and its priority, -1 if it has none; VSPROP_PORT_VLAN,
 * VSPROP_PORT_PRIORITY.
 */
QEX_ReturnStatus VSDVS_GetPortVLANPolicy(char const *switchName, char const *port,
                                         VSPortVlanPolicy **policy, int *priority);

/**
 * Sets the VLANs of a port.
 *
 * The module passes every argument through unchanged.
 *
 * - QEX_BAD_VLANID for a VLAN past 4094, and with `privateVlan` for one that is no secondary VLAN
 * - QEX_BAD_PARAM for ranges that share a VLAN or do not rise, and for another priority
 *
 * @param vlanID VLAN of untagged frames; 0 is none
 * @param priority priority of the port's frames, 0 to 7; -1 leaves it to the frames
 * @param guestTagging whether the client tags its frames itself, with VLANs of the ranges
 * @param privateVlan whether `vlanID` is a secondary VLAN of the switch's private-VLAN map
 * @param ranges the VLANs of a trunk in rising order, none with `privateVlan`; null with none
 * @param numRanges how many ranges
 */
QEX_ReturnStatus VSDVS_SetPortVLANPolicy(char const *switchName, char const *port,
                                         qex_uint16 vlanID, int priority, qex_Bool guestTagging,
                                         qex_Bool privateVlan, qex_NEBPortVIDRange *ranges,
                                         qex_uint16 numRanges);

/** Takes a port out of all VLANs. */
QEX_ReturnStatus VSDVS_ClearPortVLANPolicy(char const *switchName, char const *port);

/** Reads whether the client of a port may nest its VLAN tags; VSPROP_PORT_VLAN_NESTEDTAG. */
QEX_ReturnStatus VSDVS_GetPortNestedVLANTagging(char const *switchName, char const *port,
                                                qex_Bool *enabled);

/** Sets whether the client of a port may nest its VLAN tags. */
QEX_ReturnStatus VSDVS_SetPortNestedVLANTagging(char const *switchName, char const *port,
                                                qex_Bool enabled);

/**
 * Returns the private-VLAN map of a switch as an array of `count` entries, null if there are
 * none; VSPROP_PVLAN_MAP.
 */
QEX_ReturnStatus VSDVS_GetPrivateVLANMap(char const *switchName, VSPvlanMapEntry **entries,
                                         int *count);

/**
 * Replaces the private-VLAN map of a switch; null with a count of 0 empties it.
 *
 * - QEX_BAD_VLANID for a VLAN of 0 or past 4094
 * - QEX_BAD_PARAM for a map that contradicts itself: a VLAN that is secondary twice, or secondary
 *   and primary, two isolated VLANs of one primary
 *
 * @param entries the whole map
 * @param count how many entries
 */
QEX_ReturnStatus VSDVS_SetPrivateVLANMap(char const *switchName, VSPvlanMapEntry const *entries,
                                         int count);

/** Returns the mirror sessions of a port; VSPROP_PORT_MIRROR_SESSIONS. */
QEX_ReturnStatus VSDVS_GetDVMirrorSessions(char const *switchName, char const *port,
                                           DVMirrorSessionTable **table);

/**
 * Adds the sessions of `table` to those of a port.
 *
 * - QEX_EXISTS if an identifier is taken
 * - QEX_VERSION_MISMATCH_MAJOR for a table of an unknown version
 * - QEX_BAD_PARAM for a table that does not hold what it counts
 * - QEX_LIMIT_EXCEEDED for more than 1,024 sessions of a port
 */
QEX_ReturnStatus VSDVS_AppendDVMirrorSessions(char const *switchName, char const *port,
                                              DVMirrorSessionTable *table);

/**
 * Removes a session from a port.
 *
 * - QEX_NOT_FOUND if the port has no such session
 *
 * @param sid identifier of the session, up to 31 bytes
 */
QEX_ReturnStatus VSDVS_RemoveDVMirrorSession(char const *switchName, char const *port,
                                             char const sid[32]);

/** Removes all mirror sessions from a port. */
QEX_ReturnStatus VSDVS_ClearDVMirrorSessions(char const *switchName, char const *port);

/**
 * Releases memory that a VSDVS_* call allocated.
 *
 * @param memory what the library allocated, once; null does nothing
 */
void VSDVS_FreeMemory(void *memory);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_CONFIGURATION_H
