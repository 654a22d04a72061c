"""Functions like the measured module's own, over the declarations for ctypes."""

from ctypes import POINTER, byref, c_int, cast
from typing import Any, List, Optional, Tuple

import ctypes_peer as declared

_set_mtu, _port_id = declared.VSDVS_SetMTU, declared.VSDVS_DvPortIDToPortID
_get_info, _VSInfo = declared.VSQEX_GetVSInfo, declared.VSInfo
_UPLINKS, _ENTRIES = POINTER(declared.VSUplinks), POINTER(declared.VSUplinks_entries)


def new_VSInfo() -> Any:
    return _VSInfo()


def delete_VSInfo(record: Any) -> None:
    """Leave the memory to the last reference, as ctypes does."""


def VSInfo_mtu_get(record: Any) -> Any:
    return record.mtu


def VSInfo_mtu_set(record: Any, value: int) -> None:
    record.mtu = value


def new_qex_Name() -> Any:
    return declared.qex_Name()


def qex_Name_string_get(record: Any) -> Any:
    return record.string.decode()


def qex_Name_string_set(record: Any, text: str) -> None:
    record.string = text.encode()


def VSUplinks___len__(record: Any) -> Any:
    return record.numEntries


def VSUplinks___getitem__(record: Any, index: int) -> Optional[str]:
    if not 0 <= index < record.numEntries:
        return None
    text: str = cast(record.entries, _ENTRIES)[index].name.string.decode()
    return text


def VSDVS_SetMTU(alias: str, mtu: int) -> Any:
    return _set_mtu(alias.encode(), mtu)


def VSDVS_DvPortIDToPortID(alias: str, port: str) -> List[Any]:
    number = c_int()
    return [_port_id(alias.encode(), port.encode(), byref(number)), number.value]


def VSQEX_GetVSInfo(alias: str, record: Any) -> Any:
    return _get_info(alias.encode(), byref(record))


def VSQEX_GetUplinks(alias: str) -> Tuple[Any, Any]:
    uplinks = _UPLINKS()
    return declared.VSQEX_GetUplinks(alias.encode(), byref(uplinks)), uplinks.contents
