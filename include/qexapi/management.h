#ifndef QEXAPI_MANAGEMENT_H
#define QEXAPI_MANAGEMENT_H

/**
 * @file
 * Management interfaces: how a kernel module offers callbacks to programs.
 */

#include "qexapi/names.h"
#include "qexapi/types.h"

/** Limits of a management interface. */
#define QEX_MGMT_MAX_CALLBACK_PARMS 4 /**< parameters of a callback */
#define QEX_MGMT_RESERVED_CALLBACKS 15

/** How the keys of an instance are told apart. */
enum {
  QEX_MGMT_KEY_TYPE_LONG = 1,   /**< by numbers */
  QEX_MGMT_KEY_TYPE_STRING = 2, /**< by texts */
};

/** Limits of keys and instances. */
#define QEX_MGMT_KEY_STRING_MAXLEN 4096   /**< bytes of a key that is a text */
#define QEX_MGMT_MAX_KEYS_PER_INSTANCE 32 /**< keys of an instance */
#define QEX_MGMT_MAX_INSTANCES 32         /**< instances of an interface */

/** Where a callback runs. */
typedef enum qex_MgmtCallbackLocation {
  QEX_MGMT_CALLBACK_KERNEL = 1, /**< in the kernel */
  QEX_MGMT_CALLBACK_USER = 2,   /**< in a program */
} qex_MgmtCallbackLocation;

/** Which way a parameter of a callback goes, and whether it is a vector. */
typedef enum qex_MgmtParm {
  QEX_MGMT_PARMTYPE_IN = 0,
  QEX_MGMT_PARMTYPE_OUT = 1,
  QEX_MGMT_PARMTYPE_INOUT = 2,
  QEX_MGMT_PARMTYPE_VECTOR_IN = 3,
  QEX_MGMT_PARMTYPE_VECTOR_OUT = 4,
  QEX_MGMT_PARMTYPE_VECTOR_INOUT = 5,
} qex_MgmtParmType;

/** One callback of an interface; the record refers to the callback and owns nothing. */
typedef struct qex_MgmtCallbackInfo {
  qex_MgmtCallbackLocation location;
  void *callback; /**< the function, where it runs in this process */
  qex_Bool synchronous;
  qex_uint8 numParms;                                      /**< at most 4 */
  qex_uint32 parmSizes[QEX_MGMT_MAX_CALLBACK_PARMS];       /**< bytes of each parameter */
  qex_MgmtParmType parmTypes[QEX_MGMT_MAX_CALLBACK_PARMS]; /**< direction of each parameter */
  qex_uint64 callbackId;
} qex_MgmtCallbackInfo;

/** What an interface offers; the caller owns the record and the table it points to. */
typedef struct qex_MgmtApiSignature {
  qex_revnum version;
  qex_Name name;
  qex_Name vendor;
  int numCallbacks;
  qex_MgmtCallbackInfo *callbacks; /**< numCallbacks of them */
} qex_MgmtApiSignature;

/** A parameter of variable length; the data belongs to the caller of the callback. */
typedef struct qex_MgmtVectorParm {
  qex_ByteCount length;
  void *dataPtr;
} qex_MgmtVectorParm;

/** The instances of an interface; the caller owns the record. */
typedef struct qex_MgmtInstances {
  qex_uint8 numInstances;
  qex_uint64 instanceIds[QEX_MGMT_MAX_INSTANCES];
  qex_Name instanceNames[QEX_MGMT_MAX_INSTANCES];
} qex_MgmtInstances;

#endif  // QEXAPI_MANAGEMENT_H
