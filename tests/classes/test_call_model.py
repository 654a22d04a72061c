"""The model of the calls says what the headers say, call by call where memory is concerned."""

import os
import re
import sys
from pathlib import Path
from typing import Dict, List, Optional, Set, Tuple

import functions
import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ["BUILD_DIR"])
# At the end, for the package of the classes that lies there is not built.
sys.path.append(str(ROOT / "python"))

import call_model  # noqa: E402  (after the path is set)
import definitions  # noqa: E402
from call_model import RESULT, Direction, Ownership, Unit, Value, Volatile  # noqa: E402

KNOWN = definitions.read(BUILD / "classes/made/tree.xml")
CALLS = {call.name: call for call in call_model.read(KNOWN)}

# Each call that allocates: the argument, where its length stands, who releases it. By hand, from
# the comments of the headers.
ALLOCATED = """
    VSDVS_GetSwitchUplinkPorts          names    -               VSDVS_FreeMemory
    VSDVS_GetSwitchUplinkPorts          ids      -               VSDVS_FreeMemory
    VSDVS_GetPortVLANPolicy             policy   -               VSDVS_FreeMemory
    VSDVS_GetPrivateVLANMap             entries  count           VSDVS_FreeMemory
    VSDVS_GetDVMirrorSessions           table    -               VSDVS_FreeMemory
    VSQEX_GetTeamMACTable               table    -               VSQEX_FreeMemory
    VSQEX_GetPortMACTable               table    -               VSQEX_FreeMemory
    VSQEX_GetLAGTable                   table    -               VSQEX_FreeMemory
    VSQEX_GetUplinks                    uplinks  -               VSQEX_FreeMemory
    VSQEX_GetMcastFilters               filters  mode            VSQEX_FreeMemory
    VSQEX_GetMcastFilterStats           stats    mode            VSQEX_FreeMemory
    VSQEX_GetDVMirrorSessionIDs         ids      -               VSQEX_FreeMemory
    VSQEX_GetPromiscSessionActiveDsts   ports    -               VSQEX_FreeMemory
    VSQEX_GetRuntimeOptions             options  -               VSQEX_FreeMemory
    DVSData_Alloc                       list     -               DVSData_Free
    DVSData_Serialize                   bytes    length          DVSQEX_DataFree
    DVSQEX_StateGet                     state    length          DVSQEX_DataFree
    DVSQEX_PersistentStateGet           state    length          DVSQEX_DataFree
    DVSQEX_SwitchPortList               ports    -               DVSQEX_DataFree
    DVSQEX_CmdExec                      output   outputLength    DVSQEX_DataFree
    DVSQEX_GlobalPropGet                data     length          DVSQEX_DataFree
    DVSQEX_HostPropGet                  data     length          DVSQEX_DataFree
    DVSQEX_PortGetByExternalId          port     -               DVSQEX_DataFree
    DVSQEX_PortDataGet                  data     length          DVSQEX_DataFree
    DVSQEX_PortStateGet                 state    length          DVSQEX_DataFree
    DVSQEX_PersistentPortStateGet       state    length          DVSQEX_DataFree
    DVSQEX_UplinkDataGet                data     length          DVSQEX_DataFree
    DVSQEX_VendorGlobalPropList         list     -               DVSData_Free
    DVSQEX_VendorHostPropList           list     -               DVSData_Free
    DVSQEX_VendorPortPropList           list     -               DVSData_Free
    DVSQEX_ExtraConfigPropList          list     -               DVSData_Free
    DVSQEX_ExtraConfigPortPropList      list     -               DVSData_Free
"""

VIEWS = {
    ("DVSData_Data", "data"),
    ("DVSState_GlobalPropLookup", "item"),
    ("DVSState_HostPropLookup", "item"),
    ("DVSState_SwitchFindByAlias", RESULT),
    ("DVSState_PortFind", RESULT),
}

DEALLOCATORS = {
    "VSDVS_FreeMemory": "memory",
    "VSQEX_FreeMemory": "memory",
    "DVSQEX_DataFree": "data",
    "DVSData_Free": "list",
}

