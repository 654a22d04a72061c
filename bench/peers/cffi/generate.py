#!/usr/bin/env python3
"""Writes the C source of the cffi peer, in API mode: generate.py OUTPUT."""

import sys

import cffi  # type: ignore[import]  # it has no types

DECLARATIONS = """
typedef unsigned int qex_uint32;
typedef int QEX_ReturnStatus;
typedef struct VSInfo { qex_uint32 mtu; ...; } VSInfo;
typedef struct qex_Name { char string[32]; } qex_Name;
typedef struct VSUplinks_entries { qex_Name name; ...; } VSUplinks_entries;
typedef struct VSUplinks { qex_uint32 numEntries; VSUplinks_entries entries[]; ...; } VSUplinks;
int VSDVS_SetMTU(char const *switchName, qex_uint32 mtu);
int VSDVS_DvPortIDToPortID(char const *switchName, char const *port, int *portID);
int VSQEX_GetVSInfo(char const *switchName, VSInfo *info);
int VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks);
VSInfo *new_VSInfo(void);
void delete_VSInfo(VSInfo *info);
qex_uint32 VSInfo_mtu_get(VSInfo *info);
void VSInfo_mtu_set(VSInfo *info, qex_uint32 value);
qex_uint32 VSUplinks___len__(VSUplinks *uplinks);
"""

SOURCE = """
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include <stdlib.h>

static VSInfo *new_VSInfo(void) { return calloc(1, sizeof(VSInfo)); }
static void delete_VSInfo(VSInfo *info) { free(info); }
static qex_uint32 VSInfo_mtu_get(VSInfo *info) { return info->mtu; }
static void VSInfo_mtu_set(VSInfo *info, qex_uint32 value) { info->mtu = value; }
static qex_uint32 VSUplinks___len__(VSUplinks *uplinks) { return uplinks->numEntries; }
"""


def main() -> None:
    """Write the source."""
    builder = cffi.FFI()
    builder.cdef(DECLARATIONS)
    builder.set_source("cffi_peer", SOURCE)
    builder.emit_c_code(sys.argv[1])


if __name__ == "__main__":
    main()
