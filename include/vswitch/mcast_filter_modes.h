#ifndef VSWITCH_MCAST_FILTER_MODES_H
#define VSWITCH_MCAST_FILTER_MODES_H

/**
 * @file
 * Modes of multicast filtering.
 */

/** How a switch filters multicast; a query of filters asks for those of one protocol. */
typedef enum VSMcastFilterMode {
  VS_MCAST_FILTER_MODE_LEGACY = 0,
  VS_MCAST_FILTER_MODE_SNOOPING = 1,
  VS_MCAST_FILTER_MODE_IGMP = 2,
  VS_MCAST_FILTER_MODE_MLD = 3,
} VSMcastFilterMode;

#endif  // VSWITCH_MCAST_FILTER_MODES_H
