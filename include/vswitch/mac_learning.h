#ifndef VSWITCH_MAC_LEARNING_H
#define VSWITCH_MAC_LEARNING_H

/**
 * @file
 * MAC learning of a switch.
 */

#include "qexapi/types.h"

/** Ageing times in seconds, and the defaults of a switch and of its uplink team. */
enum {
  VS_MAC_LEARNING_AGING_TIME_DEFAULT = 300,        /**< seconds */
  VS_MAC_LEARNING_AGING_TIME_MAX = 1000000,        /**< seconds */
  TEAM_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT = 16384, /**< addresses, of a team of uplinks */
  VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT = 65536,   /**< VSMACLearning.macLimit */
  VS_MAC_LEARNING_LEARN_STATIC_DEFAULT = 0,        /**< VSMACLearning.learnStatic */
};

#pragma pack(push, 1)

/** MAC learning of a switch. The caller owns the record. */
typedef struct VSMACLearning {
  qex_uint32 agingTime : 24; /**< seconds, at most VS_MAC_LEARNING_AGING_TIME_MAX */
  qex_uint32 learnStatic : 1;
  qex_uint32 reserved : 7;
  qex_uint32 macLimit; /**< learned addresses */
} VSMACLearning;

#pragma pack(pop)

#endif  // VSWITCH_MAC_LEARNING_H
