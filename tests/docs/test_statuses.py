"""What the headers say of statuses, the simulated host answers.

A table provokes each status that the comment of a call names; a status without a provocation fails.
What the comments of whole headers say is tried on every call: names that nothing has, and nulls.
"""

from typing import Any, Callable, Dict, Iterator, List, Tuple

import comments
import libvswitch as vs
import pytest
from catalogue import Call, Catalogue
from conftest import BUILD, ROOT
from simhost import Host

SWITCH = "vswitch0"
ID = "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10"
PORT = "web-1"
KEY = "com.example.key"
CATALOGUE = Catalogue(ROOT, BUILD)


def made(record: Any, **fields: Any) -> Any:
    for name, value in fields.items():
        setattr(record, name, value)
    return record


def create(alias: Any = "new", *given: Any) -> int:
    rest: List[Any] = [None, None, 0, 1, 0, 0, 0]
    rest[: len(given)] = given
    return int(vs.VSDVS_CreateVSwitch(alias, *rest))


def number(port: str = PORT, switch: str = SWITCH) -> int:
    return int(vs.VSDVS_DvPortIDToPortID(switch, port)[1])


def hint(port: int) -> int:
    return int(vs.VSQEX_PortGetTeamUplinkHint(port, vs.qex_Name()))


def uplink_ports(*names: str) -> Any:
    ports, ids = vs.VSUplinkPorts(len(names)), vs.VSUplinkPortIds(len(names))
    for at, name in enumerate(names):
        ports[at] = ids[at] = name
    return ports, ids


def team(**fields: Any) -> Any:
    return made(vs.VSTeamPolicy(), loadBalance=3, **fields)


def unending_team() -> Any:
    policy = team(numActive=1)
    policy[0] = "x" * 81
    return policy


def vlan(*changes: Tuple[int, Any]) -> int:
    given: List[Any] = [10, -1, 0, 0, None, 0]
    for at, value in changes:
        given[at] = value
    return int(vs.VSDVS_SetPortVLANPolicy(SWITCH, PORT, *given))


def ranges(*pairs: Tuple[int, int]) -> Any:
    array = vs.new_vidrangeArray(len(pairs))
    for at, (low, high) in enumerate(pairs):
        vs.vidrangeArray_setitem(array, at, made(vs.qex_NEBPortVIDRange(), minVID=low, maxVID=high))
    return array


def private(*entries: Tuple[int, int, int]) -> int:
    array = vs.new_pvlanmapentryArray(len(entries))
    for at, (primary, secondary, kind) in enumerate(entries):
        entry = made(
            vs.VSPvlanMapEntry(), primaryVID=primary, secondaryVID=secondary, pvlanType=kind
        )
        vs.pvlanmapentryArray_setitem(array, at, entry)
    return int(vs.VSDVS_SetPrivateVLANMap(SWITCH, array, len(entries)))


def mirror(sids: List[str], **fields: Any) -> int:
    table = vs.alloc_dvmirror_session_table(len(sids), 0)
    made(table, **{"version": vs.VS_DVMIRROR_VERSION_V3, **fields})
    for at in range(len(sids)):
        table[at].sid = sids[at]
        table[at].type = vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    status = int(vs.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, table))
    vs.free_dvmirror_session_table(table)
    return status


def twice(act: Callable[[], int]) -> int:
    assert act() == vs.QEX_OK
    return act()


def address(text: bytes, kind: int = vs.VS_MAC_ADDR_TYPE_STATIC, vid: int = 0) -> Any:
    entry = made(vs.VSMACEntry(), macAddrType=kind, vid=vid)
    entry.set_mac_address(text)
    return entry


def options(kind: int, value: Any) -> Any:
    listed = vs.VSRuntimeOptions(256)
    first = listed.get_first_option()
    add = listed.add_int_option if isinstance(value, int) else listed.add_str_option
    behind = add(first, "", kind, value)
    assert behind is not None
    listed.set_options_length(int(behind) - int(first))
    return listed


def answered(call: Callable[..., Any], *arguments: Any) -> int:
    """The status of a call; what it hands out goes back."""
    result = call(*arguments)
    if not isinstance(result, tuple):
        return int(result)
    with vs.owned(result) as (status, *_):
        return int(status)


