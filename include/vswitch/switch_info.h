#ifndef VSWITCH_SWITCH_INFO_H
#define VSWITCH_SWITCH_INFO_H

/**
 * @file
 * What a running switch tells about itself.
 */

#include "qexapi/types.h"

/** A switch as the kernel runs it. The caller owns the record, VSQEX_GetVSInfo fills it. */
typedef struct VSInfo {
  qex_uint32 mtu;
  qex_VlanID maxValidVlan;
  qex_VlanID minValidVlan;
  qex_uint32 activePorts;
  qex_uint32 maxPorts;
  qex_uint8 dvsName[128]; /**< name of the switch, NUL-terminated */
  qex_uint8 nebID[64];    /**< identifier of the distributed switch, NUL-terminated */
} VSInfo;

/** Traffic counters of a switch or of one of its ports, seen from the clients of its ports. */
typedef struct VSStats {
  qex_uint64 pktsTx;
  qex_uint64 pktsTxMulticast;
  qex_uint64 pktsTxBroadcast;
  qex_uint64 pktsRx;
  qex_uint64 pktsRxMulticast;
  qex_uint64 pktsRxBroadcast;
  qex_uint64 bytesTx;
  qex_uint64 bytesTxMulticast;
  qex_uint64 bytesTxBroadcast;
  qex_uint64 bytesRx;
  qex_uint64 bytesRxMulticast;
  qex_uint64 bytesRxBroadcast;
  qex_uint64 droppedTx; /**< packets */
  qex_uint64 droppedRx; /**< packets */
} VSStats;

#endif  // VSWITCH_SWITCH_INFO_H
