/**
 * Text forms of network addresses.
 *
 * For the module's own C++ only. Each returns a new `str`.
 */
#ifndef HELPERS_ADDRESSES_H
#define HELPERS_ADDRESSES_H

#include <Python.h>

#include "qexapi/types.h"

/** Six bytes as lower-case hexadecimal with colons between them. */
PyObject *mac_address_text(void const *bytes);

/** Four bytes in network order as a dotted quad. */
PyObject *ipv4_address_text(void const *bytes);

/** Sixteen bytes in the presentation form of IPv6. */
PyObject *ipv6_address_text(void const *bytes);

#endif
