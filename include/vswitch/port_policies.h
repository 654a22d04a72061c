#ifndef VSWITCH_PORT_POLICIES_H
#define VSWITCH_PORT_POLICIES_H

/**
 * @file
 * VLAN, security and multicast policies of a port.
 */

#include "qexapi/protocols.h"
#include "qexapi/switch_ports.h"
#include "qexapi/types.h"

/** Bits of VSPortVlanPolicy.flags. */
enum {
  VSPORT_VLAN_GUEST_TAGGING = 1, /**< the client tags its frames itself */
  VSPORT_VLAN_PVLAN_ENABLED = 2, /**< `vlanID` is a VLAN of the private-VLAN map */
  VSPORT_VLAN_SET_PRIORITY = 4,
};

/** Bits of VSPropSecurity.flags: what the client of a port may not do. */
enum {
  VSPORT_SECURITY_DISALLOW_PROMISC = 1,    /**< receive in promiscuous mode */
  VSPORT_SECURITY_DISALLOW_MAC_CHANGE = 2, /**< change its MAC address */
  VSPORT_SECURITY_DISALLOW_FORGED_SRC = 4, /**< send from a forged address */
};

/** Multicast addresses of a VSExtraEthFilter. */
#define VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS 32

/** Bits of VSExtraEthFilter.flags: frames that a port accepts. */
enum {
  QEX_ETH_FILTER_UNICAST = 0x1,
  QEX_ETH_FILTER_MULTICAST = 0x2,
  QEX_ETH_FILTER_ALLMULTI = 0x4,
  QEX_ETH_FILTER_BROADCAST = 0x8,
  QEX_ETH_FILTER_PROMISC = 0x10,
  QEX_ETH_FILTER_USE_LADRF = 0x20,
  QEX_ETH_FILTER_SINK = 0x10000, /**< those that no other port takes */
};

#pragma pack(push, 1)

/**
 * VLANs of a port: the fixed part and its ranges.
 *
 * VSDVS_GetPortVLANPolicy allocates it, VSDVS_FreeMemory takes it back.
 */
typedef struct VSPortVlanPolicy {
  qex_uint16 flags; /**< VSPORT_VLAN_* */
  qex_uint16 vlanID;
  qex_uint16 pad;
  qex_uint16 numRanges;
  qex_NEBPortVIDRange vidRanges[0]; /**< VLANs of a trunk, numRanges ranges */
} VSPortVlanPolicy;

/** What the client of a port may not do. The caller owns the record. */
typedef struct VSPropSecurity {
  qex_uint32 flags; /**< VSPORT_SECURITY_* */
} VSPropSecurity;

/** Frames a port accepts beside those for its client. The caller owns the record. */
typedef struct VSExtraEthFilter {
  qex_uint32 flags; /**< QEX_ETH_FILTER_* */
  qex_uint16 numMulticastAddrs;
  qex_EthAddress multicastAddrs[VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS];
  qex_uint16 pad;
} VSExtraEthFilter;

#pragma pack(pop)

#endif  // VSWITCH_PORT_POLICIES_H
