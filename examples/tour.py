#!/usr/bin/env python3
"""A tour through a whole simulated host: ports, policies, links, mirrors, tables, and a restart.

Works with the classes of libvswitch on a host of its own, in a state file that goes with the
program. What comes to a host from outside, simhostctl does: pulling a cable, a frame, a restart.
"""

import argparse
import os
import shutil
import subprocess
import sys
import tempfile
from typing import Dict, Iterator, Sequence, TypeVar

import libvswitch as vs

SWITCH = "tour"
PORTS = {"web-1": 100, "web-2": 101}

Record = TypeVar("Record")


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
    """The bytes of a property, by the raw call."""
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


def teaming(*uplinks: str) -> vs.VSTeamPolicy:
    """The first uplink carries the traffic, the others stand by."""
    policy = vs.VSTeamPolicy()
    policy.loadBalance = vs.TEAM_FRP_TYPE_FO_EXPLICIT
    policy.linkCriteria = vs.TEAM_FRP_CRIT_LINK_STATE
    policy.numActive, policy.numStandby = 1, len(uplinks) - 1
    for index, uplink in enumerate(uplinks):
        policy[index] = uplink
    return policy


def filled(record: Record, **fields: int) -> Record:
    for name, value in fields.items():
        setattr(record, name, value)
    return record


def set_policies_of_the_switch() -> None:
    must(vs.VSDVS_SetMTU(SWITCH, 9000))
    must(vs.VSDVS_SetTeamingPolicy(SWITCH, teaming("uplink1", "uplink2")))
    learning = filled(vs.VSMACLearning(), agingTime=300, macLimit=1024)
    must(vs.VSDVS_SetMACLearning(SWITCH, learning))
    # VLAN 10 is private: its ports reach promiscuous ones and no other.
    promiscuous = filled(
        vs.VSPvlanMapEntry(),
        primaryVID=10,
        secondaryVID=10,
        pvlanType=vs.VSPORT_PVLAN_TYPE_PROMISC,
    )
    must(vs.VSDVS_SetPrivateVLANMap(SWITCH, promiscuous, 1))
    must(vs.VSDVS_SetMcastFilterMode(SWITCH, vs.VS_MCAST_FILTER_MODE_SNOOPING))


def set_policies_of_a_port(port: str) -> None:
    security = filled(vs.VSPropSecurity(), flags=vs.VSPORT_SECURITY_DISALLOW_FORGED_SRC)
    must(vs.VSDVS_SetPortSecurity(SWITCH, port, security))
    must(vs.VSDVS_SetPortTeamingPolicy(SWITCH, port, teaming("uplink2", "uplink1")))
    must(vs.VSDVS_SetPortTeamingOverride(SWITCH, port, "uplink2"))
    must(vs.VSDVS_SetPortVLANPolicy(SWITCH, port, 20, -1, 0, 0, None, 0))
    must(vs.VSDVS_SetTxUplinkAlways(SWITCH, port, 1))
    must(vs.VSDVS_SetPortNestedVLANTagging(SWITCH, port, 1))
    frames = filled(vs.VSExtraEthFilter(), flags=vs.QEX_ETH_FILTER_BROADCAST)
    must(vs.VSDVS_SetExtraEthFilter(SWITCH, port, frames))
    learning = filled(vs.VSPMACLearning(), learning=1, macLimit=16)
    must(vs.VSDVS_SetPortMACLearning(SWITCH, port, learning))
    mirror(port, to="web-1")


SWITCH_KEYS = [
    vs.VSPROP_MTU,
    vs.VSPROP_SWITCH_TEAMING,
    vs.VSPROP_SWITCH_MAC_LEARNING,
    vs.VSPROP_PVLAN_MAP,
    vs.VSPROP_MULTICAST_FILTER,
]
PORT_KEYS = [
    vs.VSPROP_PORT_SECURITY,
    vs.VSPROP_PORT_TEAMING_POLICY,
    vs.VSPROP_PORT_TEAMING_OVERRIDE,
    vs.VSPROP_PORT_VLAN,
    vs.VSPROP_PORT_TX_UPLINK,
    vs.VSPROP_PORT_VLAN_NESTEDTAG,
    vs.VSPROP_PORT_EXTRA_ETH_FRP,
    vs.VSPROP_PORT_MAC_MANAGEMENT,
    vs.VSPROP_PORT_MIRROR_SESSIONS,
]


def policies() -> Dict[str, bytes]:
    """The bytes of all policies."""
    return {
        **{key: raw(key) for key in SWITCH_KEYS},
        **{key: raw(key, "web-2") for key in PORT_KEYS},
    }


