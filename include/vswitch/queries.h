#ifndef VSWITCH_QUERIES_H
#define VSWITCH_QUERIES_H

/**
 * @file
 * Asking the running switches of this host, and commanding them: VSQEX_*.
 *
 * Every call returns a status. The arguments are the caller's; they are read during the call and
 * not kept. Texts are NUL-terminated UTF-8. An output is meaningful only with QEX_OK. What an
 * output pointer refers to was allocated by the library and is released with VSQEX_FreeMemory.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`switchName`, `port`, `uplink`, `sid`)
 * - QEX_BAD_PARAM for a null where nothing allows it
 *
 * @param switchName alias of the switch
 * @param port identifier of the port
 * @param uplink name of the uplink
 * @param sid identifier of the session, up to 31 bytes
 */

#include "qexapi/links.h"
#include "qexapi/names.h"
#include "qexapi/status.h"
#include "qexapi/types.h"
#include "vswitch/lags.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/mcast_filters.h"
#include "vswitch/mirror.h"
#include "vswitch/runtime_options.h"
#include "vswitch/statistics.h"
#include "vswitch/switch_info.h"
#include "vswitch/uplinks.h"

#ifdef __cplusplus
extern "C" {
#endif

/** Fills `info` with what a switch is. */
QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info);

/** Fills `stats` with what a port learned. */
QEX_ReturnStatus VSQEX_GetPortMACLearningStats(char const *switchName, char const *port,
                                               VSPMACLearningStats *stats);

/**
 * Returns the addresses of one kind that a switch's team of uplinks knows.
 *
 * - QEX_BAD_PARAM for an unknown kind
 */
QEX_ReturnStatus VSQEX_GetTeamMACTable(char const *switchName, VSMACAddrType type,
                                       VSMACTable **table);

/**
 * Returns the addresses of one kind that a port knows.
 *
 * - QEX_BAD_PARAM for an unknown kind
 */
QEX_ReturnStatus VSQEX_GetPortMACTable(char const *switchName, char const *port, VSMACAddrType type,
                                       VSMACTable **table);

/**
 * Puts an address, static or a user's, into the table of a port.
 *
 * - QEX_BAD_PARAM for another kind
 * - QEX_INVALID_ADDRESS for an address that is zero or multicast
 * - QEX_BAD_VLANID for a VLAN past 4094
 * - QEX_EXISTS if the address is static or a user's elsewhere
 */
QEX_ReturnStatus VSQEX_SetPortMACTable(char const *switchName, char const *port,
                                       VSMACEntry const *entry);

/**
 * Takes an address out of the table of a port.
 *
 * - QEX_NOT_FOUND for an address of another kind than the entry says, unless it says all
 */
QEX_ReturnStatus VSQEX_ClearPortMACTable(char const *switchName, char const *port,
                                         VSMACEntry const *entry);

/** Returns the link-aggregation groups of a switch. */
QEX_ReturnStatus VSQEX_GetLAGTable(char const *switchName, VSLAGTable **table);

/**
 * Takes an uplink of a switch up or down.
 *
 * - QEX_BAD_PARAM for another state
 */
QEX_ReturnStatus VSQEX_SetUplinkAdminLinkState(char const *switchName, char const *uplink,
                                               qex_LinkState state);

/** Puts the qex_LinkState of an uplink into `state`. */
QEX_ReturnStatus VSQEX_GetUplinkLinkState(char const *switchName, char const *uplink, int *state);

/** Puts the qex_LinkState that link aggregation sees of an uplink into `state`. */
QEX_ReturnStatus VSQEX_GetUplinkLACPLinkState(char const *switchName, char const *uplink,
                                              int *state);

/** Returns the uplinks of a switch. */
QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks);

/**
 * Writes the identifier of an uplink's port into `portBuffer`: at most 48 bytes of text and a NUL.
 *
 * - QEX_IS_DISCONNECTED for an uplink at no port
 */
QEX_ReturnStatus VSQEX_GetUplinkDVPortID(char const *uplink, char *portBuffer);

/**
 * Returns the multicast groups of a port, in the form of one mode.
 *
 * - QEX_NOT_FOUND for a number that no port of the switch has
 * - QEX_BAD_PARAM for a mode that is no form
 *
 * @param port number of the port
 * @param mode the form of the groups' addresses
 */