# Arrays that the caller gives, and where their length stands.
GIVEN = """
    VSDVS_SetPortVLANPolicy     ranges   ELEMENTS  numRanges
    VSDVS_SetPrivateVLANMap     entries  ELEMENTS  count
    VSQEX_GetMcastFilterStats   group    FORM      mode
    VSQEX_GetRuntimeOptions     ids      ELEMENTS  count
    DVSData_Update              data     BYTES     length
    DVSState_ConfigDeserialize  state    BYTES     length
    DVSQEX_StateInit            state    BYTES     length
    DVSQEX_CmdExec              input    BYTES     inputLength
    DVSQEX_GlobalPropSet        data     BYTES     length
    DVSQEX_HostPropSet          data     BYTES     length
    DVSQEX_PortAdd              state    BYTES     stateLength
    DVSQEX_PortDataSet          data     BYTES     length
    DVSQEX_UplinkDataSet        data     BYTES     length
"""

NULLABLE = """
    VSDVS_CreateVSwitch switchId portsetName
    VSDVS_SetPortVLANPolicy ranges
    VSDVS_SetPrivateVLANMap entries
    VSQEX_GetRuntimeOptions ids
    DVS_SwitchId handle
    DVS_SwitchName handle
    DVS_ClassName handle
    DVS_GetMaxPorts handle
    DVS_Version handle
    DVS_PortId handle
    DVS_PortAlias handle
    DVSData_Alloc alloc release
    DVSData_Update data
    DVSData_Name item
    DVSData_Data item
    DVSData_PropType item
    DVSState_SwitchForEach callback context
    DVSState_PortForEach handle callback context
    DVSState_GlobalPropForEach handle callback context
    DVSState_HostPropForEach handle callback context
    DVSState_PortDataForEach handle callback context
    DVSQEX_StateInit state
    DVSQEX_CmdExec input
    DVSQEX_PortAdd state
    VSDVS_FreeMemory memory
    VSQEX_FreeMemory memory
    DVSQEX_DataFree data
    DVSData_Free list
"""


def rows(table: str) -> List[List[str]]:
    return [line.split() for line in table.strip().splitlines()]


def owned(kind: Ownership) -> Set[Tuple[str, str]]:
    found = {
        (call.name, one.name)
        for call in CALLS.values()
        for one in call.arguments
        if one.value.ownership is kind
    }
    results = {call.name for call in CALLS.values() if call.result.value.ownership is kind}
    return found | {(name, RESULT) for name in results}


def test_every_call_is_there_once() -> None:
    assert len(CALLS) == 146
    assert set(CALLS) == {one.name for one in functions.read() if one.kind == "call"}


def test_families() -> None:
    counts: Dict[str, int] = {}
    for call in CALLS.values():
        counts[call.family] = counts.get(call.family, 0) + 1
    assert counts == {
        "configuration": 53,
        "queries": 26,
        "data": 14,
        "state": 11,
        "kernel_state": 36,
        "names": 4,
        "status_text": 2,
    }


def test_what_is_allocated_and_who_releases_it() -> None:
    found = [
        [call.name, one.name, one.length.of if one.length else "-", one.value.deallocator]
        for call in CALLS.values()
        for one in call.allocates
    ]
    assert sorted(found) == sorted(rows(ALLOCATED))
    conditional = [
        (call.name, one.name)
        for call in CALLS.values()
        for one in call.arguments
        if one.value.unless
    ]
    assert conditional == [("DVSData_Serialize", "bytes")]


def test_deallocators() -> None:
    found = {call.name: call.releases.name for call in CALLS.values() if call.releases}
    assert found == DEALLOCATORS
    assert owned(Ownership.RELEASED) == set(DEALLOCATORS.items())


def test_views() -> None:
    assert owned(Ownership.VIEW) == VIEWS
    for name, argument in VIEWS:
        call = CALLS[name]
        value = call.result.value if argument == RESULT else call.argument(argument).value
        assert value.until
    length = CALLS["DVSData_Data"].argument("data").length
    assert length is not None and (length.unit, length.of) == (Unit.BYTES, RESULT)


def test_arrays_that_are_given() -> None:
    found = [
        [call.name, one.name, one.length.unit.name, one.length.of]
        for call in CALLS.values()
        for one in call.inputs
        if one.length is not None
    ]
    assert sorted(found) == sorted(rows(GIVEN))


def test_nulls() -> None:
    found = {
        call.name: {one.name for one in call.arguments if one.is_nullable}
        for call in CALLS.values()
        if any(one.is_nullable for one in call.arguments)
    }
    assert found == {name: set(arguments) for name, *arguments in rows(NULLABLE)}