def show_policies() -> None:
    heading("Every policy, set by call and read back as bytes")
    set_policies_of_the_switch()
    set_policies_of_a_port("web-2")
    for key, value in policies().items():
        shown = value[:12].hex(" ") + (" ..." if len(value) > 12 else "")
        print(f"{key:<42} {len(value):>5} bytes  {shown}")


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


def mirror(port: str, to: str) -> None:
    """What a port receives goes to another one as well."""
    table = vs.alloc_dvmirror_session_table(1, 2)
    table.version = vs.VS_DVMIRROR_VERSION_V3
    session = table[0]
    session.sid, session.dname = f"audit-{port}", f"audit of {port}"
    session.type = vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    session.numDstEntities = session.numSrcInEntities = 1
    for number, end in enumerate((to, port)):
        entity = table.get_first_session_entity(number)
        entity.type = vs.MIRROR_ENTTYPE_DVPORT
        entity.set_entity(end)
    must(vs.VSDVS_AppendDVMirrorSessions(SWITCH, port, table))
    vs.free_dvmirror_session_table(table)


def mirror_a_port() -> None:
    heading("What web-1 receives is mirrored to web-2")
    mirror("web-1", to="web-2")
    with vs.owned(vs.VSDVS_GetDVMirrorSessions(SWITCH, "web-1")) as (status, found):
        must(status)
        print(", ".join(f"{session.sid}: {session.dname}" for session in found))
    outside("counter", SWITCH, "mirroredPkts", "1200", "--session", "audit-web-1")
    stats = vs.VSDVMirrorSessionStats()
    must(vs.VSQEX_GetDVMirrorSessionStats(SWITCH, "audit-web-1", stats))
    print(f"{stats.mirroredPkts} packets mirrored")


def pages(entries: Sequence[str], size: int) -> Iterator[str]:
    for first in range(0, len(entries), size):
        yield ", ".join(entries[first : first + size])


def page_through_addresses() -> None:
    heading("Addresses that a port learned, and those beyond the uplinks")
    for last in range(1, 8):
        outside("learn", SWITCH, f"02:00:00:00:00:{last:02x}", "--port", "web-2")
    outside("learn", SWITCH, "02:00:00:00:ff:01")
    kind = vs.VS_MAC_ADDR_TYPE_LEARNED
    for name, result in (
        ("web-2", vs.VSQEX_GetPortMACTable(SWITCH, "web-2", kind)),
        ("team", vs.VSQEX_GetTeamMACTable(SWITCH, kind)),
    ):
        with vs.owned(result) as (status, table):
            must(status)
            addresses = [entry.macAddress for entry in table.macEntries]
        for number, page in enumerate(pages(addresses, 3), 1):
            print(f"{name}, page {number}: {page}")


def restart() -> None:
    heading("The host restarts, and all that was configured is there again")
    before = policies()
    outside("restart")
    assert policies() == before
    with vs.owned(vs.VSQEX_GetPortMACTable(SWITCH, "web-2", vs.VS_MAC_ADDR_TYPE_ALL)) as (
        status,
        table,
    ):
        must(status)
        print(f"{len(before)} policies as they were; {len(table.macEntries)} learned addresses")


def persist() -> None:
    """An image of the configuration outlasts the configuration."""
    heading("An image of the configuration brings it back after a reset")
    before = policies()
    image, length = vs.Cell("void *"), vs.Cell("int")
    must(vs.DVSQEX_PersistentStateGet(image.pointer, length.pointer))
    with vs.owned(image):
        must(vs.DVSState_ConfigReset())
        print(f"after the reset {SWITCH} is {vs.DVSState_SwitchFindByAlias(SWITCH)}")
        must(vs.DVSState_ConfigDeserialize(image.value, length.value))
    assert policies() == before
    print(f"{length.value} bytes later, {len(before)} policies are as they were")
    print(f"web-1 sends over {hint('web-1')}")
    must(vs.VSDVS_DestroyVSwitch(SWITCH))


def main() -> None:
    argparse.ArgumentParser(
        description="Shows a simulated host of its own: ports, policies, links, mirrors, a restart."
    ).parse_args()
    if shutil.which("simhostctl") is None:
        raise SystemExit(
            "tour: needs simhostctl of the simulated host: ./dev demo, or the package"
            " libvswitch-simhost"
        )
    with tempfile.TemporaryDirectory() as folder:
        # Read at the first call; simhostctl finds the same host through it.
        os.environ["SIMHOST_STATE"] = os.path.join(folder, "host.db")
        build()
        show_policies()
        fail_a_link()
        mirror_a_port()
        page_through_addresses()
        restart()
        persist()


if __name__ == "__main__":
    try:
        try:
            main()
        finally:
            print(end="", flush=True)
    except OSError as error:  # nobody reads to the end, as in | head, or the disk is full
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # for what is left
        sys.exit(1 if isinstance(error, BrokenPipeError) else f"tour: {error}")
