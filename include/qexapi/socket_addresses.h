#ifndef QEXAPI_SOCKET_ADDRESSES_H
#define QEXAPI_SOCKET_ADDRESSES_H

/**
 * @file
 * Socket addresses as the kernel lays them out.
 */

#include "qexapi/types.h"

/** Bytes of an address as text, its terminating NUL included. */
#define QEX_SOCKET_AF_INET_STRLEN 16  /**< IPv4 */
#define QEX_SOCKET_AF_INET6_STRLEN 46 /**< IPv6 */

/** Address families and socket types. */
enum {
  QEX_SOCKET_AF_INET = 2,   /**< IPv4 */
  QEX_SOCKET_AF_INET6 = 28, /**< IPv6 */
  QEX_SOCKET_SOCK_STREAM = 1,
  QEX_SOCKET_SOCK_DGRAM = 2,
  QEX_SOCKET_SOCK_RAW = 3,
};

/** A socket address of any family; the caller owns the record. */
typedef struct qex_SocketAddress {
  qex_uint8 sa_len; /**< bytes of the whole address */
  qex_uint8 sa_family;
  qex_uint8 sa_data[254];
} qex_SocketAddress;

/** An IPv4 address in network byte order. */
typedef struct qex_SocketIPAddressAddr {
  qex_uint32 s_addr;
} qex_SocketIPAddressAddr;

/** An IPv4 socket address; the caller owns the record. */
typedef struct qex_SocketIPAddress {
  qex_uint8 sin_len;
  qex_uint8 sin_family; /**< QEX_SOCKET_AF_INET */
  qex_uint16 sin_port;  /**< network byte order */
  qex_SocketIPAddressAddr sin_addr;
  qex_uint8 sin_zero[8]; /**< all zero */
} qex_SocketIPAddress;

/** The 16 bytes of an IPv6 address, seen in units of three sizes. */
typedef union qex_SocketIPv6AddressAddr___u6_addr {
  qex_uint8 __u6_addr8[16];
  qex_uint16 __u6_addr16[8];
  qex_uint32 __u6_addr32[4];
} qex_SocketIPv6AddressAddr___u6_addr;

/** An IPv6 address in network byte order. */
typedef struct qex_SocketIPv6AddressAddr {
  qex_SocketIPv6AddressAddr___u6_addr __u6_addr;
} qex_SocketIPv6AddressAddr;

/** An IPv6 socket address; the caller owns the record. */
typedef struct qex_SocketIPv6Address {
  qex_uint8 sin6_len;
  qex_uint8 sin6_family; /**< QEX_SOCKET_AF_INET6 */
  qex_uint16 sin6_port;  /**< network byte order */
  qex_uint32 sin6_flowinfo;
  qex_SocketIPv6AddressAddr sin6_addr;
  qex_uint32 sin6_scopeid;
} qex_SocketIPv6Address;

#endif  // QEXAPI_SOCKET_ADDRESSES_H
