#ifndef QEXAPI_TUNNELS_H
#define QEXAPI_TUNNELS_H

/**
 * @file
 * Headers of tunnels: fences, VXLAN, GRE and Geneve.
 *
 * The records lie over the bytes of a frame: packed, and every field as it stands in the frame. The
 * 24-bit fields read low byte first, as the host does.
 */

#include "qexapi/types.h"

#pragma pack(push, 1)

/** The header of a frame that crosses a fence between hosts. */
typedef struct qex_FenceHdr {
  qex_uint8 version : 2;
  qex_uint8 frag : 1;
  qex_uint8 fragmentID : 5;
  qex_uint32 fenceID : 24;
} qex_FenceHdr;

/** A VXLAN header. */
typedef struct qex_VXLANHdr {
  qex_uint8 flags1 : 2;
  qex_uint8 locallyReplicate : 1;
  qex_uint8 instanceID : 1;
  qex_uint8 flags2 : 4;
  qex_uint32 reserved1 : 24;
  qex_uint32 vxlanID : 24;
  qex_uint8 reserved2;
} qex_VXLANHdr;

/** A GRE header and its optional words. */
typedef struct qex_GREHdr {
  union {
    struct {
      qex_uint8 reserved1 : 3;
      qex_uint8 strictSourceRoute : 1;
      qex_uint8 sequencePresent : 1;
      qex_uint8 keyPresent : 1;
      qex_uint8 routingPresent : 1;
      qex_uint8 checksumPresent : 1;
      qex_uint8 version : 3;
      qex_uint8 reserved2 : 4;
      qex_uint8 ackPresent : 1;
    };
    qex_uint16 flags;
  };
  qex_uint16 protocol; /**< QEX_ETH_TYPE_*_NBO */
  qex_uint32 options[0];
} qex_GREHdr;

/** A Geneve header and its options. */
typedef struct qex_GeneveHdr {
  qex_uint8 optionsLength : 6; /**< units of 4 bytes */
  qex_uint8 version : 2;
  qex_uint8 reserved1 : 6;
  qex_uint8 criticalOptions : 1;
  qex_uint8 oamFrame : 1;
  qex_uint16 protocolType; /**< QEX_ETH_TYPE_*_NBO */
  qex_uint32 virtualNetworkId : 24;
  qex_uint32 reserved2 : 8;
  qex_uint32 options[0];
} qex_GeneveHdr;

/** The start of a Geneve option. */
typedef struct qex_GeneveOptionHdr {
  qex_uint16 optClass;
  qex_uint8 optType;
  qex_uint8 optLength : 5; /**< units of 4 bytes, this header not counted */
  qex_uint8 reserved : 3;
} qex_GeneveOptionHdr;

#pragma pack(pop)

#endif  // QEXAPI_TUNNELS_H
