#ifndef QEXAPI_WORLDLETS_H
#define QEXAPI_WORLDLETS_H

/**
 * @file
 * Worldlets, the kernel's light-weight threads, and who calls into the kernel.
 */

#include "qexapi/types.h"

/** The word size of the process that makes a control call. */
enum {
  QEX_IOCTL_CALLER_64 = 0,
  QEX_IOCTL_CALLER_32 = 1,
};

/** Options of a worldlet. */
enum {
  QEX_WDT_OPT_FORCE_IPI_DISPATCH = 0,
  QEX_WDT_OPT_NON_INTERFERING = 1,
  QEX_WDT_OPT_ACTION_AFFINITY = 2,
  QEX_WDT_OPT_ENABLED_QEXSTATS = 3,
};

/** What is to become of a worldlet when its function returns. */
typedef enum qex_WorldletState {
  QEX_WDT_RELEASE = 1,
  QEX_WDT_SUSPEND = 2,
  QEX_WDT_READY = 4,
} qex_WorldletState;

/** How a run of a worldlet ended; the caller owns the record. */
typedef struct qex_WorldletRunData {
  qex_WorldletState state;
  qex_uint64 userData1;
  qex_uint64 userData2;
} qex_WorldletRunData;

#endif  // QEXAPI_WORLDLETS_H
