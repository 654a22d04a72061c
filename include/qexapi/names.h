#ifndef QEXAPI_NAMES_H
#define QEXAPI_NAMES_H

/**
 * @file
 * Names and counted texts.
 */

#include "qexapi/types.h"

/** Bytes of a qex_Name, its terminating NUL included. */
#define QEX_MISC_NAME_MAX 32

/** A counted byte string: the owner of the record also owns the buffer. */
typedef struct {
  qex_ByteCountSmall bufferSize;   /**< capacity of the buffer in bytes */
  qex_ByteCountSmall stringLength; /**< bytes of text in the buffer */
  qex_uint8 *buffer;
} qex_String;

/** A name of fixed size, held by value in other records. */
typedef struct qex_Name {
  char string[QEX_MISC_NAME_MAX]; /**< at most 31 characters and a NUL */
} qex_Name;

#endif  // QEXAPI_NAMES_H
