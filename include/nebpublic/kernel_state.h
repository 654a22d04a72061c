#ifndef NEBPUBLIC_KERNEL_STATE_H
#define NEBPUBLIC_KERNEL_STATE_H

/**
 * @file
 * The kernel's switches, ports and their properties: DVSQEX_*.
 *
 * Every call returns a status. The arguments are the caller's; they are read during the call and
 * not kept. Texts are NUL-terminated UTF-8. The module passes every argument through unchanged. An
 * output is meaningful only with QEX_OK. What an output pointer refers to was allocated by the
 * library and is released with DVSQEX_DataFree.
 *
 * - QEX_NOT_FOUND for a name the host does not know (`switchId`, `port`, `externalId`)
 * - QEX_BAD_PARAM for a null where nothing allows it
 *
 * @param switchId identifier of the switch
 * @param port identifier of the port
 * @param externalId the other system's name for the port
 * @param key key of the property
 * @param data the bytes of the property
 * @param state the bytes of the state
 * @param length bytes
 * @param list receives a list in the library's own memory, which is released with DVSData_Free
 * @param propertyType one of CONFIG_PROP_TYPE, RUNTIME_PROP_TYPE, VOLATILE_PROP_TYPE and
 *                     POLICY_PROP_TYPE
 * @param propertyTypes a mask of CONFIG_PROP_TYPE, RUNTIME_PROP_TYPE, VOLATILE_PROP_TYPE and
 *                      POLICY_PROP_TYPE
 */

#include "nebpublic/handles.h"
#include "nebpublic/ports.h"
#include "qexapi/status.h"
#include "qexapi/types.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Gives the kernel a state that DVSQEX_StateGet or DVSQEX_PersistentStateGet read; null with a
 * length of 0 is an empty one.
 *
 * A state that cannot be read changes nothing.
 *
 * - QEX_INVALID_METADATA for a state that is cut short
 * - QEX_CHECKSUM_MISMATCH for one that is damaged
 * - QEX_VERSION_MISMATCH_MAJOR for one of another format
 * - QEX_BAD_PARAM for one of another kind
 */
QEX_ReturnStatus DVSQEX_StateInit(void *state, int length);

/** Returns the whole state. */
QEX_ReturnStatus DVSQEX_StateGet(void **state, int *length);

/** Returns the part of the state that survives a restart of the host. */
QEX_ReturnStatus DVSQEX_PersistentStateGet(void **state, int *length);

/**
 * Drops ports of type DVSPORT_TYPE_ZOMBIE, and switches that neither run on this host nor survive a
 * restart of it.
 */
QEX_ReturnStatus DVSQEX_StateSanitize(void);

/** Empties the state. */
QEX_ReturnStatus DVSQEX_StateCleanup(void);

/**
 * Releases memory that a DVSQEX_* call allocated.
 *
 * @param data what the library allocated, once; null does nothing
 */
void DVSQEX_DataFree(void *data);

/**
 * Adds a switch, which survives a restart and does not run on this host before
 * DVSQEX_SwitchAssociate.
 *
 * - QEX_EXISTS if one of the two names is taken
 *
 * @param switchId identifier of the new switch
 * @param alias its name
 * @param maxPorts room for ports
 */
QEX_ReturnStatus DVSQEX_SwitchAdd(char const *switchId, char const *alias, qex_uint32 maxPorts,
                                  NEBVersion version);

/** Removes a switch with its ports and properties. */
QEX_ReturnStatus DVSQEX_SwitchRemove(char const *switchId);

/** Starts running a switch on this host. */
QEX_ReturnStatus DVSQEX_SwitchAssociate(char const *switchId);

/** Stops running a switch on this host; its state stays. */
QEX_ReturnStatus DVSQEX_SwitchDissociate(char const *switchId);

/** Sets the version of a switch. */
QEX_ReturnStatus DVSQEX_SwitchSetVersion(char const *switchId, NEBVersion version);

/**
 * Sets how many ports a switch has room for.
 *
 * - QEX_LIMIT_EXCEEDED if it has more
 *
 * @param maxPorts room for ports
 */
QEX_ReturnStatus DVSQEX_SwitchSetMaxPorts(char const *switchId, qex_uint32 maxPorts);

/** Returns the ports of one type, uplink ports among them. */
QEX_ReturnStatus DVSQEX_SwitchPortList(char const *switchId, DVPortList **ports, DVSPortType type);

/**
 * Has a switch carry out a command of its own kind. The switch is looked for first, then the
 * command.
 *
 * - QEX_NOT_SUPPORTED for a command that it does not have
 *
 * @param command name of the command
 * @param input what the command takes, `inputLength` bytes; null with a length of 0
 * @param inputLength bytes of `input`
 * @param output receives what the command gives
 * @param outputLength receives its length
 */
QEX_ReturnStatus DVSQEX_CmdExec(char const *switchId, char const *command, void *input,
                                int inputLength, void **output, int *outputLength);

/**
 * Returns the value of a global property of a switch.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_GlobalPropGet(char const *switchId, char const *key, void **data,
                                      int *length);

/**
 * Sets a global property of a switch; the type may change from one set to the next.
 *
 * Here and in the sets below, the bytes are what the typed call of that property carries.
 *
 * - QEX_BAD_PARAM for other bytes and for a key of something else
 * - QEX_NAME_TOO_LONG for a key of more than 255 bytes
 */
QEX_ReturnStatus DVSQEX_GlobalPropSet(char const *switchId, char const *key, void *data, int length,
                                      qex_uint32 propertyType);

