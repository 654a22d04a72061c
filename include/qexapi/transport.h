#ifndef QEXAPI_TRANSPORT_H
#define QEXAPI_TRANSPORT_H

/**
 * @file
 * Headers of UDP and TCP.
 *
 * The records lie over the bytes of a frame: packed, and every field as it stands in the frame.
 */

#include "qexapi/types.h"

#pragma pack(push, 1)

/** A UDP header. */
typedef struct qex_UDPHdr {
  qex_uint16 srcPort;
  qex_uint16 dstPort;
  qex_uint16 length;
  qex_uint16 checksum;
} qex_UDPHdr;

/** A TCP header without options. */
typedef struct qex_TCPHdr {
  qex_uint16 srcPort;
  qex_uint16 dstPort;
  qex_uint32 seq;
  qex_uint32 ackSeq;
  qex_uint8 reserved : 4;
  qex_uint8 dataOffset : 4; /**< units of 4 bytes */
  union {
    struct {
      qex_uint8 fin : 1;
      qex_uint8 syn : 1;
      qex_uint8 rst : 1;
      qex_uint8 psh : 1;
      qex_uint8 ack : 1;
      qex_uint8 urg : 1;
      qex_uint8 ece : 1;
      qex_uint8 cwr : 1;
    };
    qex_uint8 flags;
  };
  qex_uint16 window;
  qex_uint16 checksum;
  qex_uint16 urgPtr;
} qex_TCPHdr;

#pragma pack(pop)

#endif  // QEXAPI_TRANSPORT_H