def fill(host: Host, act: Callable[[str], int]) -> int:
    host.apply({"switches": [{"alias": "full", "max_ports": 1}]})
    assert vs.VSDVS_AddDVPort("full", "one", 0) == vs.QEX_OK
    return act("full")


def busy_uplink(host: Host) -> int:
    assert create("new") == vs.QEX_OK
    return int(vs.VSDVS_AddSwitchUplinkPort("new", "nic4"))


def no_uplink_port_left(host: Host) -> int:
    uplinks = [f"u{n}" for n in range(33)]
    switch = {"alias": "full", "uplinks": uplinks[:32]}
    host.apply({"uplinks": [{"name": name} for name in uplinks], "switches": [switch]})
    return int(vs.VSDVS_AddSwitchUplinkPort("full", uplinks[32]))


def uncounted(host: Host) -> int:
    assert mirror(["audit"]) == vs.QEX_OK
    host.apply({"runtime_options": {"AllowMirrorStats": 0}})
    return int(vs.VSQEX_GetDVMirrorSessionStats(SWITCH, "audit", vs.VSDVMirrorSessionStats()))


def no_link(host: Host) -> int:
    host.link("nic4").down()
    host.link("nic5").down()
    return hint(number())


def no_team(host: Host) -> int:
    assert create("new") == vs.QEX_OK
    assert vs.VSDVS_AddDVPort("new", "p", 0) == vs.QEX_OK
    return hint(number("p", "new"))


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


def uplink_prop(key: str, data: bytes = b"x") -> int:
    held = vs.Cell("unsigned char", data)
    port = uplink_number()
    call = vs.DVSQEX_UplinkDataSet
    return int(call(ID, key, port, held.pointer, len(data), vs.CONFIG_PROP_TYPE))


def uplink_number() -> int:
    with vs.owned(vs.VSQEX_GetUplinks(SWITCH)) as (_, uplinks):
        return int(uplinks.entries[0].portID)


def cells() -> Tuple[Any, Any]:
    return vs.Cell("void *").pointer, vs.Cell("int").pointer


def group(mode: int) -> int:
    address = bytes([239, 9, 9, 9])
    return answered(vs.VSQEX_GetMcastFilterStats, SWITCH, number(), mode, address)


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
) -> "Act":
    return lambda host: put(read, spoil(state()))


LONG = "x" * 300
# Where an image says its format, behind the four bytes by which it is known.
FORMAT_AT = 4
READ_ONLY = "com.quorix.common.port.volatile.status"
PORTSET = "com.quorix.common.host.portset"

