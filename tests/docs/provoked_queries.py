"""How the simulated host is brought to each status that the asking calls list."""

from typing import Any, Dict

import libvswitch as vs
from asking import (
    PORT,
    SWITCH,
    UNKNOWN,
    Act,
    status_of,
    create,
    made,
    mirror,
    number,
    uplink_number,
)
from libvswitch.enums import LinkState
from simhost import Host


def hint(port: int) -> int:
    return int(vs.VSQEX_PortGetTeamUplinkHint(port, vs.qex_Name()))


def address(text: bytes, kind: int = vs.VS_MAC_ADDR_TYPE_STATIC, vid: int = 0) -> Any:
    entry = made(vs.VSMACEntry(), macAddrType=kind, vid=vid)
    entry.set_mac_address(text)
    return entry


def options(kind: int, value: Any) -> Any:
    listed = vs.VSRuntimeOptions(256)
    first = listed.get_first_option()
    if isinstance(value, int):
        following = listed.add_int_option(first, "", kind, value)
    else:
        following = listed.add_str_option(first, "", kind, value)
    assert following is not None
    listed.set_options_length(int(following) - int(first))
    return listed


def group(mode: int) -> int:
    address = bytes([239, 9, 9, 9])
    return status_of(vs.VSQEX_GetMcastFilterStats, SWITCH, number(), mode, address)


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


PROVOKED: Dict[str, Dict[str, Act]] = {
    "VSQEX_GetTeamMACTable": {
        "QEX_BAD_PARAM": lambda host: status_of(vs.VSQEX_GetTeamMACTable, SWITCH, 9)
    },
    "VSQEX_GetPortMACTable": {
        "QEX_BAD_PARAM": lambda host: status_of(vs.VSQEX_GetPortMACTable, SWITCH, PORT, 9)
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
        "QEX_BAD_PARAM": lambda host: vs.VSQEX_SetUplinkAdminLinkState(SWITCH, "nic4", LinkState(2))
    },
    "VSQEX_GetUplinkDVPortID": {
        "QEX_IS_DISCONNECTED": lambda host: status_of(vs.VSQEX_GetUplinkDVPortID, "nic0")
    },
    "VSQEX_GetMcastFilters": {
        "QEX_NOT_FOUND": lambda host: status_of(
            vs.VSQEX_GetMcastFilters, SWITCH, UNKNOWN, vs.VS_MCAST_FILTER_MODE_IGMP
        ),
        "QEX_BAD_PARAM": lambda host: status_of(
            vs.VSQEX_GetMcastFilters, SWITCH, number(), vs.VS_MCAST_FILTER_MODE_SNOOPING
        ),
    },
    "VSQEX_GetMcastFilterStats": {
        "QEX_NOT_FOUND": lambda host: group(vs.VS_MCAST_FILTER_MODE_IGMP),
        "QEX_BAD_PARAM": lambda host: group(vs.VS_MCAST_FILTER_MODE_SNOOPING),
    },
    "VSQEX_GetDVMirrorSessionStats": {"QEX_IS_DISABLED": uncounted},
    "VSQEX_GetRuntimeOptions": {
        "QEX_NOT_SUPPORTED": lambda host: status_of(
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
        "QEX_NOT_FOUND": lambda host: hint(UNKNOWN),
    },
}
