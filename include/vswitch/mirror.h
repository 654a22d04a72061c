#ifndef VSWITCH_MIRROR_H
#define VSWITCH_MIRROR_H

/**
 * @file
 * Mirror sessions: the table of a port's sessions, and what the running sessions count.
 *
 * A table is one block of memory: its header, the sessions, and after the last session the entities
 * of all sessions, each session's in one run. Everything is packed and in host byte order.
 */

#include "qexapi/names.h"
#include "qexapi/socket_addresses.h"
#include "qexapi/types.h"

/** DVMirrorSessionTable.magicNum. */
#define VS_DVMIRROR_MAGIC_NUM 0xFACEBEEF

/** The layout of a table. */
typedef enum DVMirrorVersion {
  VS_DVMIRROR_VERSION_V1 = 1,
  VS_DVMIRROR_VERSION_V2 = 2,
  VS_DVMIRROR_VERSION_V3 = 3,
  VS_DVMIRROR_VERSION_UNSUPPORTED = 4,
} DVMirrorVersion;

/** Bits of DVMirrorSession.flags. */
typedef enum DVMirrorFlags {
  VS_DVMIRROR_FLAG_DST_NO_OUTPUT = 1,
  VS_DVMIRROR_FLAG_DST_NO_INPUT = 2,
  VS_DVMIRROR_FLAG_DST_ORIG_VLAN = 4,
  VS_DVMIRROR_FLAG_DST_ENCAP = 8,
  VS_DVMIRROR_FLAG_LEGACY = 16,
  VS_DVMIRROR_FLAG_DISABLED = 32,
  VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR = 64,
} DVMirrorFlags;

/** Bits of DVMirrorSession.wildIn and wildOut. */
typedef enum DVMirrorWildcards {
  VS_DVMIRROR_WILDCARD_VMM = 1,
  VS_DVMIRROR_WILDCARD_PNIC = 2,
  VS_DVMIRROR_WILDCARD_COS = 4,
  VS_DVMIRROR_WILDCARD_TCPIP = 8,
  VS_DVMIRROR_WILDCARD_TEST = 16,
} DVMirrorWildcards;

/** Identifier and name of the session that stands for a port in promiscuous mode. */
#define VS_DVMIRROR_DEFAULT_LEGACY_SESSION_SID "legacy_promiscuous"
#define VS_DVMIRROR_DEFAULT_LEGACY_SESSION_DNAME "legacy_promiscuous"

/** DVMirrorSession.snapLen for whole frames. */
#define VS_DVMIRROR_SNAPLEN_COMPLETE (-1)

/** Versions of distributed switches that the library knows. */
enum {
  VS_YKT_NEB_VERSION_10 = 100,
  VS_YKT_NEB_VERSION_20 = 200,
};

/** Kinds of sessions. */
typedef enum DVMirrorSessionType {
  VS_DVMIRROR_SESSIONTYPE_MIXDST = 0,
  VS_DVMIRROR_SESSIONTYPE_DVPORT = 1,
  VS_DVMIRROR_SESSIONTYPE_RMIRROR_SRC = 2,
  VS_DVMIRROR_SESSIONTYPE_RMIRROR_DST = 3,
  VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC = 4,
} DVMirrorSessionType;

/** What an entity names. */
typedef enum DVMirrorEntityType {
  MIRROR_ENTTYPE_DVPORT = 0, /**< a port, by its identifier: `dvPortId` */
  MIRROR_ENTTYPE_UPLINK = 1, /**< an uplink, by its name: `uplink` */
  MIRROR_ENTTYPE_VLAN = 2,   /**< a VLAN: `vlan` */
  MIRROR_ENTTYPE_IP = 3,     /**< an address: `ip` */
  MIRROR_ENTTYPE_PORT = 4,   /**< a port, by its number: `portId` */
} DVMirrorEntityType;

/** Which traffic of an uplink is mirrored. */
typedef enum DVMirrorFilterType {
  MIRROR_UPLINK_FILTER_NONE = 0,
  MIRROR_UPLINK_FILTER_NORMAL = 1,
  MIRROR_UPLINK_FILTER_STT = 2,
  MIRROR_UPLINK_FILTER_VXLAN = 3,
  MIRROR_UPLINK_FILTER_GENEVE = 4,
  MIRROR_UPLINK_FILTER_ALL_ENCAP = 5,
  MIRROR_UPLINK_FILTER_TYPE_MAX = 6, /**< how many there are */
} DVMirrorFilterType;

