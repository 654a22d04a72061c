#ifndef VSWITCH_MAC_TABLES_H
#define VSWITCH_MAC_TABLES_H

/**
 * @file
 * MAC tables: what is reached through which port.
 */

#include "qexapi/protocols.h"
#include "qexapi/types.h"

/** How an address came into a table; a query asks for one kind or for all. */
typedef enum VSMACAddrType {
  VS_MAC_ADDR_TYPE_STATIC = 0,
  VS_MAC_ADDR_TYPE_USER = 1,
  VS_MAC_ADDR_TYPE_LEARNED = 2,
  VS_MAC_ADDR_TYPE_ALL = 3, /**< all kinds, to ask for or to clear */
} VSMACAddrType;

#pragma pack(push, 1)

/** An address of a table. */
typedef struct VSMACEntry {
  qex_EthAddress macAddress;
  VSMACAddrType macAddrType : 8; /**< one byte of the record */
  qex_Bool aging;                /**< whether the entry goes when it is not used */
  qex_VlanID vid;
  qex_uint32 vni;     /**< virtual network identifier, or 0 */
  qex_uint32 elapsed; /**< seconds since the address was last seen */
} VSMACEntry;

/** A MAC table. The library allocates it, VSQEX_FreeMemory takes it back. */
typedef struct VSMACTable {
  qex_uint32 totalEntries; /**< entries the library had */
  qex_uint32 numEntries;   /**< entries that are here */
  VSMACEntry macEntries[0];
} VSMACTable;

/** MAC learning of all switches of the host. The caller owns the record, the library fills it. */
typedef struct VSMACLearningGlobalProps {
  qex_uint32 agingTime; /**< seconds */
  qex_uint32 macLimit;  /**< learned addresses */
  qex_Bool learnStatic;
} VSMACLearningGlobalProps;

/** MAC learning of a port so far. The caller owns the record, the library fills it. */
typedef struct VSPMACLearningStats {
  qex_uint32 numMACsLearned;
  qex_uint64 noLearningAllowedPkts; /**< let through although their source was not learned */
  qex_uint64 noLearningDroppedPkts; /**< dropped because their source was not learned */
  qex_uint64 numMACsMoved;
} VSPMACLearningStats;

#pragma pack(pop)

#endif  // VSWITCH_MAC_TABLES_H
