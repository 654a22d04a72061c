"""Every call that asks for the runtime state, seen to do what it does."""

import json
from typing import Any, Dict

import libvswitch as vs

from witness import LAB, PORT, SIMHOST, call, filled


def apply(document: Dict[str, Any]) -> None:
    assert SIMHOST.simhost_apply(json.dumps(document).encode()) == 0


def addresses() -> None:
    entry = filled(vs.VSMACEntry(), macAddrType=vs.VS_MAC_ADDR_TYPE_STATIC)
    entry.macAddress = "02:00:00:00:00:01"
    stats = vs.VSPMACLearningStats()
    for _ in range(2):
        for name, given in (("Team", (LAB,)), ("Port", (LAB, PORT))):
            status, table = call(f"VSQEX_Get{name}MACTable", *given, vs.VS_MAC_ADDR_TYPE_ALL)
            vs.VSQEX_FreeMemory(table)
        call("VSQEX_GetPortMACLearningStats", LAB, PORT, stats, outputs=(stats,))
        call("VSQEX_SetPortMACTable", LAB, PORT, entry)
        learns = {"learning": True}
        apply({"switches": [{"alias": LAB, "ports": [{"id": PORT, "mac_learning": learns}]}]})
        for port in (None, PORT.encode()):
            mac = b"02:00:00:00:00:02" if port else b"02:00:00:00:00:03"
            assert SIMHOST.simhost_learn(LAB.encode(), port, mac, 0, 0) == 0
    call("VSQEX_ClearPortMACTable", LAB, PORT, entry)
    props = filled(vs.VSMACLearningGlobalProps(), agingTime=10, macLimit=20)
    read = vs.VSMACLearningGlobalProps()
    for _ in range(2):
        call("VSQEX_GetGlobalMACLearningProps", read, outputs=(read,))
        call("VSQEX_SetGlobalMACLearningProps", props)


def groups() -> None:
    number = vs.VSDVS_DvPortIDToPortID(LAB, PORT)[1]
    mode = vs.VS_MCAST_FILTER_MODE_LEGACY
    for vni, joined in (
        (1, "01:00:5e:00:00:01"),
        (2, "01:00:5e:00:00:01"),
        (2, "01:00:5e:00:00:02"),
    ):
        port = {"id": PORT, "groups": [{"address": joined, "vni": vni}]}
        apply({"switches": [{"alias": LAB, "ports": [port]}]})
        status, filters = call("VSQEX_GetMcastFilters", LAB, number, mode)
        vs.VSQEX_FreeMemory(filters)
        group = bytes.fromhex("01005e000001")
        status, stats = call("VSQEX_GetMcastFilterStats", LAB, number, mode, group)
        vs.VSQEX_FreeMemory(stats)


def counters() -> None:
    for count in (1, 2):
        for name, record, counter in (
            ("ServicePortTeamingStats", vs.VSServicePortTeamingStats(), b"txErrors"),
            ("RARPStats", vs.VSRARPStats(), b"rarpPktsSent"),
        ):
            assert SIMHOST.simhost_set_counter(LAB.encode(), None, None, counter, count) == 0
            call(f"VSQEX_Get{name}", LAB, record, outputs=(record,))


def options() -> None:
    option = vs.get_runtime_option_type_from_name("MaxRARPsPerInterval")
    chosen = vs.Cell("qex_uint16", option)
    wanted = vs.VSRuntimeOptions(64)
    first: Any = wanted.get_first_option()
    end: Any = wanted.add_int_option(first, "MaxRARPsPerInterval", option, 20)
    wanted.set_options_length(int(end) - int(first))
    for _ in range(2):
        status, found = vs.VSQEX_GetRuntimeOptions(chosen.pointer, 1)
        value = found.get_first_option().get_option_value()
        call.note("VSQEX_GetRuntimeOptions", [status, value])
        vs.VSQEX_FreeMemory(found)
        call("VSQEX_SetRuntimeOptions", wanted)


def query() -> None:
    addresses()
    groups()
    counters()
    options()
