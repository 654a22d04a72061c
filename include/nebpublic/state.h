#ifndef NEBPUBLIC_STATE_H
#define NEBPUBLIC_STATE_H

/**
 * @file
 * The host's copy of the distributed-switch state, read in place: DVSState_*.
 *
 * Handles that a call gives point into the state; nothing frees them, a reset ends them. Texts are
 * NUL-terminated UTF-8 and are only read. A walk over a null handle, or with a null callback, does
 * nothing. A callback may call the host and may change what is walked over.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`switchId`)
 * - QEX_BAD_PARAM for a null where nothing allows it
 *
 * @param alias alias of the switch
 * @param switchId identifier of the switch
 * @param port identifier of the port
 * @param key key of the property
 * @param item receives the item
 * @param context anything, which the callback gets as its second argument
 */

#include "nebpublic/handles.h"
#include "qexapi/status.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Replaces the configuration; a state that cannot be read changes nothing.
 *
 * - QEX_INVALID_METADATA for a state that is cut short
 * - QEX_CHECKSUM_MISMATCH for one that is damaged
 * - QEX_VERSION_MISMATCH_MAJOR for one of another format
 * - QEX_BAD_PARAM for one of another kind
 *
 * @param state what DVSQEX_PersistentStateGet gave; only read
 * @param length its bytes; passed through unchanged
 */
QEX_ReturnStatus DVSState_ConfigDeserialize(void *state, int length);

/** Empties the configuration. */
QEX_ReturnStatus DVSState_ConfigReset(void);

/** Finds a switch by its alias; null if there is none. */
DVSwitchHandle DVSState_SwitchFindByAlias(char const *alias);

/** Finds a port by its identifier in the switch with the identifier `switchId`, or null. */
DVSPortHandle DVSState_PortFind(char const *switchId, char const *port);

/** Calls `callback` with each switch and with `context`. */
void DVSState_SwitchForEach(DVSwitchCallback callback, void *context);

/** Calls `callback` with each port of a switch and with `context`. */
void DVSState_PortForEach(DVSwitchHandle handle, DVSPortCallback callback, void *context);

/** Calls `callback` with each global property of a switch, as a DVSDataItem, and with `context`. */
void DVSState_GlobalPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback, void *context);

/** Calls `callback` with each host property of a switch, as a DVSDataItem, and with `context`. */
void DVSState_HostPropForEach(DVSwitchHandle handle, DVSPortDataCallback callback, void *context);

/** Calls `callback` with each property of a port, as a DVSDataItem, and with `context`. */
void DVSState_PortDataForEach(DVSPortHandle handle, DVSPortDataCallback callback, void *context);

/**
 * Puts a global property of a switch into `item`.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSState_GlobalPropLookup(char const *switchId, char const *key,
                                           DVSDataItem *item);

/**
 * Puts a host property of a switch into `item`.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSState_HostPropLookup(char const *switchId, char const *key, DVSDataItem *item);

#ifdef __cplusplus
}
#endif

#endif  // NEBPUBLIC_STATE_H
