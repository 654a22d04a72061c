#ifndef VSWITCH_LAGS_H
#define VSWITCH_LAGS_H

/**
 * @file
 * Link-aggregation groups.
 */

#include "qexapi/links.h"
#include "qexapi/names.h"
#include "qexapi/types.h"

/** Limits of groups. */
#define VS_LACP_LAG_NAME_LENGTH 68 /**< bytes of a name, its terminating NUL included */
#define VS_MAX_LAGS 32             /**< groups of a switch */
#define VS_MAX_UPLINKS_IN_LAG 32   /**< uplinks of a group */

#pragma pack(push, 1)

/** A group and its uplinks. The library allocates it. */
typedef struct VSLAGStatus {
  qex_LinkState state;
  qex_uint32 id;
  qex_uint8 name[VS_LACP_LAG_NAME_LENGTH]; /**< NUL-terminated */
  qex_uint64 uplinkLinkupBitmap;           /**< bit n is set when uplink n is up */
  qex_uint32 numUplinks;
  qex_Name uplinkNames[0]; /**< numUplinks of them */
} VSLAGStatus;

#pragma pack(pop)

/** How many groups a switch has. The library allocates it, VSQEX_FreeMemory takes it back. */
typedef struct VSLAGTable {
  qex_uint32 numLAGs;
} VSLAGTable;

#endif  // VSWITCH_LAGS_H
