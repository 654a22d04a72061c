#!/usr/bin/env python3
"""A tour through a whole simulated host: ports, policies, links, mirrors, tables, and a restart.

Works with the classes of libvswitch on a host of its own, in a state file that goes with the
program. What comes to a host from outside, simhostctl does: pulling a cable, a frame, a restart.
"""

import os
import subprocess
import tempfile
from typing import Callable, Dict

import libvswitch as vs

SWITCH = "tour"
PORTS = {"web-1": 100, "web-2": 101}


def heading(text: str) -> None:
    print(f"\n{text}\n{'-' * len(text)}")


def must(status: int) -> None:
    """Ends the tour with the library's own words for a status that is no success."""
    if status != vs.QEX_OK:
        raise SystemExit(f"unexpected: {vs.QEX_ReturnStatusToString(status)}")


def outside(*arguments: str) -> None:
    print(f"$ simhostctl {' '.join(arguments)}")
    subprocess.run(["simhostctl", *arguments], check=True)


def identifier() -> str:
    """The identifier of the switch: what the raw calls know it by."""
    switch = vs.DVSState_SwitchFindByAlias(SWITCH)
    return str(vs.DVS_SwitchId(switch))


def raw(key: str, port: str = "") -> bytes:
    """The bytes of a property, through the other door."""
    data, length = vs.Cell("void *"), vs.Cell("int")
    if port:
        status = vs.DVSQEX_PortDataGet(identifier(), port, key, data.pointer, length.pointer)
    else:
        status = vs.DVSQEX_GlobalPropGet(identifier(), key, data.pointer, length.pointer)
    must(status)
    with vs.owned(data):
        return data.read(length.value)


def build() -> None:
    heading("A switch with two uplinks and two ports")
    must(vs.VSDVS_CreateVSwitch(SWITCH, None, None, 64, 1, 0, 0, 2))
    for port, connection in PORTS.items():
        must(vs.VSDVS_AddDVPort(SWITCH, port, connection))
    with vs.owned(vs.VSQEX_GetUplinks(SWITCH)) as (status, uplinks):
        must(status)
        print(f"uplinks {', '.join(uplinks)}; ports {', '.join(PORTS)}")


def team() -> None:
    """One uplink carries the traffic, the other stands by."""
    policy = vs.VSTeamPolicy()
    policy.loadBalance = vs.TEAM_FRP_TYPE_FO_EXPLICIT
    policy.linkCriteria = vs.TEAM_FRP_CRIT_LINK_STATE
    policy.numActive = policy.numStandby = 1
    policy[0], policy[1] = "uplink1", "uplink2"
    must(vs.VSDVS_SetTeamingPolicy(SWITCH, policy))


def set_policies() -> None:
    heading("Policies, set by call and read back as bytes")
    team()
    must(vs.VSDVS_SetMTU(SWITCH, 9000))
    learning = vs.VSMACLearning()
    learning.agingTime, learning.macLimit = 300, 1024
    must(vs.VSDVS_SetMACLearning(SWITCH, learning))
    security = vs.VSPropSecurity()
    security.flags = vs.VSPORT_SECURITY_DISALLOW_FORGED_SRC
    must(vs.VSDVS_SetPortSecurity(SWITCH, "web-1", security))
    must(vs.VSDVS_SetPortVLANPolicy(SWITCH, "web-1", 10, -1, 0, 0, None, 0))
    must(vs.VSDVS_SetPortNestedVLANTagging(SWITCH, "web-2", 1))

    shown: Dict[str, Callable[[], bytes]] = {
        vs.VSPROP_MTU: lambda: raw(vs.VSPROP_MTU),
        vs.VSPROP_SWITCH_MAC_LEARNING: lambda: raw(vs.VSPROP_SWITCH_MAC_LEARNING),
        vs.VSPROP_PORT_SECURITY: lambda: raw(vs.VSPROP_PORT_SECURITY, "web-1"),
        vs.VSPROP_PORT_VLAN: lambda: raw(vs.VSPROP_PORT_VLAN, "web-1"),
        vs.VSPROP_PORT_VLAN_NESTEDTAG: lambda: raw(vs.VSPROP_PORT_VLAN_NESTEDTAG, "web-2"),
    }
    for key, read in shown.items():
        print(f"{key:<42} {read().hex(' ')}")


def hint(port: str) -> str:
    """The uplink over which a port sends now."""
    status, number = vs.VSDVS_DvPortIDToPortID(SWITCH, port)
    must(status)
    name = vs.qex_Name()
    must(vs.VSQEX_PortGetTeamUplinkHint(number, name))
    return str(name)


def fail_a_link() -> None:
    heading("A link fails, and the team moves")
    active = hint("web-1")
    print(f"web-1 sends over {active}")
    outside("link", active, "down")
    print(f"web-1 sends over {hint('web-1')}")
    outside("link", active, "up")
    print(f"web-1 sends over {hint('web-1')}")


def mirror_a_port() -> None:
    heading("What web-1 receives is mirrored to web-2")
    table = vs.alloc_dvmirror_session_table(1, 2)
    table.version = vs.VS_DVMIRROR_VERSION_V3
    session = table[0]
    session.sid, session.dname = "audit", "audit of web-1"
    session.type = vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    session.numDstEntities = session.numSrcInEntities = 1
    entity = table.get_first_session_entity(0)
    for port in ("web-2", "web-1"):
        entity.type = vs.MIRROR_ENTTYPE_DVPORT
        entity.set_entity(port)
        entity = entity.next()
    must(vs.VSDVS_AppendDVMirrorSessions(SWITCH, "web-1", table))
    vs.free_dvmirror_session_table(table)

    with vs.owned(vs.VSDVS_GetDVMirrorSessions(SWITCH, "web-1")) as (status, found):
        must(status)
        print(", ".join(f"{session.sid}: {session.dname}" for session in found))


def page_through_addresses() -> None:
    heading("Addresses that a port learned")
    management = vs.VSPMACLearning()
    management.learning, management.macLimit = True, 16
    must(vs.VSDVS_SetPortMACLearning(SWITCH, "web-2", management))
    for last in (1, 2, 3):
        outside("learn", SWITCH, f"02:00:00:00:00:{last:02x}", "--port", "web-2")
    with vs.owned(vs.VSQEX_GetPortMACTable(SWITCH, "web-2", vs.VS_MAC_ADDR_TYPE_LEARNED)) as (
        status,
        table,
    ):
        must(status)
        print(", ".join(entry.macAddress for entry in table.macEntries))


def restart() -> None:
    heading("The host restarts")
    outside("restart")
    mtu = vs.Cell("qex_uint32")
    must(vs.VSDVS_GetMTU(SWITCH, mtu.pointer))
    print(f"{SWITCH} is there again, with MTU {mtu.value}; web-1 sends over {hint('web-1')}")
    must(vs.VSDVS_DestroyVSwitch(SWITCH))


def main() -> None:
    with tempfile.TemporaryDirectory() as folder:
        # Read at the first call; simhostctl finds the same host through it.
        os.environ["SIMHOST_STATE"] = os.path.join(folder, "host.db")
        build()
        set_policies()
        fail_a_link()
        mirror_a_port()
        page_through_addresses()
        restart()


if __name__ == "__main__":
    main()
