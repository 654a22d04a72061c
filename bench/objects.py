#!/usr/bin/env python3
"""What objects cost beside the flat module, asked the same; and what it costs to import them.

    objects.py [--quick]

The state of a host with 100 switches of 100 ports each is asked for through `vswitch`, and through
the flat module by a program that does no more than that. Both find the same, in rounds that take
turns; of each the fastest counts. A ratio above its target, and what noise may add, is a failure.
"""

import ctypes
import enum
import json
import os
import subprocess
import sys
from time import thread_time_ns
from typing import Any, Callable, Dict, List, Type

for _variable in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
    os.environ.pop(_variable, None)

import _libvswitch as flat  # noqa: E402  (after the environment is clean)
import libvswitch as vs  # noqa: E402
from libvswitch.enums import Balance, Criteria, Forbid, MacType, TeamFlags  # noqa: E402
from targets import NOISE  # noqa: E402
from vswitch import Host  # noqa: E402

STATE, IMPORT = 2.0, 2.5
STANDARD = "argparse, dataclasses, enum, json"

Said = Dict[str, Any]

FAMILIES: Dict[str, Type[enum.Enum]] = {
    "balance": Balance,
    "criteria": Criteria,
    "flags": TeamFlags,
    "forbids": Forbid,
    "type": MacType,
}
"""The members of a state that are numbers to the flat module."""


def populate(switches: int, ports: int) -> None:
    """Each port has its VLANs, its policies and an address."""
    port: Said = {"vlan": {"id": 7, "trunk": ["10-12", 20]}, "forbids": ["promiscuous"]}
    document = {
        # Addresses grow no older while both look.
        "clock": {"stopped": True},
        "switches": [
            {
                "alias": f"switch-{number}",
                "teaming": {"balance": "explicit"},
                "ports": [
                    {
                        "id": f"port-{at}",
                        "addresses": [{"mac": f"02:00:00:{number:02x}:{at:02x}:01"}],
                        **port,
                    }
                    for at in range(ports)
                ],
            }
            for number in range(switches)
        ],
    }
    simhost = ctypes.CDLL(flat.__file__)
    simhost.simhost_error.restype = ctypes.c_char_p
    if simhost.simhost_apply(json.dumps(document).encode()) != 0:
        raise SystemExit(simhost.simhost_error().decode())


def check(status: int) -> None:
    if status != flat.QEX_OK:
        raise SystemExit(flat.QEX_ReturnStatusToString(status))


def each(walk: Callable[..., object], *of: Any) -> List[Any]:
    """What a walk reaches."""
    found: List[Any] = []
    walk(*of, vs.Callback(lambda reached, _: found.append(reached)), None)
    return found


def properties(walk: Callable[..., object], handle: Any) -> Dict[str, int]:
    """The keys of what is set, and their property types."""
    found: Dict[str, int] = {}

    def note(item: Any, _: Any) -> None:
        found[flat.DVSData_Name(item)] = flat.DVSData_PropType(item)

    walk(handle, vs.Callback(note), None)
    return found


def addresses(table: Any) -> List[Said]:
    entries = flat.VSMACTable_macEntries_get(table)
    found = []
    for at in range(flat.VSMACTable_numEntries_get(table)):
        entry = flat.VSMACEntry___getitem__(entries, at)
        found.append(
            {
                "mac": flat.VSMACEntry_macAddress_get(entry),
                "vlan": flat.VSMACEntry_vid_get(entry),
                "vni": flat.VSMACEntry_vni_get(entry),
                "type": flat.VSMACEntry_macAddrType_get(entry),
                "ages": flat.VSMACEntry_aging_get(entry) != "\0",
                "age": flat.VSMACEntry_elapsed_get(entry),
            }
        )
    flat.VSQEX_FreeMemory(table)
    return found


