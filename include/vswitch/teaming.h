#ifndef VSWITCH_TEAMING_H
#define VSWITCH_TEAMING_H

/**
 * @file
 * Teaming: how a switch or a port uses several uplinks.
 */

#include "qexapi/switch_ports.h"
#include "qexapi/types.h"

/** Uplinks of a team. */
#define QEX_TEAM_MAX_UPLINKS 32

/** Values of VSTeamPolicy.loadBalance. */
enum {
  TEAM_FRP_TYPE_NONE = 0,
  TEAM_FRP_TYPE_LB_IP = 1,
  TEAM_FRP_TYPE_LB_SRCMAC = 2,
  TEAM_FRP_TYPE_LB_SRCID = 3,
  TEAM_FRP_TYPE_FO_EXPLICIT = 4,
  TEAM_FRP_TYPE_LB_LBT = 5,
};

/** Bits of VSTeamPolicy.linkCriteria: what takes an uplink out of use. */
enum {
  TEAM_FRP_CRIT_LINK_SPEED = 0x1,
  TEAM_FRP_CRIT_LINK_SPEED_GTE = 0x2,
  TEAM_FRP_CRIT_LINK_DUPLEX = 0x4,
  TEAM_FRP_CRIT_LACP_PORT_DOWN = 0x8,
  TEAM_FRP_CRIT_BEACON_STATE = 0x20,
  TEAM_FRP_CRIT_LINK_ERR = 0x40,
  TEAM_FRP_CRIT_LINK_STATE = 0x80,
  TEAM_FRP_CRIT_PORT_BLOCKED = 0x100,
  TEAM_FRP_CRIT_DRV_PRESENT = 0x200,
};

/** Bits of VSTeamPolicy.flags. */
enum {
  TEAM_FRP_FLAG_ALL_AVAILABLE = 0x1,
  TEAM_FRP_FLAG_REVERSE = 0x2,
  TEAM_FRP_FLAG_BEST_EFFORT = 0x4,
  TEAM_FRP_FLAG_ROLLING = 0x8,
  TEAM_FRP_FLAG_SHOTGUN = 0x10,
  TEAM_FRP_FLAG_NOTIFY_SWITCH = 0x20,
  TEAM_FRP_FLAG_BLOCK_OUTPUT = 0x40,
  TEAM_FRP_FLAG_LACP_CLIENT = 0x40000,
  TEAM_FRP_FLAG_LST = 0x80000,
};

#pragma pack(push, 1)

/** How a team is used. The caller owns the record; a get call fills it. */
typedef struct VSTeamPolicy {
  qex_uint32 loadBalance;  /**< TEAM_FRP_TYPE_* */
  qex_uint32 linkCriteria; /**< TEAM_FRP_CRIT_* */
  qex_uint8 percentError;
  qex_uint8 fullDuplex;
  qex_uint16 speed;
  qex_uint32 flags; /**< TEAM_FRP_FLAG_* */
  qex_uint32 numActive;
  qex_uint32 numStandby;
  /** Names of uplink ports: numActive active ones, then numStandby standby ones. */
  char uplinkPortName[QEX_TEAM_MAX_UPLINKS][QEX_NEB_NAME_MAX_LEN];
} VSTeamPolicy;

#pragma pack(pop)

#endif  // VSWITCH_TEAMING_H
