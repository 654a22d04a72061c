#ifndef QEXAPI_TYPES_H
#define QEXAPI_TYPES_H

/**
 * @file
 * Scalar types of the host kernel interface.
 *
 * Every other header builds on these names. Their widths are fixed by the host: a pointer to one of
 * them may be used wherever the host declares another name of the same width and signedness.
 */

/** Integers of fixed width. */
typedef signed char qex_int8;
typedef short qex_int16;
typedef int qex_int32;
typedef long long qex_int64;
typedef unsigned char qex_uint8;
typedef unsigned short qex_uint16;
typedef unsigned int qex_uint32;
typedef unsigned long long qex_uint64;

/** 32 bits on this host, although a pointer takes 64: it names kernel objects, never addresses. */
typedef qex_uint32 qex_uintptr_t;

/** A position in a file. */
typedef qex_int64 qex_loff_t;

/** One byte: 0 is false, anything else is true. */
typedef char qex_Bool;

/** Sizes in bytes. */
typedef qex_uint32 qex_ByteCountSmall;
typedef qex_int32 qex_ByteCountSmallSigned;
typedef qex_uint64 qex_ByteCount;
typedef qex_int64 qex_ByteCountSigned;

/** A revision number: major, minor, update and patch level, one byte each, major highest. */
typedef qex_uint32 qex_revnum;

/** Identifiers of kernel modules, worlds and their worldlets. */
typedef qex_int32 qex_ModuleID;
typedef qex_int32 qex_WorldID;
typedef qex_uint32 qex_WorldletID;

/** Identifies one instance of a management interface. */
typedef qex_uint64 qex_MgmtInstanceID;

/** Identifies a registered interrupt. */
typedef qex_uint32 qex_IntrCookie;

/** A VLAN identifier, 0 to 4095. */
typedef qex_uint16 qex_VlanID;

/** A VLAN priority, 0 to 7, or QEX_VLAN_PRIORITY_INVALID. */
typedef qex_uint8 qex_VlanPriority;

/** An IPv4 address in network byte order. */
typedef qex_uint32 qex_IPv4Address;

/** A virtual network identifier of 24 bits. */
typedef qex_uint32 qex_VirtualNetworkID;

/** The key of an overlay network. */
typedef qex_uint64 qex_NetOverlayNetworkKey;

/** The number of a switch port, unique on the host; QEX_VSWITCH_INVALID_PORT_ID is none. */
typedef qex_uint32 qex_SwitchPortID;

/** The speed of a link in Mbit/s; QEX_LINK_SPEED_AUTO leaves it to negotiation. */
typedef qex_uint32 qex_LinkSpeed;

/** What a network resource pool is made of. */
typedef qex_uint16 qex_PortsetResPoolTag;
typedef qex_uint8 qex_PortsetResPoolPriorityTag;
typedef qex_uint32 qex_PortsetResPoolShares;
typedef qex_int32 qex_PortsetResPoolLimit;
typedef qex_int32 qex_PortsetResPoolReservation;
typedef qex_int32 qex_PortsetResPoolQueueDepth;

/** A set of ports of the kernel; opaque. */
typedef struct Portset qex_Portset;

/** A packet in the kernel; opaque. */
typedef struct PktHandle qex_PktHandle;

#endif  // QEXAPI_TYPES_H