def teaming(switch: str) -> Said:
    policy = flat.new_VSTeamPolicy()
    check(flat.VSDVS_GetTeamingPolicy(switch, policy))
    said = {
        "balance": flat.VSTeamPolicy_loadBalance_get(policy),
        "criteria": flat.VSTeamPolicy_linkCriteria_get(policy),
        "flags": flat.VSTeamPolicy_flags_get(policy),
        "speed": flat.VSTeamPolicy_speed_get(policy),
        "full_duplex": bool(flat.VSTeamPolicy_fullDuplex_get(policy)),
        "error_percent": flat.VSTeamPolicy_percentError_get(policy),
    }
    active, standby = (
        flat.VSTeamPolicy_numActive_get(policy),
        flat.VSTeamPolicy_numStandby_get(policy),
    )
    names = [flat.VSTeamPolicy___getitem__(policy, at) for at in range(active + standby)]
    said["active"], said["standby"] = names[:active], names[active:]
    flat.delete_VSTeamPolicy(policy)
    return said


def vlan(switch: str, port: str) -> Said:
    status, policy, priority = flat.VSDVS_GetPortVLANPolicy(switch, port)
    check(status)
    ranges = flat.VSPortVlanPolicy_vidRanges_get(policy)
    trunk = []
    for at in range(flat.VSPortVlanPolicy_numRanges_get(policy)):
        one = flat.vidrangeArray_getitem(ranges, at)
        ends = flat.qex_NEBPortVIDRange_minVID_get(one), flat.qex_NEBPortVIDRange_maxVID_get(one)
        trunk.append(ends[0] if ends[0] == ends[1] else "%d-%d" % ends)
    flags = flat.VSPortVlanPolicy_flags_get(policy)
    said = {"id": flat.VSPortVlanPolicy_vlanID_get(policy), "trunk": trunk}
    flat.VSDVS_FreeMemory(policy)
    more = {
        "guest_tagging": bool(flags & flat.VSPORT_VLAN_GUEST_TAGGING),
        "private": bool(flags & flat.VSPORT_VLAN_PVLAN_ENABLED),
        "priority": None if priority < 0 else priority,
    }
    return {**said, **{name: held for name, held in more.items() if held not in (False, None)}}


def forbids(switch: str, port: str) -> int:
    security = flat.new_VSPropSecurity()
    check(flat.VSDVS_GetPortSecurity(switch, port, security))
    flags = flat.VSPropSecurity_flags_get(security)
    flat.delete_VSPropSecurity(security)
    return int(flags)


def port(switch: str, handle: Any, id_: str, name: Any) -> Said:
    said: Said = {"id": id_}
    held = properties(flat.DVSState_PortDataForEach, handle)
    if flat.VSPROP_PORT_VLAN in held:
        said["vlan"] = vlan(switch, id_)
    if flat.VSPROP_PORT_SECURITY in held:
        said["forbids"] = forbids(switch, id_)
    status, table = flat.VSQEX_GetPortMACTable(switch, id_, flat.VS_MAC_ADDR_TYPE_ALL)
    check(status)
    said["addresses"] = addresses(table)
    status, number = flat.VSDVS_DvPortIDToPortID(switch, id_)
    check(status)
    status = flat.VSQEX_PortGetTeamUplinkHint(number, name)
    uplink = flat.qex_Name_string_get(name) if status == flat.QEX_OK else None
    return {**said, "observed": {"number": number, "uplink": uplink}}


def switch(handle: Any, name: Any) -> Said:
    alias = flat.DVS_SwitchName(handle)
    said: Said = {"alias": alias, "id": flat.DVS_SwitchId(handle)}
    said["max_ports"], said["version"] = flat.DVS_GetMaxPorts(handle), flat.DVS_Version(handle)
    status, said["portset"] = flat.DVSAliasToPortsetName(alias)
    check(status)
    info = flat.new_VSInfo()
    said["running"] = flat.VSQEX_GetVSInfo(alias, info) == flat.QEX_OK
    said["mtu"] = flat.VSInfo_mtu_get(info)
    flat.delete_VSInfo(info)
    held = properties(flat.DVSState_GlobalPropForEach, handle)
    properties(flat.DVSState_HostPropForEach, handle)
    if flat.VSPROP_SWITCH_TEAMING in held:
        said["teaming"] = teaming(alias)
    status, names, ids = flat.VSDVS_GetSwitchUplinkPorts(alias)
    check(status)
    count = flat.VSUplinkPortIds_nUplinkPorts_get(ids)
    for_uplinks = [flat.VSUplinkPortIds___getitem__(ids, at) for at in range(count)]
    said["uplink_ports"] = [{"id": id_} for id_ in for_uplinks]
    flat.VSDVS_FreeMemory(names)
    flat.VSDVS_FreeMemory(ids)
    status, uplinks = flat.VSQEX_GetUplinks(alias)
    check(status)
    said["uplinks"] = [
        flat.VSUplinks___getitem__(uplinks, at) for at in range(flat.VSUplinks___len__(uplinks))
    ]
    flat.VSQEX_FreeMemory(uplinks)
    ports = [(one, flat.DVS_PortId(one)) for one in each(flat.DVSState_PortForEach, handle)]
    said["ports"] = [port(alias, one, id_, name) for one, id_ in ports if id_ not in for_uplinks]
    status, table = flat.VSQEX_GetTeamMACTable(alias, flat.VS_MAC_ADDR_TYPE_ALL)
    check(status)
    said["addresses"] = addresses(table)
    return said


