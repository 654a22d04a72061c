#ifndef VSWITCH_UPLINKS_H
#define VSWITCH_UPLINKS_H

/**
 * @file
 * Uplinks of a switch and the ports they are attached to.
 */

#include "qexapi/names.h"
#include "qexapi/switch_ports.h"
#include "qexapi/types.h"

#pragma pack(push, 1)

/** An uplink of a VSUplinks. */
typedef struct VSUplinks_entries {
  qex_Name name;
  qex_SwitchPortID portID;
} VSUplinks_entries;

/** The uplinks of a switch. The library allocates it, VSQEX_FreeMemory takes it back. */
typedef struct VSUplinks {
  qex_uint32 totalEntries; /**< entries the library had */
  qex_uint32 numEntries;   /**< entries that are here */
  VSUplinks_entries entries[];
} VSUplinks;

/**
 * The names of a switch's uplink ports.
 *
 * VSDVS_GetSwitchUplinkPorts allocates it, VSDVS_FreeMemory takes it back.
 */
typedef struct VSUplinkPorts {
  qex_uint32 nUplinkPorts;
  char uplinkPortName[0][QEX_NEB_NAME_MAX_LEN];
} VSUplinkPorts;

/** The identifiers of the same ports, in the same order; owned likewise. */
typedef struct VSUplinkPortIds {
  qex_uint32 nUplinkPorts;
  char uplinkPortId[0][QEX_NEB_PORT_ID_MAX_LEN];
} VSUplinkPortIds;

#pragma pack(pop)

#endif  // VSWITCH_UPLINKS_H
