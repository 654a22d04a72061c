#ifndef VSWITCH_PORT_MAC_POLICIES_H
#define VSWITCH_PORT_MAC_POLICIES_H

/**
 * @file
 * MAC learning and MAC management of a port.
 */

#include "qexapi/types.h"

/** Default and largest VSPMACLearning.macLimit. */
#define VSPORT_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT 4096
#define VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX 4096

/** What becomes of frames from an address that no longer fits. */
typedef enum VSPortMACLearningLimitPolicy {
  VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW = 0, /**< they are let through */
  VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP = 1,  /**< they are dropped */
} VSPortMACLearningLimitPolicy;

#pragma pack(push, 1)

/** MAC learning of a port. The caller owns the record; a get call fills it. */
typedef struct VSPMACLearning {
  qex_Bool learning;
  qex_Bool flooding;   /**< whether frames for unknown addresses go out */
  qex_uint32 macLimit; /**< learned addresses */
  VSPortMACLearningLimitPolicy macLimitPolicy;
} VSPMACLearning;

/** MAC management of a port, the value of VSPROP_PORT_MAC_MANAGEMENT. */
typedef struct VSPMACManagement {
  qex_Bool macChangeAllowed;
  VSPMACLearning portMACLearning;
} VSPMACManagement;

#pragma pack(pop)

#endif  // VSWITCH_PORT_MAC_POLICIES_H
