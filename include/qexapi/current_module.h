#ifndef QEXAPI_CURRENT_MODULE_H
#define QEXAPI_CURRENT_MODULE_H

/**
 * @file
 * Which kernel module the including program is.
 */

#include "qexapi/types.h"

#ifdef __cplusplus
extern "C" {
#endif

/** The including program's own identifier, which it defines: 0 outside the kernel. */
extern qex_ModuleID const qex_ModuleCurrentID;

#ifdef __cplusplus
}
#endif

#endif  // QEXAPI_CURRENT_MODULE_H
