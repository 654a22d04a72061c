"""How the simulated host is brought to each status that the calls of the kernel's state list."""

from typing import Any, Callable, Dict, Tuple

import libvswitch as vs
from asking import ID, KEY, PORT, UNKNOWN, Act, fill, uplink_number

LONG = "x" * 300
# Where an image says its format, after the four bytes by which it is known.
FORMAT_AT = 4
READ_ONLY = "com.quorix.common.port.volatile.status"
PORTSET = "com.quorix.common.host.portset"


def identifier(alias: str) -> str:
    return str(vs.DVS_SwitchId(vs.DVSState_SwitchFindByAlias(alias)))


def image(get: Callable[..., int]) -> bytes:
    data, length = vs.Cell("void *"), vs.Cell("int")
    assert get(data.pointer, length.pointer) == vs.QEX_OK
    with vs.owned(data):
        return bytes(data.read(length.value))


def put(call: Callable[..., int], state: bytes) -> int:
    return int(call(vs.Cell("unsigned char", state).pointer, len(state)))


def flipped(state: bytes, at: int) -> bytes:
    at %= len(state)
    return state[:at] + bytes([state[at] ^ 0xFF]) + state[at + 1 :]


def prop(call: Callable[..., int], *names: Any, data: bytes = b"x") -> int:
    held = vs.Cell("unsigned char", data)
    return int(call(*names, held.pointer, len(data), vs.CONFIG_PROP_TYPE))


def uplink_prop(port: int, key: str, data: bytes = b"x") -> int:
    held = vs.Cell("unsigned char", data)
    call = vs.DVSQEX_UplinkDataSet
    return int(call(ID, key, port, held.pointer, len(data), vs.CONFIG_PROP_TYPE))


def cells() -> Tuple[Any, Any]:
    return vs.Cell("void *").pointer, vs.Cell("int").pointer


def item() -> Any:
    return vs.Cell("DVSDataItem").pointer


def update(kind: int) -> int:
    held = vs.Cell("DVSDataHandle")
    assert vs.DVSData_Alloc(held.pointer, None, None) == vs.QEX_OK
    with vs.owned(held):
        return int(vs.DVSData_Update(held.value, "name", None, 0, kind))


def whole() -> bytes:
    return image(vs.DVSQEX_StateGet)


def persistent() -> bytes:
    return image(vs.DVSQEX_PersistentStateGet)


def port_state() -> bytes:
    return image(lambda *into: vs.DVSQEX_PortStateGet(ID, PORT, *into))


SPOILT: Dict[str, Callable[[bytes], bytes]] = {
    "QEX_INVALID_METADATA": lambda state: state[:4],
    "QEX_CHECKSUM_MISMATCH": lambda state: flipped(state, -1),
    "QEX_VERSION_MISMATCH_MAJOR": lambda state: flipped(state, FORMAT_AT),
    "QEX_BAD_PARAM": lambda state: port_state(),
}


def spoiling(
    read: Callable[..., int], state: Callable[[], bytes], spoil: Callable[[bytes], bytes]
) -> Act:
    return lambda host: put(read, spoil(state()))


