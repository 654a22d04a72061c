#ifndef VSWITCH_DEVICE_QUERIES_H
#define VSWITCH_DEVICE_QUERIES_H

/**
 * @file
 * How the library asks the device: commands, their arguments and their buffers.
 */

#include "qexapi/links.h"
#include "qexapi/names.h"
#include "qexapi/protocols.h"
#include "qexapi/types.h"
#include "vswitch/device.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filter_modes.h"

/** Commands of the device. Every one contains the bit of its kind, _GET_MASK or _SET_MASK. */
enum {
  VS_IOCMD_GET_MASK = 0x1000,
  VS_IOCMD_GET_RARP_STATS = 0x1001,
  VS_IOCMD_GET_SERVICE_PORT_TEAMING_STATS = 0x1002,
  VS_IOCMD_GET_RUNTIME_OPTIONS = 0x1003,
  VS_IOCMD_GET_PROMISC_SESSION_ACTIVE_DSTS = 0x1004,
  VS_IOCMD_GET_DVMIRROR_SESSION_IDS = 0x1005,
  VS_IOCMD_GET_DVMIRROR_SESSION_STATS = 0x1006,
  VS_IOCMD_GET_MCAST_FILTER_MODE = 0x1007,
  VS_IOCMD_GET_MCAST_FILTERS = 0x1008,
  VS_IOCMD_GET_MCAST_FILTER_STATS = 0x1009,
  VS_IOCMD_GET_UPLINKS = 0x100A,
  VS_IOCMD_GET_UPLINK_LINK_STATE = 0x100B,
  VS_IOCMD_GET_UPLINK_LACP_LINK_STATE = 0x100C,
  VS_IOCMD_GET_LAG_TABLE = 0x100D,
  VS_IOCMD_GET_IS_VSWITCH = 0x100E,
  VS_IOCMD_GET_VSWITCH_INFO = 0x100F,
  VS_IOCMD_GET_VSWITCH_STATS = 0x1010,
  VS_IOCMD_GET_PORT_LIST = 0x1011,
  VS_IOCMD_GET_PORT_INFO = 0x1012,
  VS_IOCMD_GET_UPLINK_VLAN_LIST = 0x1013,
  VS_IOCMD_GET_VLAN_INFO = 0x1014,
  VS_IOCMD_GET_PORT_MAC_TABLE = 0x1015,
  VS_IOCMD_GET_TEAM_MAC_TABLE = 0x1016,
  VS_IOCMD_GET_PORT_MAC_LEARNING_STATS = 0x1017,
  VS_IOCMD_GET_GLOBAL_MAC_LEARNING_PROPS = 0x1018,
  VS_IOCMD_PORT_GET_TEAM_UPLINK_HINT = 0x1019,
  VS_IOCMD_GET_UPLINK_DVPORT_ID = 0x101A,
  VS_IOCMD_SET_MASK = 0x2000,
  VS_IOCMD_SET_RUNTIME_OPTIONS = 0x2001,
  VS_IOCMD_SET_UPLINK_ADMIN_LINK_STATE = 0x2002,
  VS_IOCMD_SET_PORT_MAC_TABLE = 0x2003,
  VS_IOCMD_CLEAR_PORT_MAC_TABLE = 0x2004,
  VS_IOCMD_SET_SWITCH_MAC_LEARNING = 0x2005,
};

/** The multicast filters a command asks for, held in a VSIOCtlQuery. */
typedef struct VSIOCtlQuery_mcastFilter {
  VSMcastFilterMode mode;
  qex_IPv6Address group; /**< an address of the kind that the mode says, from the first byte on */
} VSIOCtlQuery_mcastFilter;

/** The uplink a command sets, held in a VSIOCtlQuery. */
typedef struct VSIOCtlQuery_uplink {
  qex_Name name;
  qex_LinkState adminState;
} VSIOCtlQuery_uplink;

/**
 * Whom a command concerns: three areas, and the command says which view of each holds.
 *
 * The caller owns the record.
 */
typedef struct VSIOCtlQuery {
  union {
    qex_uint8 psName[VS_PORTSET_NAME_MAX]; /**< name of the set of ports, NUL-terminated */
    char dvsId[64];                        /**< identifier of the distributed switch */
  };
  union {
    qex_uint8 dvPortID[VS_DVPORT_ID_MAX]; /**< NUL-terminated */
    qex_SwitchPortID portID;
  };
  union {
    char dvMirrorSID[32];
    qex_VlanID vlanID;
    VSIOCtlQuery_mcastFilter mcastFilter;
    VSIOCtlQuery_uplink uplink;
    VSMACEntry macEntry;
    VSMACLearningGlobalProps globalMACLearningProps;
  };
} VSIOCtlQuery;

/** The buffers of a command: addresses and lengths in bytes. The caller owns record and buffers. */
typedef struct VSIOCtlData {
  qex_uint32 dataInLen;
  qex_uint32 dataOutLen;
  qex_uint64 dataInPtr;
  qex_uint64 dataOutPtr;
} VSIOCtlData;

#endif  // VSWITCH_DEVICE_QUERIES_H
