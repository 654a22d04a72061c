#ifndef QEXAPI_SWITCH_PORTS_H
#define QEXAPI_SWITCH_PORTS_H

/**
 * @file
 * Ports of distributed switches: names, status, statistics and VLANs.
 */

#include "qexapi/types.h"

/** States of a set of ports. */
enum {
  QEX_NEBPORTSET_STATE_DEACTIVE = 1,
  QEX_NEBPORTSET_STATE_HOTSWAP = 2,
};

/** Bytes of identifiers and names, their terminating NULs included. */
#define QEX_NEB_ID_MAX_LEN 64          /**< identifier of a switch */
#define QEX_NEB_NAME_MAX_LEN 81        /**< display name */
#define QEX_NEB_CLASS_NAME_MAX_LEN 128 /**< class of a set of ports */
#define QEX_NEB_PORT_ID_MAX_LEN 48     /**< identifier of a port */
#define QEX_NEB_PORT_ID_LEGACY_MAX_LEN 16
#define QEX_NEB_PORT_ALIAS_MAX_LEN 81 /**< alias of a port */

/** The display name of a port. */
typedef char qex_NEBPortName[QEX_NEB_NAME_MAX_LEN];

/** The identifier of a port. */
typedef char qex_DVPortId[QEX_NEB_PORT_ID_MAX_LEN];

/** Bits of qex_NEBPortStatus.flags. */
enum {
  QEX_NEBPORT_STATUS_INUSE = 1,
  QEX_NEBPORT_STATUS_LINKUP = 2,
  QEX_NEBPORT_STATUS_BLOCKED = 4,
  QEX_NEBPORT_STATUS_PASSTHRU = 8, /**< the port is reached past the kernel */
};

/** The health of a switch on a host. */
enum {
  QEX_NEB_STATUS_OK = 0,
  QEX_NEB_STATUS_DEGRADED = 1,
  QEX_NEB_STATUS_DOWN = 2,
};

#pragma pack(push, 1)

/** Status of a port, the value of QEX_NEBPROP_PORT_STATUS. */
typedef struct qex_NEBPortStatus {
  qex_uint64 flags;            /**< QEX_NEBPORT_STATUS_* */
  qex_uint64 noPassthruReason; /**< why the port is not reached past the kernel; 0 when it is */
  qex_uint32 portID;
  char displayStr[80]; /**< at most 79 characters and a NUL */
} qex_NEBPortStatus;

#pragma pack(pop)

/** Counters of a port, the value of QEX_NEBPROP_PORT_STATISTICS. */
typedef struct qex_NEBPortStatistics {
  qex_uint64 pktsInUnicast;
  qex_uint64 bytesInUnicast;
  qex_uint64 pktsInMulticast;
  qex_uint64 bytesInMulticast;
  qex_uint64 pktsInBroadcast;
  qex_uint64 bytesInBroadcast;
  qex_uint64 pktsOutUnicast;
  qex_uint64 bytesOutUnicast;
  qex_uint64 pktsOutMulticast;
  qex_uint64 bytesOutMulticast;
  qex_uint64 pktsOutBroadcast;
  qex_uint64 bytesOutBroadcast;
  qex_uint64 pktsInDropped;
  qex_uint64 pktsOutDropped;
  qex_uint64 pktsInException;
  qex_uint64 pktsOutException;
} qex_NEBPortStatistics;

/** A range of VLAN identifiers, both ends included. */
typedef struct qex_NEBPortVIDRange {
  qex_uint16 minVID;
  qex_uint16 maxVID;
} qex_NEBPortVIDRange;

/** VLANs of a port, the value of QEX_NEBPROP_PORT_VLAN: the fixed part and its ranges. */
typedef struct qex_NEBPortVlanInfo {
  qex_uint16 vlanID;
  qex_uint16 numRanges;
  qex_NEBPortVIDRange vidRanges[0]; /**< numRanges of them */
} qex_NEBPortVlanInfo;

#endif  // QEXAPI_SWITCH_PORTS_H
