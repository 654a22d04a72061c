#ifndef VSWITCH_STATISTICS_H
#define VSWITCH_STATISTICS_H

/**
 * @file
 * What a switch counts about its team of uplinks.
 */

#include "qexapi/types.h"

/** Reverse-ARP announcements. The caller owns the record, VSQEX_GetRARPStats fills it. */
typedef struct VSRARPStats {
  qex_uint32 rarpPktsSent;
  qex_uint32 maxRARPTime;
  qex_uint64 rarpTime;
} VSRARPStats;

/**
 * Packets of the service port.
 *
 * The caller owns the record, VSQEX_GetServicePortTeamingStats fills it.
 */
typedef struct VSServicePortTeamingStats {
  qex_uint64 txFromSrvPort;
  qex_uint64 txUsingSrvPortFRP;
  qex_uint64 txUsingPktSrcPortFRP;
  qex_uint64 txErrors;
  qex_uint64 rxToSrvPort;
  qex_uint64 rxRpfOverride;
} VSServicePortTeamingStats;

#endif  // VSWITCH_STATISTICS_H
