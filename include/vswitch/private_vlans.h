#ifndef VSWITCH_PRIVATE_VLANS_H
#define VSWITCH_PRIVATE_VLANS_H

/**
 * @file
 * Private VLANs of a switch.
 */

#include "qexapi/types.h"

/** What the ports of a secondary VLAN may reach. */
enum {
  VSPORT_PVLAN_TYPE_PROMISC = 1,
  VSPORT_PVLAN_TYPE_ISOLATED = 2,
  VSPORT_PVLAN_TYPE_COMMUNITY = 3,
};

#pragma pack(push, 1)

/**
 * One entry of a switch's private-VLAN map.
 *
 * VSDVS_GetPrivateVLANMap allocates an array of them, VSDVS_FreeMemory takes it back. What
 * VSDVS_SetPrivateVLANMap takes is the caller's.
 */
typedef struct VSPvlanMapEntry {
  qex_uint16 primaryVID;
  qex_uint16 secondaryVID;
  qex_uint8 pvlanType; /**< VSPORT_PVLAN_TYPE_* */
  char pad[3];
} VSPvlanMapEntry;

#pragma pack(pop)

#endif  // VSWITCH_PRIVATE_VLANS_H
