"""How the simulated host is brought to each status that the configuring calls list."""

from typing import Any, Callable, Dict, List, Tuple

import libvswitch as vs
from asking import PORT, SWITCH, Act, create, fill, made, mirror
from libvswitch.enums import Multicast
from simhost import Host


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


def twice(act: Callable[[], int]) -> int:
    assert act() == vs.QEX_OK
    return act()


def busy_uplink(host: Host) -> int:
    assert create("new") == vs.QEX_OK
    return int(vs.VSDVS_AddSwitchUplinkPort("new", "nic4"))


def no_uplink_port_left(host: Host) -> int:
    uplinks = [f"u{n}" for n in range(33)]
    switch = {"alias": "full", "uplinks": uplinks[:32]}
    host.apply({"uplinks": [{"name": name} for name in uplinks], "switches": [switch]})
    return int(vs.VSDVS_AddSwitchUplinkPort("full", uplinks[32]))


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
        "QEX_BAD_PARAM": lambda host: vs.VSDVS_SetMcastFilterMode(SWITCH, Multicast(4))
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
}
