# cython: language_level=3, c_string_type=str, c_string_encoding=utf8
"""The measured functions through Cython, as functions and as extension types."""

from libc.stdlib cimport calloc, free
from libc.string cimport memcpy, strlen


cdef extern from "<string.h>":
    size_t strnlen(const char *, size_t)

cdef extern from "vswitch/configuration.h":
    ctypedef unsigned int qex_uint32
    ctypedef struct qex_Name_c "qex_Name":
        char string[32]
    ctypedef struct VSUplinks_entries_c "VSUplinks_entries":
        qex_Name_c name
    ctypedef struct VSUplinks_c "VSUplinks":
        qex_uint32 numEntries
        VSUplinks_entries_c *entries
    int c_VSDVS_SetMTU "VSDVS_SetMTU"(const char *, qex_uint32)
    int c_VSDVS_DvPortIDToPortID "VSDVS_DvPortIDToPortID"(const char *, const char *, int *)

cdef extern from "vswitch/queries.h":
    ctypedef struct VSInfo_c "VSInfo":
        qex_uint32 mtu
    int c_VSQEX_GetVSInfo "VSQEX_GetVSInfo"(const char *, VSInfo_c *)
    int c_VSQEX_GetUplinks "VSQEX_GetUplinks"(const char *, VSUplinks_c **)


cdef class VSInfo:
    cdef VSInfo_c *record
    cdef bint owned

    def __cinit__(self):
        self.record = <VSInfo_c *>calloc(1, sizeof(VSInfo_c))
        if not self.record:
            raise MemoryError
        self.owned = True

    def __dealloc__(self):
        if self.owned:
            free(self.record)

    @property
    def mtu(self):
        return self.record.mtu

    @mtu.setter
    def mtu(self, qex_uint32 value):
        self.record.mtu = value


cdef class qex_Name:
    cdef qex_Name_c *record
    cdef bint owned

    def __cinit__(self):
        self.record = <qex_Name_c *>calloc(1, sizeof(qex_Name_c))
        if not self.record:
            raise MemoryError
        self.owned = True

    def __dealloc__(self):
        if self.owned:
            free(self.record)

    @property
    def string(self):
        return self.record.string[:strnlen(self.record.string, 32)]

    @string.setter
    def string(self, const char *text):
        set_name_text(self.record, text)


cdef int set_name_text(qex_Name_c *name, const char *text) except -1:
    cdef size_t length = strlen(text)
    if length >= 32:
        raise ValueError("at most 31 bytes")
    memcpy(name.string, text, length + 1)
    return 0


cdef class VSUplinks:
    cdef VSUplinks_c *record

    def __len__(self):
        return self.record.numEntries

    def __getitem__(self, size_t index):
        if index >= self.record.numEntries:
            raise IndexError(index)
        return self.record.entries[index].name.string


def new_VSInfo():
    return VSInfo.__new__(VSInfo)


def delete_VSInfo(VSInfo info not None):
    if info.owned:
        info.owned = False
        free(info.record)


def VSInfo_mtu_get(VSInfo info not None):
    return info.record.mtu


def VSInfo_mtu_set(VSInfo info not None, qex_uint32 value):
    info.record.mtu = value


def new_qex_Name():
    return qex_Name.__new__(qex_Name)


def qex_Name_string_get(qex_Name name not None):
    return name.record.string[:strnlen(name.record.string, 32)]


def qex_Name_string_set(qex_Name name not None, const char *text):
    set_name_text(name.record, text)


def VSUplinks___len__(VSUplinks uplinks not None):
    return uplinks.record.numEntries


def VSUplinks___getitem__(VSUplinks uplinks not None, int index):
    if <qex_uint32>index >= uplinks.record.numEntries:
        return None
    return uplinks.record.entries[index].name.string


def VSDVS_SetMTU(const char *alias, qex_uint32 mtu):
    return c_VSDVS_SetMTU(alias, mtu)


def VSDVS_DvPortIDToPortID(const char *alias, const char *port):
    cdef int number = 0
    cdef int status = c_VSDVS_DvPortIDToPortID(alias, port, &number)
    return [status, number]


def VSQEX_GetVSInfo(const char *alias, VSInfo info not None):
    return c_VSQEX_GetVSInfo(alias, info.record)


def VSQEX_GetUplinks(const char *alias):
    cdef VSUplinks uplinks = VSUplinks()
    cdef int status = c_VSQEX_GetUplinks(alias, &uplinks.record)
    return [status, uplinks]
