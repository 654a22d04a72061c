#ifndef QEXAPI_LINKS_H
#define QEXAPI_LINKS_H

/**
 * @file
 * Links of physical adapters.
 */

#include "qexapi/types.h"

/** Whether a link is up. */
typedef enum qex_LinkState {
  QEX_LINK_STATE_DOWN = 0,
  QEX_LINK_STATE_UP = 1,
} qex_LinkState;

/** Values of a qex_LinkSpeed. */
enum {
  QEX_LINK_SPEED_AUTO = 0, /**< left to negotiation */
  QEX_LINK_SPEED_10_MBPS = 10,
  QEX_LINK_SPEED_100_MBPS = 100,
  QEX_LINK_SPEED_1000_MBPS = 1000,
  QEX_LINK_SPEED_2500_MBPS = 2500,
  QEX_LINK_SPEED_5000_MBPS = 5000,
  QEX_LINK_SPEED_10000_MBPS = 10000,
  QEX_LINK_SPEED_20000_MBPS = 20000,
  QEX_LINK_SPEED_25000_MBPS = 25000,
  QEX_LINK_SPEED_40000_MBPS = 40000,
  QEX_LINK_SPEED_50000_MBPS = 50000,
  QEX_LINK_SPEED_56000_MBPS = 56000,
  QEX_LINK_SPEED_100000_MBPS = 100000,
};

/** The duplex mode of a link. */
typedef enum qex_LinkDuplex {
  QEX_LINK_DUPLEX_AUTO = -1, /**< left to negotiation */
  QEX_LINK_DUPLEX_HALF = 1,
  QEX_LINK_DUPLEX_FULL = 2,
} qex_LinkDuplex;

/** The medium of a link. */
typedef enum qex_LinkMedia {
  QEX_LINK_MEDIA_NONE = 0,
  QEX_LINK_MEDIA_UNKNOWN = 1,
  QEX_LINK_MEDIA_BASE_T = 2,
  QEX_LINK_MEDIA_BASE_X = 3,
  QEX_LINK_MEDIA_BASE_KX = 4,
  QEX_LINK_MEDIA_BASE_SX = 5,
  QEX_LINK_MEDIA_BASE_LX = 6,
  QEX_LINK_MEDIA_BASE_KR = 7,
  QEX_LINK_MEDIA_BASE_LR = 8,
  QEX_LINK_MEDIA_BASE_SR = 9,
  QEX_LINK_MEDIA_BASE_ER = 10,
  QEX_LINK_MEDIA_BASE_TWINAX = 11,
  QEX_LINK_MEDIA_BASE_TWINAX_LONG = 12,
  QEX_LINK_MEDIA_BASE_LRM = 13,
  QEX_LINK_MEDIA_BASE_CR1 = 14,
  QEX_LINK_MEDIA_BASE_KR2 = 15,
  QEX_LINK_MEDIA_BASE_MLD2 = 16,
  QEX_LINK_MEDIA_BASE_KR4 = 17,
  QEX_LINK_MEDIA_BASE_KX4 = 18,
  QEX_LINK_MEDIA_BASE_CR4 = 19,
  QEX_LINK_MEDIA_BASE_SR4 = 20,
  QEX_LINK_MEDIA_BASE_LR4 = 21,
  QEX_LINK_MEDIA_BASE_R4 = 22,
  QEX_LINK_MEDIA_BASE_SGMII = 23,
  QEX_LINK_MEDIA_BASE_SFI = 24,
  QEX_LINK_MEDIA_BASE_XLPPI = 25,
  QEX_LINK_MEDIA_BASE_CX_SGMII = 26,
} qex_LinkMedia;

/** State, speed and duplex mode of a link; the caller owns the record. */
typedef struct qex_LinkStatus {
  qex_LinkState state;
  qex_LinkSpeed speed;
  qex_LinkDuplex duplex;
} qex_LinkStatus;

#endif  // QEXAPI_LINKS_H