def test_texts_that_calls_write_have_room() -> None:
    found = {
        (call.name, one.name): one.room
        for call in CALLS.values()
        for one in call.arguments
        if one.room
    }
    assert found == {
        ("VSDVS_GetAliasFromPortset", "aliasBuffer"): 128,
        ("VSDVS_GetPortTeamingOverride", "overrideBuffer"): 81,
        ("VSQEX_GetUplinkDVPortID", "portBuffer"): 48,
        ("DVSAliasToSwitchId", "switchId"): 63,
        ("DVSPortsetNameToAlias", "alias"): 127,
        ("DVSAliasToPortsetName", "portsetBuffer"): 128,
    }


@pytest.mark.parametrize(
    "name, outputs",
    [
        ("VSDVS_SetPortVLANPolicy", []),
        ("VSDVS_AppendDVMirrorSessions", []),
        ("VSQEX_SetRuntimeOptions", []),
        ("VSQEX_SetGlobalMACLearningProps", []),
        ("VSDVS_GetTeamingPolicy", ["policy"]),
        ("VSDVS_GetMTU", ["mtu"]),
        ("VSDVS_GetPortVLANPolicy", ["policy", "priority"]),
        ("DVSData_Data", ["data"]),
        ("DVSData_Update", []),
        ("DVSState_PortForEach", []),
        ("DVSAliasToSwitchId", ["switchId"]),
    ],
)
def test_directions(name: str, outputs: List[str]) -> None:
    assert [one.name for one in CALLS[name].outputs] == outputs
    assert all(one.direction is Direction.IN for one in CALLS[name].inputs)


@pytest.mark.parametrize(
    "name, argument, c_type",
    [
        ("VSDVS_SetMTU", "switchName", "char const *"),
        ("VSDVS_SetMTU", "mtu", "qex_uint32"),
        ("VSQEX_GetUplinks", "uplinks", "VSUplinks **"),
        ("VSDVS_RemoveDVMirrorSession", "sid", "char const [32]"),
        ("VSQEX_GetMcastFilterStats", "group", "unsigned char const *"),
        ("DVSState_SwitchForEach", "callback", "DVSwitchCallback"),
        ("DVSQEX_StateGet", "state", "void **"),
    ],
)
def test_types_in_c(name: str, argument: str, c_type: str) -> None:
    assert CALLS[name].argument(argument).c_type == c_type


def test_results() -> None:
    assert CALLS["VSDVS_SetMTU"].has_status and not CALLS["DVPortExist"].has_status
    assert CALLS["DVS_SwitchName"].result.c_type == "char const *"
    assert CALLS["DVS_SwitchName"].result.is_nullable
    assert CALLS["Panic"].takes_more and not CALLS["VSDVS_SetMTU"].takes_more
    assert CALLS["DVSData_Data"].result.c_type == "qex_uint32"


def test_what_belongs_to_whom_beside_that() -> None:
    kinds: Dict[Tuple[str, str], Ownership] = {
        ("VSQEX_GetVSInfo", "info"): Ownership.CALLER,
        ("VSQEX_GetVSInfo", "switchName"): Ownership.VALUE,
        ("VSDVS_GetMTU", "mtu"): Ownership.VALUE,
        ("DVSQEX_GlobalPropSet", "data"): Ownership.CALLER,
        ("DVS_SwitchId", "handle"): Ownership.VALUE,
        ("DVSState_SwitchForEach", "callback"): Ownership.VALUE,
    }
    assert {(name, one): CALLS[name].argument(one).value.ownership for name, one in kinds} == kinds


@pytest.mark.parametrize("deallocator", ["", None])
def test_memory_without_a_deallocator_is_refused(deallocator: Optional[str]) -> None:
    with pytest.raises(ValueError, match="^what is allocated has a deallocator"):
        Value(Ownership.ALLOCATED, deallocator or "")
    with pytest.raises(ValueError, match="^what is allocated has a deallocator"):
        Value(Ownership.VIEW, "VSQEX_FreeMemory")


def test_what_is_said_of_nothing_is_refused() -> None:
    """A name that changed in a header must not leave its declaration behind."""
    known = definitions.read(BUILD / "classes/made/tree.xml")
    one = next(one for one in known.functions if one.name == "VSDVS_SetMTU")
    one.said["nullable", "bytesPerFrame"] = "1"
    with pytest.raises(ValueError, match="VSDVS_SetMTU has no bytesPerFrame for nullable"):
        call_model.read(known)
    known = definitions.read(BUILD / "classes/made/tree.xml")
    one = next(one for one in known.functions if one.name == "VSQEX_GetUplinks")
    one.said["allocates", "uplinks"] = "VSQEX_GetVSInfo"
    with pytest.raises(ValueError, match="VSQEX_GetUplinks: VSQEX_GetVSInfo releases nothing"):
        call_model.read(known)