PROVOKED: Dict[str, Dict[str, Act]] = {
    "DVSData_Update": {"QEX_BAD_PARAM": lambda host: update(3)},
    "DVSState_ConfigDeserialize": {
        status: spoiling(vs.DVSState_ConfigDeserialize, persistent, spoil)
        for status, spoil in SPOILT.items()
    },
    "DVSQEX_StateInit": {
        status: spoiling(vs.DVSQEX_StateInit, whole, spoil) for status, spoil in SPOILT.items()
    },
    "DVSState_GlobalPropLookup": {
        "QEX_NOT_FOUND": lambda host: vs.DVSState_GlobalPropLookup(ID, KEY, item())
    },
    "DVSState_HostPropLookup": {
        "QEX_NOT_FOUND": lambda host: vs.DVSState_HostPropLookup(ID, KEY, item())
    },
    "DVSQEX_SwitchAdd": {"QEX_EXISTS": lambda host: vs.DVSQEX_SwitchAdd(ID, "new", 8, 0)},
    "DVSQEX_SwitchSetMaxPorts": {
        "QEX_LIMIT_EXCEEDED": lambda host: vs.DVSQEX_SwitchSetMaxPorts(ID, 1)
    },
    "DVSQEX_CmdExec": {
        "QEX_NOT_SUPPORTED": lambda host: vs.DVSQEX_CmdExec(ID, "do", None, 0, *cells())
    },
    "DVSQEX_GlobalPropGet": {
        "QEX_NOT_FOUND": lambda host: vs.DVSQEX_GlobalPropGet(ID, KEY, *cells())
    },
    "DVSQEX_GlobalPropClear": {"QEX_NOT_FOUND": lambda host: vs.DVSQEX_GlobalPropClear(ID, KEY)},
    "DVSQEX_HostPropGet": {"QEX_NOT_FOUND": lambda host: vs.DVSQEX_HostPropGet(ID, KEY, *cells())},
    "DVSQEX_HostPropClear": {"QEX_NOT_FOUND": lambda host: vs.DVSQEX_HostPropClear(ID, KEY)},
    "DVSQEX_PortDataGet": {
        "QEX_NOT_FOUND": lambda host: vs.DVSQEX_PortDataGet(ID, PORT, KEY, *cells())
    },
    "DVSQEX_PortDataClear": {"QEX_NOT_FOUND": lambda host: vs.DVSQEX_PortDataClear(ID, PORT, KEY)},
    "DVSQEX_UplinkDataGet": {
        "QEX_NOT_FOUND": lambda host: vs.DVSQEX_UplinkDataGet(ID, KEY, uplink_number(), *cells())
    },
    "DVSQEX_GlobalPropSet": {
        "QEX_BAD_PARAM": lambda host: prop(vs.DVSQEX_GlobalPropSet, ID, vs.VSPROP_MTU),
        "QEX_NAME_TOO_LONG": lambda host: prop(vs.DVSQEX_GlobalPropSet, ID, LONG),
    },
    "DVSQEX_HostPropSet": {
        "QEX_BAD_PARAM": lambda host: prop(vs.DVSQEX_HostPropSet, ID, vs.VSPROP_PORT_VLAN),
        "QEX_READ_ONLY": lambda host: prop(vs.DVSQEX_HostPropSet, ID, PORTSET),
        "QEX_NAME_TOO_LONG": lambda host: prop(vs.DVSQEX_HostPropSet, ID, LONG),
    },
    "DVSQEX_PortDataSet": {
        "QEX_BAD_PARAM": lambda host: prop(vs.DVSQEX_PortDataSet, ID, PORT, vs.VSPROP_MTU),
        "QEX_READ_ONLY": lambda host: prop(vs.DVSQEX_PortDataSet, ID, PORT, READ_ONLY),
        "QEX_NAME_TOO_LONG": lambda host: prop(vs.DVSQEX_PortDataSet, ID, PORT, LONG),
    },
    "DVSQEX_UplinkDataSet": {
        "QEX_NOT_FOUND": lambda host: uplink_prop(UNKNOWN, KEY),
        "QEX_BAD_PARAM": lambda host: uplink_prop(uplink_number(), vs.VSPROP_MTU),
        "QEX_READ_ONLY": lambda host: uplink_prop(uplink_number(), READ_ONLY),
        "QEX_NAME_TOO_LONG": lambda host: uplink_prop(uplink_number(), LONG),
    },
    "DVSQEX_PortAdd": {
        "QEX_LIMIT_EXCEEDED": lambda host: fill(
            host, lambda s: vs.DVSQEX_PortAdd(identifier(s), "p", None, 0)
        ),
        "QEX_EXISTS": lambda host: vs.DVSQEX_PortAdd(ID, PORT, None, 0),
        "QEX_NAME_TOO_LONG": lambda host: vs.DVSQEX_PortAdd(ID, "x" * 48, None, 0),
    },
    "DVSQEX_PortFind": {"QEX_NOT_FOUND": lambda host: vs.DVSQEX_PortFind(ID, "none")},
}
