#ifndef VSWITCH_PORT_INFO_H
#define VSWITCH_PORT_INFO_H

/**
 * @file
 * What a running switch tells about its ports and VLANs.
 */

#include "qexapi/ports.h"
#include "qexapi/protocols.h"
#include "qexapi/types.h"
#include "vswitch/device.h"
#include "vswitch/switch_info.h"

/** What is connected to a port. */
typedef enum VS_PortClientType {
  VS_PORT_CLIENT_UNKNOWN = 0,
  VS_PORT_CLIENT_TCPIP = 1,
  VS_PORT_CLIENT_VNIC = 2,
  VS_PORT_CLIENT_UPLINK = 3,
  VS_PORT_CLIENT_LAG = 4, /**< a link-aggregation group */
} VS_PortClientType;

/** What a port does with VLAN tags: a set of bits. */
typedef enum VSVlanTPFlags {
  VS_VLAN_TP_FLAG_TAGGED_INPUT = 0x1,
  VS_VLAN_TP_FLAG_TAGGED_OUTPUT = 0x2,
  VS_VLAN_TP_FLAG_OVERWRITE_VID = 0x4,
  VS_VLAN_TP_FLAG_OVERWRITE_PRIORITY = 0x8,
  VS_VLAN_TP_FLAG_FILTER_ON_VIDS = 0x10,
  VS_VLAN_TP_FLAG_QOS_OUTPUT_QUEUE = 0x20,
  VS_VLAN_TP_FLAG_ALLOW_NESTEDTAG = 0x10000,
} VSVlanTPFlags;

/** 64-bit words of a VSVLANBitmap. */
#define VS_VLAN_BITMAP_ARRAY_SIZE 64

/** The numbers of a switch's ports; the library allocates it. */
typedef struct VSPortList {
  qex_uint32 numPorts;
  qex_SwitchPortID ports[0]; /**< numPorts of them */
} VSPortList;

/** The multicast addresses a port accepts, held in a VSPortInfo. */
typedef struct VSPortInfo_ethFrpAccepted {
  qex_uint16 numMulticastAddrs;
  qex_EthAddress multicastAddrs[VS_ETH_MAX_EXACT_MULTICAST_ADDRS];
} VSPortInfo_ethFrpAccepted;

/** The VLAN settings of a port, held in a VSPortInfo. */
typedef struct VSPortInfo_vlan {
  qex_VlanID defaultVID;
  qex_VlanID primaryVID;
  VSVlanTPFlags flags;
  qex_Bool statsEnabled;
} VSPortInfo_vlan;

#pragma pack(push, 1)

/** A port and its traffic. The caller owns the record. */
typedef struct VSPortInfo {
  qex_uint32 portIdx;
  qex_PortClientName clientName;
  VS_PortClientType clientType;
  qex_EthAddress fixedHwID;             /**< hardware address of the client */
  qex_uint8 dvPortId[VS_DVPORT_ID_MAX]; /**< NUL-terminated */
  VSPortInfo_ethFrpAccepted ethFrpAccepted;
  VSStats stats;
  VSPortInfo_vlan vlan;
} VSPortInfo;

#pragma pack(pop)

/** A set of VLANs. The caller owns the record. */
typedef struct VSVLANBitmap {
  qex_uint64
      bits[VS_VLAN_BITMAP_ARRAY_SIZE]; /**< one bit for each VLAN, 0 to 4095, low bit first */
} VSVLANBitmap;

/** Times and traffic of a VLAN. The caller owns the record. */
typedef struct VSVLAN {
  qex_uint64 creationTime;
  qex_uint64 modificationTime;
  qex_uint64 pktsTx;
  qex_uint64 pktsRx;
} VSVLAN;

#endif  // VSWITCH_PORT_INFO_H
