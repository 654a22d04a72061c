#ifndef VSWITCH_STATUS_TEXT_H
#define VSWITCH_STATUS_TEXT_H

/**
 * @file
 * The text of a status, and the report of a fatal condition.
 */

#include "qexapi/status.h"

#ifdef __cplusplus
extern "C" {
#endif

/**
 * The text of a status code.
 *
 * @return text that belongs to the library and is never freed, or null for a code it does not know
 */
char const *QEX_ReturnStatusToString(QEX_ReturnStatus status);

/**
 * Reports a fatal condition of the caller on the host's standard error and returns.
 *
 * @param format format of the message; the module passes a null pointer as the only further
 *               argument
 */
void Panic(char const *format, ...);

#ifdef __cplusplus
}
#endif

#endif  // VSWITCH_STATUS_TEXT_H