/** How mirrored frames are wrapped. */
typedef enum DVMirrorEncapType {
  DVMIRROR_ENCAP_GRE = 0,
  DVMIRROR_ENCAP_ERSPAN2 = 1,  /**< ERSPAN type II */
  DVMIRROR_ENCAP_ERSPAN3 = 2,  /**< ERSPAN type III */
  DVMIRROR_ENCAP_TYPE_MAX = 3, /**< how many there are */
} DVMirrorEncapType;

/** The identifier of a session. */
typedef char DVMirrorSID[32];
typedef DVMirrorSID VSDVMirrorSID;

/** The display name of a session. */
typedef char DVMirrorDName[81];
typedef DVMirrorDName VSDVMirrorDName;

#pragma pack(push, 1)

/** An IP address of either family, in network byte order. */
typedef struct DVMirrorIP {
  qex_Bool isIPv6;
  qex_uint8 pad[3];
  union {
    qex_SocketIPAddressAddr ipv4;
    qex_SocketIPv6AddressAddr ipv6;
  };
} DVMirrorIP;

/** What a session mirrors from or to; the type says which view of the value holds. */
typedef struct DVMirrorEntity {
  DVMirrorEntityType type;
  union {
    char dvPortId[48];
    qex_Name uplink;
    qex_uint16 vlan;
    DVMirrorIP ip;
    qex_uint32 portId;
  };
} DVMirrorEntity;

/** A session of a table. */
typedef struct DVMirrorSession {
  DVMirrorSID sid;
  DVMirrorDName dname;
  char pad0[3];
  DVMirrorSessionType type;
  qex_uint32 snapLen; /**< bytes of each frame; VS_DVMIRROR_SNAPLEN_COMPLETE and 0 mean all */
  qex_uint32 flags;   /**< DVMirrorFlags */
  qex_uint16 encapVlan;
  qex_uint16 wildIn;  /**< sources of received frames, DVMirrorWildcards */
  qex_uint16 wildOut; /**< sources of sent frames, DVMirrorWildcards */
  qex_uint16 pad1;
  qex_uint32 samplingRate; /**< one frame in so many is mirrored; 0 means every frame */
  qex_uint32 greKey;
  DVMirrorFilterType uplinkFilter;
  qex_Bool stack; /**< mirror on the side of the stack */
  DVMirrorEncapType encapType;
  qex_uint16 erspanID;
  qex_uint8 erspanCOS;
  qex_uint8 erspanGra;
  char pad2[59];
  qex_uint32 numDstEntities;    /**< first come the destinations, */
  qex_uint32 numSrcInEntities;  /**< then the sources of received frames, */
  qex_uint32 numSrcOutEntities; /**< then the sources of sent frames */
  qex_uint32 startIdx;          /**< where the session's first entity is among all entities */
} DVMirrorSession;

/**
 * The header of a table and its sessions; the entities follow the last session.
 *
 * VSDVS_GetDVMirrorSessions allocates one, VSDVS_FreeMemory takes it back. What
 * VSDVS_AppendDVMirrorSessions takes is the caller's.
 */
typedef struct DVMirrorSessionTable {
  qex_uint32 magicNum; /**< VS_DVMIRROR_MAGIC_NUM */
  DVMirrorVersion version;
  qex_uint32 numSessions;
  qex_uint32 numEntities;
  char pad[4];
  DVMirrorSession sessions[0]; /**< numSessions of them */
} DVMirrorSessionTable;

/** What a running session counted. The caller owns the record, the library fills it. */
typedef struct VSDVMirrorSessionStats {
  qex_uint64 mirrorPktCnt;
  qex_uint64 mirrorPktFailCnt;
  qex_uint64 mirroredPkts;
  qex_uint64 discardedPkts;
  qex_uint64 failedPkts;
  DVMirrorDName name;
} VSDVMirrorSessionStats;

/** The running sessions. The library allocates it, VSQEX_FreeMemory takes it back. */
typedef struct VSDVMirrorSessionIDs {
  qex_uint32 totalEntries; /**< entries the library had */
  qex_uint32 numEntries;   /**< entries that are here */
  DVMirrorSID entries[0];
} VSDVMirrorSessionIDs;

/**
 * The ports that see the frames of a switch in promiscuous mode.
 *
 * The library allocates it, VSQEX_FreeMemory takes it back.
 */
typedef struct VSPromiscSessionActiveDsts {
  qex_uint32 totalEntries; /**< entries the library had */
  qex_uint32 numEntries;   /**< entries that are here */
  qex_SwitchPortID entries[0];
} VSPromiscSessionActiveDsts;

#pragma pack(pop)

#endif  // VSWITCH_MIRROR_H
