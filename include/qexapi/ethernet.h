#ifndef QEXAPI_ETHERNET_H
#define QEXAPI_ETHERNET_H

/**
 * @file
 * Headers of Ethernet frames and ARP.
 *
 * The records lie over the bytes of a frame: packed, and every field as it stands in the frame.
 */

#include "qexapi/protocols.h"
#include "qexapi/types.h"

#pragma pack(push, 1)

/** An Ethernet header. */
typedef struct qex_EthHdr {
  qex_EthAddress daddr;
  qex_EthAddress saddr;
  qex_uint16 type; /**< QEX_ETH_TYPE_*_NBO */
} qex_EthHdr;

/** A VLAN tag and the type of what follows it. */
typedef struct qex_VLANHdr {
  qex_uint8 vlanIDHigh : 4;
  qex_uint8 dropEligible : 1;
  qex_uint8 priority : 3;
  qex_uint8 vlanIDLow;
  qex_uint16 type;
} qex_VLANHdr;

/** An ARP packet for Ethernet and IPv4. */
typedef struct qex_ArpHdr {
  qex_uint16 htype;
  qex_uint16 ptype;
  qex_uint8 hlen;
  qex_uint8 plen;
  qex_uint16 oper;
  qex_uint8 sha[QEX_ETH_ADDR_LENGTH];
  qex_uint32 spa;
  qex_uint8 tha[QEX_ETH_ADDR_LENGTH];
  qex_uint32 tpa;
} qex_ArpHdr;

#pragma pack(pop)

#endif  // QEXAPI_ETHERNET_H
