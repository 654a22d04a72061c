#ifndef NEBPUBLIC_DATA_H
#define NEBPUBLIC_DATA_H

/**
 * @file
 * Switches, ports and data items, by their handles: DVS_* and DVSData_*.
 *
 * Texts that a call returns belong to the library and live as long as what the handle designates.
 *
 * - QEX_BAD_PARAM for a null where nothing allows it
 */

#include "nebpublic/handles.h"
#include "qexapi/status.h"
#include "qexapi/types.h"

#ifdef __cplusplus
extern "C" {
#endif

/** The identifier of a switch; null for a null handle. */
char const *DVS_SwitchId(DVSwitchHandle handle);

/** The alias of a switch; null for a null handle or when it has none. */
char const *DVS_SwitchName(DVSwitchHandle handle);

/** The class of a switch's set of ports; null for a null handle. */
char const *DVS_ClassName(DVSwitchHandle handle);

/** How many ports a switch has room for; 0 for a null handle. */
int DVS_GetMaxPorts(DVSwitchHandle handle);

/** The version of a switch; 0 for a null handle. */
NEBVersion DVS_Version(DVSwitchHandle handle);

/** The identifier of a port; null for a null handle. */
char const *DVS_PortId(DVSPortHandle handle);

/** The alias of a port; null for a null handle or when it has none. */
char const *DVS_PortAlias(DVSPortHandle handle);

/**
 * Makes an empty list of items.
 *
 * @param list receives the list, which is released with DVSData_Free
 * @param alloc how the list allocates; null, like `release`, for the library's own way
 * @param release how it frees
 */
QEX_ReturnStatus DVSData_Alloc(DVSDataHandle *list, DVSData_MemAlloc alloc,
                               DVSData_MemFree release);

/** Frees a list with its items; null does nothing. */
void DVSData_Free(DVSDataHandle list);

/**
 * Adds an item to a list or replaces the one of that name; the data is copied.
 *
 * The module passes every argument through unchanged.
 *
 * - QEX_BAD_PARAM for another `propertyType`
 *
 * @param name name of the item
 * @param data `length` bytes; null with a length of 0
 * @param length bytes of data
 * @param propertyType one of CONFIG_PROP_TYPE, RUNTIME_PROP_TYPE, VOLATILE_PROP_TYPE and
 *                     POLICY_PROP_TYPE
 */
QEX_ReturnStatus DVSData_Update(DVSDataHandle list, char const *name, void *data, qex_uint32 length,
                                qex_uint32 propertyType);

/**
 * Writes a list as one block, which is allocated with the list's own allocator.
 *
 * @param bytes receives the block, which the caller frees the same way; what the library allocated
 *              is released with DVSQEX_DataFree
 * @param length receives its bytes
 * @param version version of the distributed switch to write for
 */
QEX_ReturnStatus DVSData_Serialize(DVSDataHandle list, void **bytes, qex_uint32 *length,
                                   NEBVersion version);

/** The name of an item; null for a null item. */
char const *DVSData_Name(DVSDataItem item);

/** Puts a view of an item's data into `data` and returns its length in bytes. */
qex_uint32 DVSData_Data(DVSDataItem item, void **data);

/** The property type of an item; 0 for a null item. */
qex_uint32 DVSData_PropType(DVSDataItem item);

#ifdef __cplusplus
}
#endif

#endif  // NEBPUBLIC_DATA_H
