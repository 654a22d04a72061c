#ifndef VSWITCH_DEVICE_H
#define VSWITCH_DEVICE_H

/**
 * @file
 * The device through which the library reaches the running switches, and its limits.
 */

/** The name of the device, and where it is. */
#define VS_CHARDEV_NAME "cswitch"
#define VS_CHARDEV_PATH "/dev/cswitch"

/** Bytes of the name of a set of ports and of a port's identifier, terminating NULs included. */
#define VS_PORTSET_NAME_MAX 128
#define VS_DVPORT_ID_MAX 48

/** Which statistics a query asks for. */
enum {
  VS_STATS_FLAG_RARP = 1,         /**< VSRARPStats */
  VS_STATS_FLAG_SERVICE_PORT = 2, /**< VSServicePortTeamingStats */
};

/** Multicast addresses a port accepts one by one. */
#define VS_ETH_MAX_EXACT_MULTICAST_ADDRS 32

#endif  // VSWITCH_DEVICE_H