def test_the_comments_of_the_headers_name_the_same_deallocator() -> None:
    """Who reads the headers in C must not read something else there."""
    for call in CALLS.values():
        for one in call.allocates:
            folder = "vswitch" if call.family in ("configuration", "queries") else "nebpublic"
            header = ROOT / "include" / folder / f"{call.family}.h"
            assert one.value.deallocator in header.read_text(encoding="ascii"), call.name


# By hand, from the headers: what no two hosts need have alike.
VOLATILE = """
    SWITCH_ID     DVS_SwitchId RESULT
    PORT_NUMBER   VSDVS_DvPortIDToPortID portID
    PORT_NUMBER   VSDVS_DvPortIDToPortIDFromDVSID portID
    PORT_NUMBER   VSQEX_GetMcastFilters port
    PORT_NUMBER   VSQEX_GetMcastFilterStats port
    PORT_NUMBER   VSQEX_PortGetTeamUplinkHint port
    PORT_NUMBER   DVSQEX_UplinkDataGet portID
    PORT_NUMBER   DVSQEX_UplinkDataSet portID
    PORTSET_NAME  VSDVS_CreateVSwitch portsetName
    PORTSET_NAME  VSDVS_GetAliasFromPortset portsetName
    PORTSET_NAME  DVSPortsetNameToAlias portsetName
    PORTSET_NAME  DVSAliasToPortsetName portsetBuffer
    IMAGE         DVSData_Serialize bytes
    LENGTH        DVSData_Serialize length
    IMAGE         DVSState_ConfigDeserialize state
    LENGTH        DVSState_ConfigDeserialize length
    IMAGE         DVSQEX_StateInit state
    LENGTH        DVSQEX_StateInit length
    IMAGE         DVSQEX_StateGet state
    LENGTH        DVSQEX_StateGet length
    IMAGE         DVSQEX_PersistentStateGet state
    LENGTH        DVSQEX_PersistentStateGet length
    IMAGE         DVSQEX_PortAdd state
    LENGTH        DVSQEX_PortAdd stateLength
    IMAGE         DVSQEX_PortStateGet state
    LENGTH        DVSQEX_PortStateGet length
    IMAGE         DVSQEX_PersistentPortStateGet state
    LENGTH        DVSQEX_PersistentPortStateGet length
    CALLERS_OWN   DVSState_SwitchForEach context
    CALLERS_OWN   DVSState_PortForEach context
    CALLERS_OWN   DVSState_GlobalPropForEach context
    CALLERS_OWN   DVSState_HostPropForEach context
    CALLERS_OWN   DVSState_PortDataForEach context
"""


def test_what_is_each_hosts_own() -> None:
    found = []
    for call in CALLS.values():
        own = {one.name: one.volatile for one in call.arguments if one.name != "switchId"}
        own[RESULT] = call.result.volatile
        found += [[kind.name, call.name, name] for name, kind in own.items() if kind is not None]
    assert sorted(found) == sorted(rows(VOLATILE))
    identifiers = [call.argument("switchId") for call in CALLS.values() if has_switch_id(call)]
    assert len(identifiers) == 38
    assert {one.volatile for one in identifiers} == {Volatile.SWITCH_ID}


def has_switch_id(call: call_model.Call) -> bool:
    return "switchId" in [one.name for one in call.arguments]


# Those whose names do not say so.
CHANGING = """
    DVSQEX_CmdExec DVSQEX_StateCleanup DVSQEX_StateInit DVSQEX_StateSanitize DVSQEX_SwitchAssociate
    DVSQEX_SwitchDissociate DVSQEX_SwitchSetMaxPorts DVSQEX_SwitchSetVersion
    DVSState_ConfigDeserialize DVSState_ConfigReset Panic
"""


def test_calls_that_may_change_the_host() -> None:
    asking = {name for name, call in CALLS.items() if call.asks}
    verbs = r"_(Set|Clear|Create|Destroy|Add|Remove|Append|ConfigureS)|(Set|Clear|Add|Remove)$"
    by_verb = {name for name in CALLS if re.search(verbs, name)}
    assert set(CALLS) - asking == by_verb | set(CHANGING.split())
