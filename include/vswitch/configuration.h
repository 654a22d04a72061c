#ifndef VSWITCH_CONFIGURATION_H
#define VSWITCH_CONFIGURATION_H

/**
 * @file
 * Configuring distributed switches: VSDVS_*.
 *
 * Every call returns a status. Texts are NUL-terminated UTF-8 and are only read. A switch is named
 * by its alias, a port by its distributed-port identifier, unless a parameter says otherwise. An
 * output is meaningful only with QEX_OK.
 */

#include "qexapi/status.h"
#include "qexapi/types.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Creates a distributed switch on this host.
 *
 * The module passes every argument through unchanged.
 *
 * @param alias name of the new switch; QEX_EXISTS if it is taken
 * @param switchId identifier of the distributed switch; null or empty lets the host choose
 * @param portsetName name of its set of ports; null or empty lets the host choose
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

/** Destroys a switch with its ports and properties; QEX_NOT_FOUND if there is none. */
QEX_ReturnStatus VSDVS_DestroyVSwitch(char const *switchName);

/** Reads the MTU of a switch, in bytes, into `mtu`, which the caller owns. */
QEX_ReturnStatus VSDVS_GetMTU(char const *switchName, qex_uint32 *mtu);

/** Sets the MTU of a switch: 1,280 to 9,190 bytes, else QEX_BAD_PARAM. */
QEX_ReturnStatus VSDVS_SetMTU(char const *switchName, qex_uint32 mtu);

/**
 * Gives back memory that a VSDVS_* call handed out.
 *
 * @param memory what the library allocated, once; null does nothing
 */
void VSDVS_FreeMemory(void *memory);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_CONFIGURATION_H
