"""The measured functions through ctypes: structures and prototypes, declared."""

from ctypes import CDLL, POINTER, Structure, c_char, c_char_p, c_int, c_uint8, c_uint16, c_uint32


class VSInfo(Structure):
    """A switch as the kernel runs it."""

    _fields_ = [
        ("mtu", c_uint32),
        ("maxValidVlan", c_uint16),
        ("minValidVlan", c_uint16),
        ("activePorts", c_uint32),
        ("maxPorts", c_uint32),
        ("dvsName", c_uint8 * 128),
        ("nebID", c_uint8 * 64),
    ]


class qex_Name(Structure):  # noqa: N801 (the host's name)
    """A name of fixed size."""

    _fields_ = [("string", c_char * 32)]


class VSUplinks_entries(Structure):  # noqa: N801 (the host's name)
    """An uplink of a switch."""

    _pack_ = 1
    _fields_ = [("name", qex_Name), ("portID", c_uint32)]


class VSUplinks(Structure):
    """The uplinks of a switch; as many entries follow as it says."""

    _pack_ = 1
    _fields_ = [
        ("totalEntries", c_uint32),
        ("numEntries", c_uint32),
        ("entries", VSUplinks_entries * 0),
    ]


_library = CDLL("libvswitch.so")

VSDVS_SetMTU = _library.VSDVS_SetMTU
VSDVS_SetMTU.argtypes = [c_char_p, c_uint32]
VSDVS_DvPortIDToPortID = _library.VSDVS_DvPortIDToPortID
VSDVS_DvPortIDToPortID.argtypes = [c_char_p, c_char_p, POINTER(c_int)]
VSQEX_GetVSInfo = _library.VSQEX_GetVSInfo
VSQEX_GetVSInfo.argtypes = [c_char_p, POINTER(VSInfo)]
VSQEX_GetUplinks = _library.VSQEX_GetUplinks
VSQEX_GetUplinks.argtypes = [c_char_p, POINTER(POINTER(VSUplinks))]
