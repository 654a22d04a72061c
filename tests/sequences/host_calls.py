"""The module's calls as the machine makes them: values in, values out, memory released."""

import ctypes
from typing import Any, Callable, Dict, List, NamedTuple, Tuple

import _libvswitch as vs
import peer


class Cell:
    """A place that a call fills through a pointer."""

    def __init__(self, kind: Any, spelling: str) -> None:
        self._held = kind()
        self.pointer = peer.pointer_object(ctypes.addressof(self._held), spelling)

    @property
    def value(self) -> int:
        return int(self._held.value or 0)


class Allocated(NamedTuple):
    """A block of the host's memory."""

    address: int
    data: bytes


Result = Tuple[int, Any]
"""The status, and what the call returns with QEX_OK."""


def buffer(data: bytes) -> Tuple[Any, int]:
    """A pointer to bytes, and how many there are; they live as long as the pointer's caller."""
    _kept.append(ctypes.create_string_buffer(data, max(1, len(data))))
    del _kept[:-8]
    return peer.pointer_object(ctypes.addressof(_kept[-1]), "void *"), len(data)


_kept: List[Any] = []


def block_of(call: Callable[..., int], *arguments: Any) -> Result:
    """A call that allocates bytes through `void **` and `int *`."""
    place, length = Cell(ctypes.c_void_p, "void **"), Cell(ctypes.c_int, "int *")
    status = call(*arguments, place.pointer, length.pointer)
    if status != vs.QEX_OK:
        return status, None
    data = ctypes.string_at(place.value, length.value) if place.value else b""
    return status, Allocated(place.value, data)


def release(address: int, deallocator: str = "DVSQEX_DataFree") -> None:
    getattr(vs, deallocator)(peer.pointer_object(address, "void *") if address else None)


DEALLOCATORS = ["VSDVS_FreeMemory", "VSQEX_FreeMemory", "DVSQEX_DataFree"]


def get_mtu(alias: str) -> Result:
    cell = Cell(ctypes.c_uint32, "qex_uint32 *")
    return vs.VSDVS_GetMTU(alias, cell.pointer), cell.value


def get_pair(name: str) -> Callable[..., Result]:
    """A call that returns its status and one value."""

    def get(*names: str) -> Result:
        status, value = getattr(vs, name)(*names)
        return status, ord(value) if isinstance(value, str) else value

    return get


def get_security(alias: str, port: str) -> Result:
    record = vs.new_VSPropSecurity()
    try:
        status = vs.VSDVS_GetPortSecurity(alias, port, record)
        return status, vs.VSPropSecurity_flags_get(record)
    finally:
        vs.delete_VSPropSecurity(record)


def set_security(alias: str, port: str, flags: int) -> int:
    record = vs.new_VSPropSecurity()
    try:
        vs.VSPropSecurity_flags_set(record, flags)
        return int(vs.VSDVS_SetPortSecurity(alias, port, record))
    finally:
        vs.delete_VSPropSecurity(record)


def uplinks_of(alias: str) -> Result:
    """The names of a switch's uplinks."""
    status, uplinks = vs.VSQEX_GetUplinks(alias)
    if status != vs.QEX_OK:
        return status, None
    count = vs.VSUplinks___len__(uplinks)
    names = [vs.VSUplinks___getitem__(uplinks, index) for index in range(count)]
    vs.VSQEX_FreeMemory(uplinks)
    return status, names


def _table(status: int, table: Any) -> Result:
    """The addresses of a MAC table: MAC, VLAN, type, age in seconds."""
    if status != vs.QEX_OK:
        return status, None
    found = []
    for index in range(vs.VSMACTable_numEntries_get(table)):
        entry = vs.VSMACEntry___getitem__(vs.VSMACTable_macEntries_get(table), index)
        mac = bytes.fromhex(vs.VSMACEntry_macAddress_get(entry).replace(":", ""))
        vlan, kind = vs.VSMACEntry_vid_get(entry), vs.VSMACEntry_macAddrType_get(entry)
        found.append((mac, vlan, kind, vs.VSMACEntry_elapsed_get(entry)))
        vs.delete_VSMACEntry(entry)
    vs.VSQEX_FreeMemory(table)
    return status, found


def team_table(alias: str, kind: int) -> Result:
    return _table(*vs.VSQEX_GetTeamMACTable(alias, kind))


def port_table(alias: str, port: str, kind: int) -> Result:
    return _table(*vs.VSQEX_GetPortMACTable(alias, port, kind))


def with_entry(call: Callable[..., int]) -> Callable[..., int]:
    """A call on an address of a port's table."""

    def change(alias: str, port: str, mac: bytes, vlan: int, kind: int) -> int:
        entry = vs.new_VSMACEntry()
        try:
            vs.VSMACEntry_set_mac_address(entry, mac)
            vs.VSMACEntry_vid_set(entry, vlan)
            vs.VSMACEntry_macAddrType_set(entry, kind)
            vs.VSMACEntry_aging_set(entry, 0)
            vs.VSMACEntry_vni_set(entry, 0)
            vs.VSMACEntry_elapsed_set(entry, 0)
            return call(alias, port, entry)
        finally:
            vs.delete_VSMACEntry(entry)

    return change


class TypedCall(NamedTuple):
    """The two calls of a setting, and how they are made."""

    setter: str
    set: Callable[..., int]
    getter: str
    get: Callable[..., Result]


def _typed(name: str, set_: Any = None, get: Any = None) -> TypedCall:
    setter, getter = f"VSDVS_Set{name}", f"VSDVS_Get{name}"
    return TypedCall(setter, set_ or getattr(vs, setter), getter, get or get_pair(getter))


TYPED_OF_SWITCH: Dict[str, TypedCall] = {
    "com.quorix.vswitch.mtu": _typed("MTU", get=get_mtu),
    "com.quorix.vswitch.multicastFilter": _typed("McastFilterMode"),
}
TYPED_OF_PORT: Dict[str, TypedCall] = {
    "com.quorix.vswitch.port.vlanNestedTag": _typed("PortNestedVLANTagging"),
    "com.quorix.vswitch.port.txUplink": _typed("TxUplinkAlways"),
    "com.quorix.vswitch.port.security": _typed("PortSecurity", set_security, get_security),
}
