"""Functions like the measured module's: compiled, or in Python where a text must be converted."""

from typing import Any, List, Optional, Tuple

from cffi_peer import ffi, lib  # type: ignore[import]  # a compiled module

_new, _string = ffi.new, ffi.string
# A type that is parsed beforehand spares each allocation a look-up of its text.
_NAME = ffi.typeof("qex_Name *")
_INT, _UPLINKS = ffi.typeof("int *"), ffi.typeof("VSUplinks **")
new_VSInfo, delete_VSInfo = lib.new_VSInfo, lib.delete_VSInfo
VSInfo_mtu_get, VSInfo_mtu_set = lib.VSInfo_mtu_get, lib.VSInfo_mtu_set
VSUplinks___len__ = lib.VSUplinks___len__
_set_mtu, _port_id, _get_info = lib.VSDVS_SetMTU, lib.VSDVS_DvPortIDToPortID, lib.VSQEX_GetVSInfo


def new_qex_Name() -> Any:
    return _new(_NAME)


def qex_Name_string_get(record: Any) -> Any:
    return _string(record.string).decode()


def qex_Name_string_set(record: Any, text: str) -> None:
    record.string = text.encode()


def VSUplinks___getitem__(record: Any, index: int) -> Optional[str]:
    if not 0 <= index < record.numEntries:
        return None
    text: str = _string(record.entries[index].name.string).decode()
    return text


def VSDVS_SetMTU(alias: str, mtu: int) -> Any:
    return _set_mtu(alias.encode(), mtu)


def VSDVS_DvPortIDToPortID(alias: str, port: str) -> List[Any]:
    number = _new(_INT)
    return [_port_id(alias.encode(), port.encode(), number), number[0]]


def VSQEX_GetVSInfo(alias: str, record: Any) -> Any:
    return _get_info(alias.encode(), record)


def VSQEX_GetUplinks(alias: str) -> Tuple[Any, Any]:
    uplinks = _new(_UPLINKS)
    return lib.VSQEX_GetUplinks(alias.encode(), uplinks), uplinks[0]
