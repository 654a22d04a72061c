#ifndef QEXAPI_MULTICAST_H
#define QEXAPI_MULTICAST_H

/**
 * @file
 * Messages of IGMP, MLD and PIM.
 *
 * The records lie over the bytes of a frame: packed, and every field as it stands in the frame. An
 * array that ends a record holds as many elements as its count field says.
 */

#include "qexapi/protocols.h"
#include "qexapi/types.h"

#pragma pack(push, 1)

/** An IGMP message of version 1 or 2. */
typedef struct qex_IGMPHdr {
  qex_uint8 type;            /**< QEX_IGMP_* */
  qex_uint8 maxResponseTime; /**< tenths of a second */
  qex_uint16 checksum;
  qex_IPv4Address groupAddr;
} qex_IGMPHdr;

/** A query of IGMP version 3. */
typedef struct qex_IGMPv3QueryHdr {
  qex_uint8 type;
  qex_uint8 maxResponseCode;
  qex_uint16 checksum;
  qex_IPv4Address groupAddr;
  qex_uint8 qrv : 3;
  qex_uint8 sFlag : 1;
  qex_uint8 reserved : 4;
  qex_uint8 qqic;
  qex_uint16 numSources;
  qex_IPv4Address sourcesIPv4[];
} qex_IGMPv3QueryHdr;

/** A group record of a qex_IGMPv3ReportHdr. */
typedef struct qex_IGMPv3GrpRecord {
  qex_uint8 type;
  qex_uint8 dataLength; /**< units of 4 bytes, after the sources */
  qex_uint16 numSources;
  qex_IPv4Address groupIPv4Addr;
  qex_IPv4Address sourcesIPv4[];
} qex_IGMPv3GrpRecord;

/** A report of IGMP version 3. */
typedef struct qex_IGMPv3ReportHdr {
  qex_uint8 type;
  qex_uint8 reserved1;
  qex_uint16 checksum;
  qex_uint16 reserved2;
  qex_uint16 numGroups;
  qex_IGMPv3GrpRecord record[]; /**< the first; the others follow at distances of their own */
} qex_IGMPv3ReportHdr;

/** An MLD message of version 1. */
typedef struct qex_MLDHdr {
  qex_uint8 type; /**< QEX_MLD_* */
  qex_uint8 code;
  qex_uint16 checksum;
  qex_uint16 maxResponseTime; /**< milliseconds */
  qex_uint16 reserved;
  qex_IPv6Address groupIPv6Addr;
} qex_MLDHdr;

/** A query of MLD version 2. */
typedef struct qex_MLDv2QueryHdr {
  qex_uint8 type;
  qex_uint8 code;
  qex_uint16 checksum;
  qex_uint16 maxResponseCode;
  qex_uint16 reserved1;
  qex_IPv6Address groupIPv6Addr;
  qex_uint8 qrv : 3;
  qex_uint8 sFlag : 1;
  qex_uint8 reserved2 : 4;
  qex_uint8 qqic;
  qex_uint16 numSources;
  qex_IPv6Address sourcesIPv6[];
} qex_MLDv2QueryHdr;

/** A group record of a qex_MLDv2ReportHdr. */
typedef struct qex_MLDv2GrpRecord {
  qex_uint8 type;
  qex_uint8 dataLength; /**< units of 4 bytes, after the sources */
  qex_uint16 numSources;
  qex_IPv6Address groupIPv6Addr;
  qex_IPv6Address sourcesIPv6[];
} qex_MLDv2GrpRecord;

/** A report of MLD version 2. */
typedef struct qex_MLDv2ReportHdr {
  qex_uint8 type;
  qex_uint8 reserved1;
  qex_uint16 checksum;
  qex_uint16 reserved2;
  qex_uint16 numGroups;
  qex_MLDv2GrpRecord record[]; /**< the first; the others follow at distances of their own */
} qex_MLDv2ReportHdr;

/** The start of a PIM message. */
typedef struct qex_PIMHdr {
  qex_uint8 type : 4;
  qex_uint8 version : 4;
  qex_uint8 reserved;
  qex_uint16 checksum;
} qex_PIMHdr;

#pragma pack(pop)

#endif  // QEXAPI_MULTICAST_H