/**
 * Clears a global property of a switch.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_GlobalPropClear(char const *switchId, char const *key);

/**
 * Returns the value of a host property of a switch.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_HostPropGet(char const *switchId, char const *key, void **data,
                                    int *length);

/**
 * Sets a host property of a switch; the type may change from one set to the next.
 *
 * - QEX_BAD_PARAM for bytes that are not the property's and for a key of something else
 * - QEX_READ_ONLY for a property that is only read
 * - QEX_NAME_TOO_LONG for a key of more than 255 bytes
 */
QEX_ReturnStatus DVSQEX_HostPropSet(char const *switchId, char const *key, void *data, int length,
                                    qex_uint32 propertyType);

/**
 * Clears a host property of a switch.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_HostPropClear(char const *switchId, char const *key);

/**
 * Adds a port to a switch.
 *
 * - QEX_EXISTS if `port` is taken
 * - QEX_NAME_TOO_LONG if `port` is longer than it may be
 * - QEX_LIMIT_EXCEEDED if the switch has no room for another
 *
 * @param port identifier of the new port, 1 to 47 bytes
 * @param state a state that DVSQEX_PortStateGet or DVSQEX_PersistentPortStateGet gave, for the
 *              port to start with; null with a length of 0 for none
 * @param stateLength bytes of `state`
 */
QEX_ReturnStatus DVSQEX_PortAdd(char const *switchId, char const *port, void *state,
                                int stateLength);

/** Removes a port with its properties. */
QEX_ReturnStatus DVSQEX_PortRemove(char const *switchId, char const *port);

/**
 * Whether the switch has the port.
 *
 * - QEX_OK if it has
 * - QEX_NOT_FOUND if it has not
 */
QEX_ReturnStatus DVSQEX_PortFind(char const *switchId, char const *port);

/**
 * Returns a port that another system manages.
 *
 * @param port receives the port
 */
QEX_ReturnStatus DVSQEX_PortGetByExternalId(char const *switchId, char const *externalId,
                                            OpaqueDVPortData **port);

/**
 * Returns the value of a property of a port.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_PortDataGet(char const *switchId, char const *port, char const *key,
                                    void **data, int *length);

/**
 * Sets a property of a port; the type may change from one set to the next.
 *
 * - QEX_BAD_PARAM for bytes that are not the property's and for a key of something else
 * - QEX_READ_ONLY for a property that is only read
 * - QEX_NAME_TOO_LONG for a key of more than 255 bytes
 */
QEX_ReturnStatus DVSQEX_PortDataSet(char const *switchId, char const *port, char const *key,
                                    void *data, int length, qex_uint32 propertyType);

/**
 * Clears a property of a port.
 *
 * - QEX_NOT_FOUND if it is not set
 */
QEX_ReturnStatus DVSQEX_PortDataClear(char const *switchId, char const *port, char const *key);

/** Returns all properties of a port. */
QEX_ReturnStatus DVSQEX_PortStateGet(char const *switchId, char const *port, void **state,
                                     int *length);

/** Returns the properties of a port that survive a restart, written for one version. */
QEX_ReturnStatus DVSQEX_PersistentPortStateGet(char const *switchId, char const *port,
                                               NEBVersion version, void **state, int *length);

/**
 * Returns the value of a property of an uplink port.
 *
 * - QEX_NOT_FOUND if it is not set, or no uplink port of the switch has the number
 *
 * @param portID number of the uplink port
 */
QEX_ReturnStatus DVSQEX_UplinkDataGet(char const *switchId, char const *key, qex_uint32 portID,
                                      void **data, int *length);

/**
 * Sets a property of an uplink port.
 *
 * - QEX_NOT_FOUND if no uplink port of the switch has the number
 * - QEX_BAD_PARAM for bytes that are not the property's and for a key of something else
 * - QEX_READ_ONLY for a property that is only read
 * - QEX_NAME_TOO_LONG for a key of more than 255 bytes
 *
 * @param portID number of the uplink port
 */
QEX_ReturnStatus DVSQEX_UplinkDataSet(char const *switchId, char const *key, qex_uint32 portID,
                                      void *data, int length, qex_uint32 propertyType);

/** Puts the global properties that this kind of switch adds into `list`. */
QEX_ReturnStatus DVSQEX_VendorGlobalPropList(char const *switchId, DVSDataHandle *list,
                                             qex_uint32 propertyTypes);

/** Puts the host properties that this kind of switch adds into `list`. */
QEX_ReturnStatus DVSQEX_VendorHostPropList(char const *switchId, DVSDataHandle *list,
                                           qex_uint32 propertyTypes);

/** Puts the properties that this kind of switch adds to a port into `list`. */
QEX_ReturnStatus DVSQEX_VendorPortPropList(char const *switchId, char const *port,
                                           DVSDataHandle *list, qex_uint32 propertyTypes);

/** Puts the properties of a switch that no kind of switch knows into `list`. */
QEX_ReturnStatus DVSQEX_ExtraConfigPropList(char const *switchId, DVSDataHandle *list,
                                            qex_uint32 propertyTypes);

/** Puts the properties of a port that no kind of switch knows into `list`. */
QEX_ReturnStatus DVSQEX_ExtraConfigPortPropList(char const *switchId, char const *port,
                                                DVSDataHandle *list, qex_uint32 propertyTypes);

#ifdef __cplusplus
}
#endif

#endif  // NEBPUBLIC_KERNEL_STATE_H
