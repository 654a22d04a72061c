#ifndef NEBPUBLIC_NAMES_H
#define NEBPUBLIC_NAMES_H

/**
 * @file
 * From one name of a switch to another, and whether a port exists.
 *
 * Texts are NUL-terminated UTF-8. Outputs are the caller's memory, of the size their type says, NUL
 * included, and are written only with QEX_OK.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`alias`, `portsetName`)
 * - QEX_BAD_PARAM for a null
 *
 * @param alias alias of the switch
 * @param switchId identifier of the switch
 * @param portsetName name of the set of ports
 * @param port identifier of the port
 */

#include "qexapi/status.h"

#ifdef __cplusplus
extern "C" {
#endif

/** Writes the identifier of the switch with an alias into `switchId`. */
QEX_ReturnStatus DVSAliasToSwitchId(char const *alias, char switchId[64]);

/** Writes the alias of the switch with a set of ports into `alias`. */
QEX_ReturnStatus DVSPortsetNameToAlias(char const *portsetName, char alias[128]);

/**
 * Writes the name of the set of ports of the switch with an alias.
 *
 * @param portsetBuffer room for 129 bytes; a name takes at most PORTSET_NAME_MAX of them, NUL
 * included
 */
QEX_ReturnStatus DVSAliasToPortsetName(char const *alias, char *portsetBuffer);

/** Whether the switch with the identifier `switchId` has a port: 1 or 0. */
char DVPortExist(char const *switchId, char const *port);

#ifdef __cplusplus
}
#endif

#endif  // NEBPUBLIC_NAMES_H