def flat_state() -> List[Said]:
    name = flat.new_qex_Name()
    said = [switch(handle, name) for handle in each(flat.DVSState_SwitchForEach)]
    flat.delete_qex_Name(name)
    return said


def objects_state() -> List[Said]:
    switches: List[Said] = Host(simulated=True).state()["switches"]
    return switches


def in_words(found: Any, name: str = "") -> Any:
    """What the flat module found, as documents say it; the name is that of the member."""
    if isinstance(found, dict):
        return {one: in_words(held, one) for one, held in found.items()}
    if name in FAMILIES:
        family = FAMILIES[name]
        words = str(family(found))
        return words.split(",") if issubclass(family, enum.Flag) else words
    return [in_words(one) for one in found] if isinstance(found, list) else found


def same(ours: Any, theirs: Any) -> bool:
    """Whether objects say all that the flat module found; they say more of some things."""
    if isinstance(theirs, dict):
        return all(name in ours and same(ours[name], one) for name, one in theirs.items())
    if isinstance(theirs, list):
        return len(ours) == len(theirs) and all(map(same, ours, theirs))
    return type(ours) is type(theirs) and bool(ours == theirs)


def measure(switches: int, rounds: int) -> Dict[str, float]:
    """Seconds of a state, of each."""
    populate(switches, switches)
    if not same(objects_state(), in_words(flat_state())):
        raise SystemExit("objects and the flat module do not find the same")
    asks: Dict[str, Callable[[], object]] = {"flat": flat_state, "objects": objects_state}
    best = dict.fromkeys(asks, float("inf"))
    for _ in range(rounds):
        for name, ask in asks.items():
            started = thread_time_ns()
            ask()
            best[name] = min(best[name], (thread_time_ns() - started) / 1e9)
    return best


def imported(what: str, rounds: int) -> float:
    """Milliseconds of processor time to import that, compiled before, in a new interpreter."""
    program = (
        f"import time; t = time.process_time_ns()\nimport {what}\nprint(time.process_time_ns() - t)"
    )
    command = [sys.executable, "-c", program]
    environment = {
        name: value for name, value in os.environ.items() if name != "PYTHONDONTWRITEBYTECODE"
    }
    told = (
        subprocess.run(command, env=environment, stdout=subprocess.PIPE, check=True)
        for _ in range(rounds)
    )
    return min(int(one.stdout) for one in told) / 1e6


def main() -> int:
    is_quick = "--quick" in sys.argv[1:]
    switches = 5 if is_quick else 100
    seconds = measure(switches, 1 if is_quick else 3)
    rounds = 2 if is_quick else 20
    figures = {
        f"state of {switches} x {switches}, s": (seconds["flat"], seconds["objects"], STATE),
        "import, ms": (imported(STANDARD, rounds), imported("vswitch", rounds), IMPORT),
    }
    print(f"{'':28}{'beside':>10}{'vswitch':>10}{'ratio':>8}{'target':>8}")
    missed = []
    for name, (beside, ours, target) in figures.items():
        print(f"{name:28}{beside:>10.2f}{ours:>10.2f}{ours / beside:>8.2f}{target:>8.1f}")
        if ours / beside > target * (1 + NOISE):
            missed.append(name)
    print(f"missed by: {', '.join(missed) or 'none'}")
    return 1 if missed and not is_quick else 0


if __name__ == "__main__":
    sys.exit(main())
