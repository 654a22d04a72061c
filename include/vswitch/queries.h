#ifndef VSWITCH_QUERIES_H
#define VSWITCH_QUERIES_H

/**
 * @file
 * Asking the running switches of this host, and commanding them: VSQEX_*.
 *
 * Every call returns a status. The arguments are the caller's; they are read during the call and
 * not kept. Texts are NUL-terminated UTF-8. A switch is named by its alias, a port by its
 * identifier or, as a qex_SwitchPortID, by its number; a name the host does not know is
 * QEX_NOT_FOUND, a null where nothing allows it QEX_BAD_PARAM. An output is meaningful only with
 * QEX_OK. What an output pointer refers to was allocated by the library and goes back through
 * VSQEX_FreeMemory.
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

/** Hands out the addresses of one kind that a switch's team of uplinks knows. */
QEX_ReturnStatus VSQEX_GetTeamMACTable(char const *switchName, VSMACAddrType type,
                                       VSMACTable **table);

/** Hands out the addresses of one kind that a port knows. */
QEX_ReturnStatus VSQEX_GetPortMACTable(char const *switchName, char const *port, VSMACAddrType type,
                                       VSMACTable **table);

/** Puts an address into the table of a port. */
QEX_ReturnStatus VSQEX_SetPortMACTable(char const *switchName, char const *port,
                                       VSMACEntry const *entry);

/** Takes an address out of the table of a port. */
QEX_ReturnStatus VSQEX_ClearPortMACTable(char const *switchName, char const *port,
                                         VSMACEntry const *entry);

/** Hands out the link-aggregation groups of a switch. */
QEX_ReturnStatus VSQEX_GetLAGTable(char const *switchName, VSLAGTable **table);

/** Takes an uplink of a switch up or down. */
QEX_ReturnStatus VSQEX_SetUplinkAdminLinkState(char const *switchName, char const *uplink,
                                               qex_LinkState state);

/** Puts the qex_LinkState of an uplink into `state`. */
QEX_ReturnStatus VSQEX_GetUplinkLinkState(char const *switchName, char const *uplink, int *state);

/** Puts the qex_LinkState that link aggregation sees of an uplink into `state`. */
QEX_ReturnStatus VSQEX_GetUplinkLACPLinkState(char const *switchName, char const *uplink,
                                              int *state);

/** Hands out the uplinks of a switch. */
QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks);

/** Writes the identifier of an uplink's port into `portBuffer`: at most 48 bytes of text and a NUL.
 */
QEX_ReturnStatus VSQEX_GetUplinkDVPortID(char const *uplink, char *portBuffer);

/** Hands out the multicast groups of a port, in the form of one mode. */
QEX_ReturnStatus VSQEX_GetMcastFilters(char const *switchName, qex_SwitchPortID port,
                                       VSMcastFilterMode mode, VSMcastFilters **filters);

/**
 * Hands out one multicast group of a port and its sources.
 *
 * @param mode the form of the group's address
 * @param group the group's address in network byte order, as many bytes as the mode's form has
 */
QEX_ReturnStatus VSQEX_GetMcastFilterStats(char const *switchName, qex_SwitchPortID port,
                                           VSMcastFilterMode mode, unsigned char const *group,
                                           VSMcastFilterStats **stats);

/** Puts the VSMcastFilterMode that a switch runs into `mode`. */
QEX_ReturnStatus VSQEX_GetMcastFilterMode(char const *switchName, int *mode);

/** Fills `stats` with the counters of the running mirror session `sid`. */
QEX_ReturnStatus VSQEX_GetDVMirrorSessionStats(char const *switchName, char const sid[32],
                                               VSDVMirrorSessionStats *stats);

/** Hands out the identifiers of the mirror sessions that run on a switch. */
QEX_ReturnStatus VSQEX_GetDVMirrorSessionIDs(char const *switchName, VSDVMirrorSessionIDs **ids);

/** Hands out the ports that see the frames of a switch in promiscuous mode. */
QEX_ReturnStatus VSQEX_GetPromiscSessionActiveDsts(char const *switchName,
                                                   VSPromiscSessionActiveDsts **ports);

/** Fills `stats` with the counters of a switch's service port. */
QEX_ReturnStatus VSQEX_GetServicePortTeamingStats(char const *switchName,
                                                  VSServicePortTeamingStats *stats);

/** Fills `stats` with the reverse-ARP announcements of a switch. */
QEX_ReturnStatus VSQEX_GetRARPStats(char const *switchName, VSRARPStats *stats);

/**
 * Hands out runtime options of the host.
 *
 * @param ids the options to hand out, each a VSRuntimeOptionType; null with a count of 0 means all
 * @param count how many
 */
QEX_ReturnStatus VSQEX_GetRuntimeOptions(qex_uint16 const *ids, qex_uint16 count,
                                         VSRuntimeOptions **options);

/** Sets runtime options of the host. */
QEX_ReturnStatus VSQEX_SetRuntimeOptions(VSRuntimeOptions *options);

/** Fills `props` with the MAC learning of all switches of the host. */
QEX_ReturnStatus VSQEX_GetGlobalMACLearningProps(VSMACLearningGlobalProps *props);

/** Sets the MAC learning of all switches of the host. */
QEX_ReturnStatus VSQEX_SetGlobalMACLearningProps(VSMACLearningGlobalProps *props);

/** Fills `name` with the uplink that a port's teaming has chosen for it. */
QEX_ReturnStatus VSQEX_PortGetTeamUplinkHint(qex_SwitchPortID port, qex_Name *name);

/**
 * Gives back memory that a VSQEX_* call handed out.
 *
 * @param memory what the library allocated, once; null does nothing
 */
void VSQEX_FreeMemory(void *memory);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_QUERIES_H
