#ifndef QEXAPI_PORTS_H
#define QEXAPI_PORTS_H

/**
 * @file
 * Ports of the kernel's switches and what is connected to them.
 */

/** The overlay network key of a packet that belongs to none. */
#define QEX_NET_OVERLAY_NETWORK_KEY_NON_APPLICABLE 0

/** How a device reaches a port past the kernel. */
typedef enum qex_PassthruType {
  QEX_PT_UPT = 1,
  QEX_PT_CDPT = 2,
} qex_PassthruType;

/** The qex_SwitchPortID of no port. */
#define QEX_VSWITCH_INVALID_PORT_ID 0

/** Bytes of a port client's name, its terminating NUL included. */
#define QEX_PORT_CLIENT_NAME_MAX 1040

/** The name of what is connected to a port. */
typedef char qex_PortClientName[QEX_PORT_CLIENT_NAME_MAX];

/** The resource pool of packets that were assigned to none. */
#define QEX_PORTSET_DEFAULT_RESPOOL_TAG 0

#endif  // QEXAPI_PORTS_H
