#ifndef VSWITCH_RUNTIME_OPTIONS_H
#define VSWITCH_RUNTIME_OPTIONS_H

/**
 * @file
 * Runtime options of the host's switches: a packed list.
 *
 * The options lie back to back after the length of the list, without padding. An integer option
 * takes 8 bytes: header and 32-bit value. A text option holds its text with a terminating NUL.
 */

#include "qexapi/types.h"

/** Options. The last two are texts, the others integers. */
typedef enum VSRuntimeOptionType {
  VS_RT_OPT_IGMP_QUERY_INTERVAL = 0,            /**< IGMPQueryInterval */
  VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM = 1,         /**< IGMPV3MaxSrcIPNum */
  VS_RT_OPT_IGMP_QUERIES = 2,                   /**< IGMPQueries */
  VS_RT_OPT_IGMP_VERSION = 3,                   /**< IGMPVersion */
  VS_RT_OPT_MLD_VERSION = 4,                    /**< MLDVersion */
  VS_RT_OPT_MLD_V2_MAX_SRC_IP_NUM = 5,          /**< MLDV2MaxSrcIPNum */
  VS_RT_OPT_MAX_RARPS_PER_INTERVAL = 6,         /**< MaxRARPsPerInterval */
  VS_RT_OPT_RARP_ADVERTISEMENT_DURATION = 7,    /**< RARPAdvertisementDuration */
  VS_RT_OPT_REVERSE_PATH_FWD_CHECK = 8,         /**< ReversePathFwdCheck */
  VS_RT_OPT_REVERSE_PATH_FWD_CHECK_PROMISC = 9, /**< ReversePathFwdCheckPromisc */
  VS_RT_OPT_ALLOW_FAST_PATH = 10,               /**< AllowFastPath */
  VS_RT_OPT_TEAM_POLICY_UP_DELAY = 11,          /**< TeamPolicyUpDelay */
  VS_RT_OPT_ALLOW_MIRROR_STATS = 12,            /**< AllowMirrorStats */
  VS_RT_OPT_IGMP_ROUTER_IP = 13,                /**< IGMPRouterIP */
  VS_RT_OPT_MLD_ROUTER_IP = 14,                 /**< MLDRouterIP */
  VS_NUM_RT_OPT = 15,                           /**< how many there are */
} VSRuntimeOptionType;

/** Bytes of a whole list and of a text, the text's terminating NUL included. */
#define VS_CHARDEV_MAX_RUNTIME_OPTIONS_LENGTH 4096
#define VS_CHARDEV_MAX_RUNTIME_STRING_OPTION_LENGTH 128

#pragma pack(push, 1)

/** The header of an option and its value. It lies in a list and may start at any byte. */
typedef struct VSRuntimeOptionHeader {
  qex_uint16 type;   /**< a VSRuntimeOptionType */
  qex_uint16 length; /**< bytes of the whole option, header included */
  qex_uint8 data[0];
} VSRuntimeOptionHeader;

/**
 * A list of options; they follow the record.
 *
 * VSQEX_GetRuntimeOptions allocates one, VSQEX_FreeMemory takes it back. What
 * VSQEX_SetRuntimeOptions takes is the caller's.
 */
typedef struct VSRuntimeOptions {
  qex_uint32 totalLength; /**< bytes of the whole list, this field included */
} VSRuntimeOptions;

#pragma pack(pop)

#endif  // VSWITCH_RUNTIME_OPTIONS_H
