#ifndef NEBPUBLIC_HANDLES_H
#define NEBPUBLIC_HANDLES_H

/**
 * @file
 * Handles of the distributed-switch state, and the functions it takes.
 */

#include <stddef.h>

#include "qexapi/types.h"

/** The version of a distributed switch, such as VS_YKT_NEB_VERSION_20. */
typedef qex_uint32 NEBVersion;

/** A switch of the state. The library owns it; a reset or a cleanup ends it. */
typedef void *DVSwitchHandle;

/** A port of a switch of the state; owned likewise. */
typedef void *DVSPortHandle;

/** A list of named data items. DVSData_Free ends what DVSData_Alloc made. */
typedef void *DVSDataHandle;

/**
 * A property of the state as it was when it was looked up. The library owns it; it stays as it is
 * until the same property is looked up or walked over again.
 */
typedef void *DVSDataItem;

/**
 * Called for each switch, port or item of a walk.
 *
 * The first argument is the handle of what was reached, the second what the caller gave to the
 * walk. A result of 0 ends the walk, any other goes on.
 */
typedef char (*DVSwitchCallback)(void *, void *);
typedef char (*DVSPortCallback)(void *, void *);
typedef char (*DVSPortDataCallback)(void *, void *);

/** Allocates memory for a list and its items; null when there is none. */
typedef void *(*DVSData_MemAlloc)(size_t);

/** Frees what the list's DVSData_MemAlloc allocated. */
typedef void (*DVSData_MemFree)(void *);

#endif  // NEBPUBLIC_HANDLES_H
