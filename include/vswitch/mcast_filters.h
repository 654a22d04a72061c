#ifndef VSWITCH_MCAST_FILTERS_H
#define VSWITCH_MCAST_FILTERS_H

/**
 * @file
 * Multicast filters of ports: the groups that were joined.
 */

#include "qexapi/protocols.h"
#include "qexapi/types.h"

/** Whether a group takes or refuses the sources that are listed with it. */
typedef enum VSMcastSrcIPFilterMode {
  VS_MCAST_SRC_IP_FILTER_MODE_NONE = 0,
  VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE = 1, /**< it takes them */
  VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE = 2, /**< it refuses them */
} VSMcastSrcIPFilterMode;

#pragma pack(push, 1)

/**
 * The groups of a port: one view of the entries holds, the one for the mode that was asked for.
 *
 * The library allocates it, VSQEX_FreeMemory takes it back.
 */
typedef struct VSMcastFilters {
  qex_uint32 totalEntries; /**< entries the library had */
  qex_uint32 numEntries;   /**< entries that are here */
  union {
    qex_EthAddress macEntries[0];
    qex_IPv4Address ipv4Entries[0];
    qex_IPv6Address ipv6Entries[0];
  };
} VSMcastFilters;

/**
 * One group of a port and its sources; the entries are of the group's own address family.
 *
 * The library allocates it, VSQEX_FreeMemory takes it back.
 */
typedef struct VSMcastFilterStats {
  qex_uint32 version;         /**< of the protocol that joined */
  qex_uint32 srcIPFilterMode; /**< a VSMcastSrcIPFilterMode */
  qex_uint64 updateTime;
  qex_uint32 vni;
  qex_uint32 totalEntries; /**< sources the library had */
  qex_uint32 numEntries;   /**< sources that are here */
  union {
    qex_IPv4Address ipv4Entries[0];
    qex_IPv6Address ipv6Entries[0];
  };
} VSMcastFilterStats;

#pragma pack(pop)

#endif  // VSWITCH_MCAST_FILTERS_H
