"""Memory of the library goes back once, through the right door, and is not used afterwards."""

from typing import Any, Callable, List, Optional

import _libvswitch
import libvswitch as vs
import pytest
from libvswitch._ownership import door_of


def uses(uplinks: Any) -> List[Callable[[], Any]]:
    def write() -> None:
        uplinks.totalEntries = 1

    return [
        lambda: uplinks.numEntries,
        lambda: uplinks[0],
        lambda: len(uplinks),
        lambda: list(uplinks),
        lambda: uplinks.entries,
        write,
    ]


def test_what_went_back_raises_when_used(switch: str) -> None:
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
        entries = uplinks.entries
        first = entries[0]
        name = first.name
    for use in uses(uplinks):
        with pytest.raises(ValueError):
            use()
    others: List[Callable[[], Any]] = [
        lambda: entries[0],
        lambda: len(entries),
        lambda: first.portID,
        lambda: name.string,
    ]
    for use in others:
        with pytest.raises(ValueError):
            use()
    assert repr(uplinks) == "<VSUplinks that is gone>"


def test_it_goes_back_when_the_block_raises(switch: str) -> None:
    with pytest.raises(KeyError):
        with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
            raise KeyError
    with pytest.raises(ValueError):
        uplinks[0]


def test_it_goes_back_once(switch: str) -> None:
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
        vs.VSQEX_FreeMemory(uplinks)
        with pytest.raises(ValueError):
            vs.VSQEX_FreeMemory(uplinks)


def test_lists_of_the_configuration_go_back(switch: str) -> None:
    with vs.owned(vs.VSDVS_GetSwitchUplinkPorts(switch)) as (_, names, identifiers):
        assert list(names) == list(identifiers) == ["uplink1", "uplink2"]
    with vs.owned(vs.VSDVS_GetPortVLANPolicy(switch, "web")) as (_, policy, _priority):
        assert len(policy.vidRanges) == 0


@pytest.mark.parametrize(
    "call, door",
    [
        ("VSQEX_GetUplinks", "VSQEX_FreeMemory"),
        ("VSDVS_GetDVMirrorSessions", "VSDVS_FreeMemory"),
        ("DVSQEX_GlobalPropGet", "DVSQEX_DataFree"),
        ("DVSQEX_SwitchPortList", "DVSQEX_DataFree"),
        ("DVSQEX_VendorPortPropList", "DVSData_Free"),
        ("DVSData_Alloc", "DVSData_Free"),
        ("DVSData_Data", None),
        ("DVSState_GlobalPropLookup", None),
    ],
)
def test_the_call_chooses_the_door(call: str, door: Optional[str]) -> None:
    """As the headers say it of each."""
    assert door_of(call) == door


def test_the_caller_chooses_the_door(switch: str) -> None:
    through: List[Any] = []

    def door(memory: Any) -> None:
        through.append(int(memory))
        _libvswitch.VSQEX_FreeMemory(memory)

    _, uplinks = vs.VSQEX_GetUplinks(switch)
    address = int(uplinks)
    with vs.owned(uplinks, door):
        assert through == []
    assert through == [address]
    with pytest.raises(ValueError):
        uplinks[0]
    with pytest.raises(ValueError, match="takes no memory back"):
        vs.owned(vs.VSInfo(), "VSQEX_GetVSInfo")


def test_the_host_counts_it_once(switch: str) -> None:
    """Its ledger gives up on the second return, which the flat function would bring about."""
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    memory = vs.Pointer(int(uplinks), "void *", None)
    with vs.owned(uplinks):
        pass
    with pytest.raises(RuntimeError, match="given back twice"):
        _libvswitch.VSQEX_FreeMemory(memory)


def test_what_nobody_handed_out_has_no_door() -> None:
    with pytest.raises(ValueError, match="name the door"):
        vs.owned(vs.VSInfo())


def test_a_call_that_failed_hands_nothing_out() -> None:
    with vs.owned(vs.VSQEX_GetUplinks("no such switch")) as (status, uplinks):
        assert (status, uplinks) == (vs.QEX_NOT_FOUND, None)


def test_a_table_of_the_callers_own() -> None:
    with vs.owned(vs.alloc_dvmirror_session_table(1, 1)) as table:
        assert len(table) == 1
    with pytest.raises(ValueError):
        len(table)