Act = Callable[[Host], int]
PROVOKED: Dict[str, Dict[str, Act]] = {
    "VSDVS_CreateVSwitch": {
        "QEX_EXISTS": lambda host: create(SWITCH),
        "QEX_NAME_TOO_LONG": lambda host: create("x" * 128),
        "QEX_BAD_PARAM": lambda host: create("new", None, None, 65536),
        "QEX_NO_RESOURCES": lambda host: create("new", None, None, 0, 1, 0, 0, 5),
    },
    "VSDVS_AddDVPort": {
        "QEX_LIMIT_EXCEEDED": lambda host: fill(host, lambda s: vs.VSDVS_AddDVPort(s, "p", 0)),
        "QEX_EXISTS": lambda host: vs.VSDVS_AddDVPort(SWITCH, PORT, 0),
        "QEX_NAME_TOO_LONG": lambda host: vs.VSDVS_AddDVPort(SWITCH, "x" * 48, 0),
    },
    "VSDVS_AddOpaqueDVPort": {
        "QEX_LIMIT_EXCEEDED": lambda host: fill(
            host, lambda s: vs.VSDVS_AddOpaqueDVPort(s, "p", "e")
        ),
        "QEX_EXISTS": lambda host: vs.VSDVS_AddOpaqueDVPort(SWITCH, PORT, "e"),
        "QEX_NAME_TOO_LONG": lambda host: vs.VSDVS_AddOpaqueDVPort(SWITCH, "p", "x" * 48),
    },
    "VSDVS_RemoveDVPort": {"QEX_BUSY": lambda host: vs.VSDVS_RemoveDVPort(SWITCH, "uplink1")},
    "VSDVS_SetSwitchUplinkPorts": {
        "QEX_EXISTS": lambda host: vs.VSDVS_SetSwitchUplinkPorts(SWITCH, *uplink_ports("a", "a")),
        "QEX_LIMIT_EXCEEDED": lambda host: vs.VSDVS_SetSwitchUplinkPorts(
            SWITCH, *uplink_ports(*(f"u{n}" for n in range(33)))
        ),
    },
    "VSDVS_AddSwitchUplinkPort": {
        "QEX_EXISTS": lambda host: vs.VSDVS_AddSwitchUplinkPort(SWITCH, "nic4"),
        "QEX_BUSY": busy_uplink,
        "QEX_LIMIT_EXCEEDED": no_uplink_port_left,
    },
    "VSDVS_SetMTU": {"QEX_BAD_PARAM": lambda host: vs.VSDVS_SetMTU(SWITCH, 1279)},
    "VSDVS_SetTeamingPolicy": {
        "QEX_LIMIT_EXCEEDED": lambda host: vs.VSDVS_SetTeamingPolicy(SWITCH, team(numActive=33)),
        "QEX_NAME_TOO_LONG": lambda host: vs.VSDVS_SetTeamingPolicy(SWITCH, unending_team()),
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetTeamingPolicy(SWITCH, team(flags=1 << 31)),
    },
    "VSDVS_SetPortTeamingPolicy": {
        "QEX_LIMIT_EXCEEDED": lambda host: vs.VSDVS_SetPortTeamingPolicy(
            SWITCH, PORT, team(numStandby=33)
        ),
        "QEX_NAME_TOO_LONG": lambda host: vs.VSDVS_SetPortTeamingPolicy(
            SWITCH, PORT, unending_team()
        ),
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetPortTeamingPolicy(
            SWITCH, PORT, made(team(), loadBalance=99)
        ),
    },
    "VSDVS_SetPortTeamingOverride": {
        "QEX_NAME_TOO_LONG": lambda host: vs.VSDVS_SetPortTeamingOverride(SWITCH, PORT, "x" * 82)
    },
    "VSDVS_SetMACLearning": {
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetMACLearning(
            SWITCH, made(vs.VSMACLearning(), agingTime=1000001)
        )
    },
    "VSDVS_SetPortMACLearning": {
        "QEX_LIMIT_EXCEEDED": lambda host: vs.VSDVS_SetPortMACLearning(
            SWITCH, PORT, made(vs.VSPMACLearning(), macLimit=4097)
        ),
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetPortMACLearning(
            SWITCH, PORT, made(vs.VSPMACLearning(), macLimitPolicy=9)
        ),
    },
    "VSDVS_SetPortSecurity": {
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetPortSecurity(
            SWITCH, PORT, made(vs.VSPropSecurity(), flags=8)
        )
    },
    "VSDVS_SetExtraEthFilter": {
        "QEX_LIMIT_EXCEEDED": lambda host: vs.VSDVS_SetExtraEthFilter(
            SWITCH, PORT, made(vs.VSExtraEthFilter(), numMulticastAddrs=33)
        ),
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetExtraEthFilter(
            SWITCH, PORT, made(vs.VSExtraEthFilter(), flags=1 << 30)
        ),
    },
    "VSDVS_SetMcastFilterMode": {
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetMcastFilterMode(SWITCH, 4)
    },
    "VSDVS_SetPortVLANPolicy": {
        "QEX_BAD_VLANID": lambda host: vlan((0, 4095)),
        "QEX_BAD_PARAM": lambda host: vlan((4, ranges((5, 9), (9, 12))), (5, 2)),
    },
    "VSDVS_SetPrivateVLANMap": {
        "QEX_BAD_VLANID": lambda host: private((0, 5, 2)),
        "QEX_BAD_PARAM": lambda host: private((10, 11, 2), (10, 12, 2)),
    },
    "VSDVS_AppendDVMirrorSessions": {
        "QEX_EXISTS": lambda host: twice(lambda: mirror(["audit"])),
        "QEX_VERSION_MISMATCH_MAJOR": lambda host: mirror(["audit"], version=4),
        "QEX_BAD_PARAM": lambda host: mirror(["audit"], magicNum=1),
        "QEX_LIMIT_EXCEEDED": lambda host: mirror([f"s{n}" for n in range(1025)]),
    },
    "VSDVS_RemoveDVMirrorSession": {
        "QEX_NOT_FOUND": lambda host: vs.VSDVS_RemoveDVMirrorSession(SWITCH, PORT, "audit")
    },
    "VSQEX_GetTeamMACTable": {
        "QEX_BAD_PARAM": lambda host: answered(vs.VSQEX_GetTeamMACTable, SWITCH, 9)
    },
    "VSQEX_GetPortMACTable": {
        "QEX_BAD_PARAM": lambda host: answered(vs.VSQEX_GetPortMACTable, SWITCH, PORT, 9)
    },
    "VSQEX_SetPortMACTable": {
        "QEX_BAD_PARAM": lambda host: vs.VSQEX_SetPortMACTable(
            SWITCH, PORT, address(b"\2\0\0\0\0\1", vs.VS_MAC_ADDR_TYPE_LEARNED)
        ),
        "QEX_INVALID_ADDRESS": lambda host: vs.VSQEX_SetPortMACTable(
            SWITCH, PORT, address(b"\1\0\0\0\0\1")
        ),
        "QEX_BAD_VLANID": lambda host: vs.VSQEX_SetPortMACTable(
            SWITCH, PORT, address(b"\2\0\0\0\0\1", vid=4095)
        ),
        "QEX_EXISTS": lambda host: vs.VSQEX_SetPortMACTable(
            SWITCH, "web-2", address(b"\2\0\0\0\1\1")
        ),
    },
    "VSQEX_ClearPortMACTable": {
        "QEX_NOT_FOUND": lambda host: vs.VSQEX_ClearPortMACTable(
            SWITCH, PORT, address(b"\2\0\0\0\1\1", vs.VS_MAC_ADDR_TYPE_USER)
        )
    },
    "VSQEX_SetUplinkAdminLinkState": {
        "QEX_BAD_PARAM": lambda host: vs.VSQEX_SetUplinkAdminLinkState(SWITCH, "nic4", 2)
    },
    "VSQEX_GetUplinkDVPortID": {
        "QEX_IS_DISCONNECTED": lambda host: answered(vs.VSQEX_GetUplinkDVPortID, "nic0")
    },
    "VSQEX_GetMcastFilters": {
        "QEX_BAD_PARAM": lambda host: answered(
            vs.VSQEX_GetMcastFilters, SWITCH, number(), vs.VS_MCAST_FILTER_MODE_SNOOPING
        )
    },
    "VSQEX_GetMcastFilterStats": {
        "QEX_NOT_FOUND": lambda host: group(vs.VS_MCAST_FILTER_MODE_IGMP),
        "QEX_BAD_PARAM": lambda host: group(vs.VS_MCAST_FILTER_MODE_SNOOPING),
    },
    "VSQEX_GetDVMirrorSessionStats": {"QEX_IS_DISABLED": uncounted},
    "VSQEX_GetRuntimeOptions": {
        "QEX_NOT_SUPPORTED": lambda host: answered(
            vs.VSQEX_GetRuntimeOptions, vs.Cell("qex_uint16", [99]).pointer, 1
        )
    },
    "VSQEX_SetRuntimeOptions": {
        "QEX_BAD_PARAM": lambda host: vs.VSQEX_SetRuntimeOptions(
            options(vs.VS_RT_OPT_IGMP_VERSION, 9)
        ),
        "QEX_INVALID_ADDRESS": lambda host: vs.VSQEX_SetRuntimeOptions(
            options(vs.VS_RT_OPT_IGMP_ROUTER_IP, "nowhere")
        ),
        "QEX_NOT_SUPPORTED": lambda host: vs.VSQEX_SetRuntimeOptions(options(99, 1)),
    },
    "VSQEX_SetGlobalMACLearningProps": {
        "QEX_BAD_PARAM": lambda host: vs.VSQEX_SetGlobalMACLearningProps(
            made(vs.VSMACLearningGlobalProps(), agingTime=0)
        )
    },
    "VSQEX_PortGetTeamUplinkHint": {
        "QEX_ENETDOWN": no_link,
        "QEX_ENETUNREACH": no_team,
        "QEX_NOT_SUPPORTED": lambda host: hint(uplink_number()),
        "QEX_NOT_FOUND": lambda host: hint(4711),
    },
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
        "QEX_BAD_PARAM": lambda host: uplink_prop(vs.VSPROP_MTU),
        "QEX_READ_ONLY": lambda host: uplink_prop(READ_ONLY),
        "QEX_NAME_TOO_LONG": lambda host: uplink_prop(LONG),
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


def named(call: Call) -> List[str]:
    """The statuses that a call's own comment names, beside success."""
    found = set()
    for text in [call.comment.text, *call.comment.parameters.values()]:
        found |= set(comments.statuses_in(text)) & CATALOGUE.statuses
    return sorted(found - {"QEX_OK"})


def calls_with_statuses() -> Iterator[Call]:
    for call in CATALOGUE.calls.values():
        if call.prototype.startswith("QEX_ReturnStatus "):
            yield call


@pytest.mark.parametrize(
    "call, status", [(one.name, status) for one in calls_with_statuses() for status in named(one)]
)
def test_what_a_comment_names(host: Host, call: str, status: str) -> None:
    assert PROVOKED[call][status](host) == getattr(vs, status)


def test_nothing_is_provoked_that_no_comment_names() -> None:
    told = {one.name: named(one) for one in calls_with_statuses() if named(one)}
    assert {call: sorted(acts) for call, acts in PROVOKED.items()} == told


def arguments(call: Call) -> Dict[str, Any]:
    """Arguments with which a call reaches what it is asked for."""
    found: Dict[str, Any] = {}
    cell: Any = vs.Cell
    texts = {"switchName": SWITCH, "switchId": ID, "port": PORT, "uplink": "nic4", "key": KEY}
    numbers = {"type": 1, "propertyType": vs.CONFIG_PROP_TYPE, "propertyTypes": vs.ALL_PROP_TYPE}
    for one in call.arguments:
        plain = one.types[0].replace(" or None", "")
        if plain == "DVMirrorSessionTable":
            found[one.name] = made(vs.alloc_dvmirror_session_table(0, 0), version=3)
        elif plain in CATALOGUE.known.records:
            sized = CATALOGUE.known.records[plain].constructor
            found[one.name] = getattr(vs, plain)(*([8] if sized else []))
        elif plain.startswith("Cell"):
            found[one.name] = cell(plain.split('"')[1]).pointer
        elif plain == "str":
            found[one.name] = texts.get(one.name, "name")
        elif plain == "int" and one.name == "port":
            found[one.name] = number()
        elif plain in ("int", "int or str"):
            found[one.name] = numbers.get(one.name, 0)
        elif plain == "bytes":
            found[one.name] = bytes(16)
        else:
            found[one.name] = None
    return found


# These make what they name, or ask whether it is there.
NEW = {"VSDVS_CreateVSwitch", "DVSQEX_SwitchAdd"}
NAMES = ("switchName", "switchId", "alias", "portsetName")
TAKING_A_SWITCH = [
    (call.name, argument.name)
    for call in calls_with_statuses()
    for argument in call.arguments
    if argument.name in NAMES and call.name not in NEW and argument.c_type == "char *"
]


@pytest.mark.parametrize("call, name", TAKING_A_SWITCH)
@pytest.mark.parametrize("given, status", [("nowhere", "QEX_NOT_FOUND"), (None, "QEX_BAD_PARAM")])
def test_what_holds_for_all(host: Host, call: str, name: str, given: Any, status: str) -> None:
    described = CATALOGUE.calls[call]
    told = comments.statuses_in(CATALOGUE.headers[described.header].text.text)
    assert status in [*told, *named(described)]
    passed = {**arguments(described), name: given}
    values = list(passed.values())[: len(described.forms[0])]
    assert answered(getattr(vs, call), *values) == getattr(vs, status)
