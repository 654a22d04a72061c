#ifndef QEXAPI_IP_H
#define QEXAPI_IP_H

/**
 * @file
 * Headers of IPv4, IPv6 and ICMP.
 *
 * The records lie over the bytes of a frame: packed, and every field as it stands in the frame.
 */

#include "qexapi/protocols.h"
#include "qexapi/types.h"

#pragma pack(push, 1)

/** An IPv4 header without options. */
typedef struct qex_IPv4Hdr {
  qex_uint8 headerLength : 4; /**< units of 4 bytes */
  qex_uint8 version : 4;
  union {
    struct {
      qex_uint8 tos : 5;
      qex_uint8 precedence : 3;
    };
    struct {
      qex_uint8 ecn : 2;
      qex_uint8 dscp : 6;
    };
    qex_uint8 qosFlags;
  };
  qex_uint16 totalLength;
  qex_uint16 identification;
  union {
    struct {
      qex_uint8 fragmentOffsetHigh : 5;
      qex_uint8 moreFragments : 1;
      qex_uint8 dontFragment : 1;
      qex_uint8 zero : 1;
      qex_uint8 fragmentOffsetLow;
    };
    qex_uint16 fragmentInfo;
  };
  qex_uint8 ttl;
  qex_uint8 protocol; /**< QEX_IP_PROTO_* */
  qex_uint16 checksum;
  qex_IPv4Address saddr;
  qex_IPv4Address daddr;
} qex_IPv4Hdr;

/** An IPv6 header. */
typedef struct qex_IPv6Hdr {
  qex_uint8 trafficClassHigh : 4;
  qex_uint8 version : 4;
  qex_uint8 flowLabelHigh : 4;
  qex_uint8 trafficClassLow : 4;
  qex_uint16 flowLabelLow;
  qex_uint16 payloadLength;
  qex_uint8 nextHeader; /**< QEX_IP_PROTO_* */
  qex_uint8 hopLimit;
  qex_IPv6Address saddr;
  qex_IPv6Address daddr;
} qex_IPv6Hdr;

/** The start of an IPv6 extension header. */
typedef struct qex_IPv6ExtHdr {
  qex_uint8 nextHeader;   /**< QEX_IP_PROTO_* */
  qex_uint8 hdrExtLength; /**< units of 8 bytes beyond the first 8 */
  qex_uint16 optPad1;
  qex_uint32 optPad2;
} qex_IPv6ExtHdr;

/** The start of an ICMP message. */
typedef struct qex_ICMPHdr {
  qex_uint8 type;
  qex_uint8 code;
  qex_uint16 checksum;
} qex_ICMPHdr;

#pragma pack(pop)

#endif  // QEXAPI_IP_H
