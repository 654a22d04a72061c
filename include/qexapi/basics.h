#ifndef QEXAPI_BASICS_H
#define QEXAPI_BASICS_H

/**
 * @file
 * Name lengths, truth values and units of size.
 */

/** Bytes of a kernel module's name, its terminating NUL included. */
#define QEX_MODULE_NAME_MAX 32

/** Whether the host's interface was built with its debugging checks; it was not. */
enum { qexApiDebug = 0 };

/** Bytes of a device's name, its terminating NUL included. */
#define QEX_DEVICE_NAME_MAX_LENGTH 32

/** The length modifier with which the host's own formatter prints 64-bit integers. */
#define QEX_FMT64 "L"

/** The values of a qex_Bool. */
#define QEX_FALSE 0
#define QEX_TRUE 1

/** Units of size in bytes. */
#define QEX_KILOBYTE 1024
#define QEX_MEGABYTE 1048576
#define QEX_GIGABYTE 1073741824
#define QEX_TERABYTE 0x10000000000LL
#define QEX_PETABYTE 0x4000000000000LL
#define QEX_EXABYTE 0x1000000000000000LL

/** Bits of a byte. */
#define QEX_BITS_PER_BYTE 8

#endif  // QEXAPI_BASICS_H