QEX_ReturnStatus VSQEX_GetMcastFilters(char const *switchName, qex_SwitchPortID port,
                                       VSMcastFilterMode mode, VSMcastFilters **filters);

/**
 * Returns one multicast group of a port and its sources.
 *
 * - QEX_NOT_FOUND if the port has not joined the group, or no port of the switch has the number
 * - QEX_BAD_PARAM for a mode that is no form
 *
 * @param port number of the port
 * @param mode the form of the group's address
 * @param group the group's address in network byte order, as many bytes as the mode's form has
 */
QEX_ReturnStatus VSQEX_GetMcastFilterStats(char const *switchName, qex_SwitchPortID port,
                                           VSMcastFilterMode mode, unsigned char const *group,
                                           VSMcastFilterStats **stats);

/** Puts the VSMcastFilterMode in force on a switch into `mode`. */
QEX_ReturnStatus VSQEX_GetMcastFilterMode(char const *switchName, int *mode);

/**
 * Fills `stats` with the counters of a running mirror session.
 *
 * - QEX_IS_DISABLED for a disabled session, and for all while the option
 *   VS_RT_OPT_ALLOW_MIRROR_STATS is 0
 */
QEX_ReturnStatus VSQEX_GetDVMirrorSessionStats(char const *switchName, char const sid[32],
                                               VSDVMirrorSessionStats *stats);

/** Returns the identifiers of the mirror sessions that are running on a switch. */
QEX_ReturnStatus VSQEX_GetDVMirrorSessionIDs(char const *switchName, VSDVMirrorSessionIDs **ids);

/** Returns the ports that see the frames of a switch in promiscuous mode. */
QEX_ReturnStatus VSQEX_GetPromiscSessionActiveDsts(char const *switchName,
                                                   VSPromiscSessionActiveDsts **ports);

/** Fills `stats` with the counters of a switch's service port. */
QEX_ReturnStatus VSQEX_GetServicePortTeamingStats(char const *switchName,
                                                  VSServicePortTeamingStats *stats);

/** Fills `stats` with the reverse-ARP announcements of a switch. */
QEX_ReturnStatus VSQEX_GetRARPStats(char const *switchName, VSRARPStats *stats);

/**
 * Returns runtime options of the host.
 *
 * - QEX_NOT_SUPPORTED for an unknown option
 *
 * @param ids the options to return, each a VSRuntimeOptionType; null with a count of 0 means all
 * @param count how many
 */
QEX_ReturnStatus VSQEX_GetRuntimeOptions(qex_uint16 const *ids, qex_uint16 count,
                                         VSRuntimeOptions **options);

/**
 * Sets runtime options of the host, all or none.
 *
 * - QEX_BAD_PARAM for a malformed list or a number out of its bounds
 * - QEX_INVALID_ADDRESS for a text that is no address
 * - QEX_NOT_SUPPORTED for an unknown option
 */
QEX_ReturnStatus VSQEX_SetRuntimeOptions(VSRuntimeOptions *options);

/** Fills `props` with the MAC learning of all switches of the host. */
QEX_ReturnStatus VSQEX_GetGlobalMACLearningProps(VSMACLearningGlobalProps *props);

/**
 * Sets the MAC learning of all switches of the host.
 *
 * - QEX_BAD_PARAM for an ageing time of 0 or past VS_MAC_LEARNING_AGING_TIME_MAX
 */
QEX_ReturnStatus VSQEX_SetGlobalMACLearningProps(VSMACLearningGlobalProps *props);

/**
 * Fills `name` with the uplink that a port's teaming has chosen for it.
 *
 * - QEX_ENETDOWN if no link of the team is usable
 * - QEX_ENETUNREACH if the team has no uplinks
 * - QEX_NOT_SUPPORTED for an uplink port
 * - QEX_NOT_FOUND for a number that no port has
 *
 * @param port number of the port
 */
QEX_ReturnStatus VSQEX_PortGetTeamUplinkHint(qex_SwitchPortID port, qex_Name *name);

/**
 * Releases memory that a VSQEX_* call allocated.
 *
 * @param memory what the library allocated, once; null does nothing
 */
void VSQEX_FreeMemory(void *memory);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_QUERIES_H
