#ifndef QEXAPI_RESOURCE_POOLS_H
#define QEXAPI_RESOURCE_POOLS_H

/**
 * @file
 * Network resource pools of a set of ports.
 */

#include "qexapi/types.h"

/** Values that stand for no limit and for the host's defaults. */
#define QEX_PORTSET_RESPOOL_LIMIT_INFINITE (-1) /**< no limit */
#define QEX_PORTSET_RESPOOL_DEFAULT_QUEUE_DEPTH (-1)
#define QEX_PORTSET_RESPOOL_DEFAULT_PRIORITY_TAG 0
#define QEX_PORTSET_RESPOOL_MAX_SHARES 100

/** Identifiers of the pools that every host has. */
#define QEX_PORTSET_TRAVON_RESPOOL_ID "netsched.pools.persist.travon"
#define QEX_PORTSET_ISCSI_RESPOOL_ID "netsched.pools.persist.iscsi"
#define QEX_PORTSET_NFS_RESPOOL_ID "netsched.pools.persist.nfs"
#define QEX_PORTSET_FT_RESPOOL_ID "netsched.pools.persist.ft"
#define QEX_PORTSET_VM_RESPOOL_ID "netsched.pools.persist.vm"
#define QEX_PORTSET_MGMT_RESPOOL_ID "netsched.pools.persist.mgmt"
#define QEX_PORTSET_FCOE_RESPOOL_ID "netsched.pools.persist.fcoe"
#define QEX_PORTSET_WLX_RESPOOL_ID "netsched.pools.persist.wlx"
#define QEX_PORTSET_KRIV_RESPOOL_ID "netsched.pools.persist.kriv"
#define QEX_PORTSET_JCO_RESPOOL_ID "netsched.pools.persist.jco"

/** Configuration of a pool; the caller owns the record. */
typedef struct qex_PortsetResPoolCfg {
  qex_PortsetResPoolShares shares;           /**< at most QEX_PORTSET_RESPOOL_MAX_SHARES */
  qex_PortsetResPoolLimit limit;             /**< Mbit/s, or QEX_PORTSET_RESPOOL_LIMIT_INFINITE */
  qex_PortsetResPoolReservation reservation; /**< Mbit/s */
  qex_PortsetResPoolPriorityTag pTag;
  qex_PortsetResPoolQueueDepth queueDepth; /**< packets */
} qex_PortsetResPoolCfg;

/** Counters of a pool; the caller owns the record. */
typedef struct qex_PortsetResPoolStats {
  qex_uint64 pktsIn;
  qex_uint64 bytesIn;
  qex_uint64 pktsOut;
  qex_uint64 bytesOut;
  qex_uint64 pktsDropped;
  qex_uint64 bytesDropped;
} qex_PortsetResPoolStats;

#endif  // QEXAPI_RESOURCE_POOLS_H
