#ifndef NEBPUBLIC_PORTS_H
#define NEBPUBLIC_PORTS_H

/**
 * @file
 * Ports as the distributed-switch state lists them.
 */

#include "qexapi/types.h"

/** What a port is to this host. */
typedef enum DVSPortType {
  DVSPORT_TYPE_INVALID = 0,
  DVSPORT_TYPE_ACTIVE = 1,
  DVSPORT_TYPE_SHADOW = 2,
  DVSPORT_TYPE_ZOMBIE = 3,
  DVSPORT_TYPE_LOCALCACHE = 4,
} DVSPortType;

/** Bytes of a port set's name, its terminating NUL included. */
#define PORTSET_NAME_MAX 128

/** The identifier of a distributed switch. */
typedef char DVSwitchId[64];

/** The identifier of a port of a distributed switch. */
typedef char DVPortId[48];

/** A port that another system manages. The library allocates it, DVSQEX_DataFree takes it back. */
typedef struct OpaqueDVPortData {
  DVPortId dvPortId;
  char externalId[48]; /**< the other system's name for the port */
} OpaqueDVPortData;

/** One port of a DVPortList. */
typedef struct DVPortData {
  DVPortId dvPortId;
  qex_uint32 connectId;
} DVPortData;

/**
 * The ports of a switch. DVSQEX_SwitchPortList allocates it, DVSQEX_DataFree takes it back.
 */
typedef struct DVPortList {
  int nports;
  DVSPortType type;
  DVPortData dvPort[1]; /**< nports of them: the library allocates what is beyond the first */
} DVPortList;

#endif  // NEBPUBLIC_PORTS_H
