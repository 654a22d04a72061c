#ifndef VSWITCH_QUERIES_H
#define VSWITCH_QUERIES_H

/**
 * @file
 * Asking the running switches of this host, and commanding them: VSQEX_*.
 *
 * Every call returns a status. Texts are NUL-terminated UTF-8 and are only read. A switch is named
 * by its alias. An output is meaningful only with QEX_OK.
 */

#include "qexapi/status.h"
#include "vswitch/switch_info.h"

#ifdef __cplusplus
extern "C" {
#endif

/** Fills `info`, which the caller owns. */
QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info);

/**
 * Gives back memory that a VSQEX_* call handed out.
 *
 * @param memory what the library allocated, once; null does nothing
 */
void VSQEX_FreeMemory(void *memory);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_QUERIES_H
