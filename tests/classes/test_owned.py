"""Memory of the library is released once, by the right deallocator, and is not used afterwards."""

from typing import Any, Callable, List

import _libvswitch
import libvswitch as vs
import pytest
from libvswitch._layout import DEALLOCATORS


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


def test_what_was_released_raises_when_used(switch: str) -> None:
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


def test_it_is_released_when_the_block_raises(switch: str) -> None:
    with pytest.raises(KeyError):
        with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
            raise KeyError
    with pytest.raises(ValueError):
        uplinks[0]


def test_it_is_released_once(switch: str) -> None:
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
        vs.VSQEX_FreeMemory(uplinks)
        with pytest.raises(ValueError):
            vs.VSQEX_FreeMemory(uplinks)


def test_lists_of_the_configuration_are_released(switch: str) -> None:
    with vs.owned(vs.VSDVS_GetSwitchUplinkPorts(switch)) as (_, names, identifiers):
        assert list(names) == list(identifiers) == ["uplink1", "uplink2"]
    with vs.owned(vs.VSDVS_GetPortVLANPolicy(switch, "web")) as (_, policy, _priority):
        assert len(policy.vidRanges) == 0


def test_the_caller_chooses_the_deallocator(switch: str) -> None:
    through: List[Any] = []

    def deallocator(memory: Any) -> None:
        through.append(int(memory))
        _libvswitch.VSQEX_FreeMemory(memory)

    _, uplinks = vs.VSQEX_GetUplinks(switch)
    address = int(uplinks)
    with vs.owned(uplinks, deallocator):
        assert through == []
    assert through == [address]
    with pytest.raises(ValueError):
        uplinks[0]
    with pytest.raises(ValueError, match="releases no memory"):
        vs.owned(vs.VSInfo(), "VSQEX_GetVSInfo")


def test_the_host_counts_it_once(switch: str) -> None:
    """Its ledger traps at the second release, which the flat function would bring about."""
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    memory = vs.Pointer(int(uplinks), "void *", None)
    with vs.owned(uplinks):
        pass
    with pytest.raises(RuntimeError, match="given back twice"):
        _libvswitch.VSQEX_FreeMemory(memory)


def test_what_nobody_allocated_has_no_deallocator() -> None:
    with pytest.raises(ValueError, match="name the deallocator"):
        vs.owned(vs.VSInfo())


def test_a_call_that_failed_allocates_nothing() -> None:
    with vs.owned(vs.VSQEX_GetUplinks("no such switch")) as (status, uplinks):
        assert (status, uplinks) == (vs.QEX_NOT_FOUND, None)


def test_a_table_of_the_callers_own() -> None:
    with vs.owned(vs.alloc_dvmirror_session_table(1, 1)) as table:
        assert len(table) == 1
    with pytest.raises(ValueError):
        len(table)


def test_a_wrong_deallocator_leaves_the_record_to_the_right_one(switch: str) -> None:
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    names = list(uplinks)
    wrong = [name for name in DEALLOCATORS if name != "VSQEX_FreeMemory"]
    assert len(wrong) == 4
    for deallocator in wrong:
        text = f"VSQEX_FreeMemory releases this VSUplinks, not {deallocator}"
        with pytest.raises(ValueError, match=f"^{text}$"):
            getattr(vs, deallocator)(uplinks)
        with pytest.raises(ValueError, match=f"^{text}$"):
            vs.owned(uplinks, deallocator)
    assert list(uplinks) == names
    vs.VSQEX_FreeMemory(uplinks)
    assert repr(uplinks) == "<VSUplinks that is gone>"


@pytest.mark.parametrize("deallocator", DEALLOCATORS)
def test_no_deallocator_takes_a_record_of_the_callers_own(deallocator: str) -> None:
    info = vs.VSInfo()
    info.mtu = 9000
    text = f"^this VSInfo is the caller's own, and {deallocator} releases none of that$"
    with pytest.raises(ValueError, match=text):
        getattr(vs, deallocator)(info)
    assert info.mtu == 9000 and info.thisown


def test_a_wrong_deallocator_leaves_the_callers_table(switch: str) -> None:
    table = vs.alloc_dvmirror_session_table(1, 1)
    text = "^free_dvmirror_session_table releases this DVMirrorSessionTable, not VSDVS_FreeMemory$"
    with pytest.raises(ValueError, match=text):
        vs.VSDVS_FreeMemory(table)
    assert len(table) == 1
    vs.free_dvmirror_session_table(table)
    with pytest.raises(ValueError, match="is gone"):
        vs.free_dvmirror_session_table(table)


def test_what_lies_in_a_record_is_not_released_alone(switch: str) -> None:
    """The first field lies where its record does: the host could not tell them apart."""
    with vs.owned(vs.VSDVS_GetPortVLANPolicy(switch, "web")) as (_, policy, _priority):
        for view in (policy.vidRanges, vs.Cell("int").pointer):
            with pytest.raises(ValueError, match="lies in memory of another object"):
                vs.VSDVS_FreeMemory(view)
            assert int(view)


def test_what_the_host_refuses_stays(switch: str) -> None:
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    unknown = vs.Pointer(int(uplinks) + 8, "void *", None)
    with pytest.raises(RuntimeError, match="never gave out"):
        vs.VSQEX_FreeMemory(unknown)
    assert int(unknown) == int(uplinks) + 8
    vs.VSQEX_FreeMemory(uplinks)


def test_one_refusal_does_not_keep_the_others(switch: str) -> None:
    def closed(_: Any) -> None:
        raise LookupError("closed")

    _, first = vs.VSQEX_GetUplinks(switch)
    _, second = vs.VSQEX_GetUplinks(switch)
    refused = iter((closed, _libvswitch.VSQEX_FreeMemory))
    with pytest.raises(LookupError, match="closed"):
        with vs.owned((first, second), lambda memory: next(refused)(memory)):
            pass
    assert int(first) and not int(second)
    vs.VSQEX_FreeMemory(first)


def test_an_array_of_the_callers_goes_through_a_function() -> None:
    with vs.owned(vs.new_vidrangeArray(2), vs.delete_vidrangeArray) as ranges:
        assert len(ranges) == 2
    assert repr(ranges) == "<array that is gone>"


@pytest.mark.parametrize("given", [5, 0, True, "tour", b"", 1.5, {}, object, (0, 1.5), [{}]])
def test_what_can_hold_no_memory_is_no_result(given: Any) -> None:
    odd = given[-1] if isinstance(given, (tuple, list)) else given
    with pytest.raises(TypeError) as raised:
        vs.owned(given)
    assert str(raised.value) == (
        "owned takes what a call returned, a record, an array, a cell or a pointer, "
        f"not {type(odd).__name__}"
    )


def test_a_pointer_object_without_a_class_is_no_result(switch: str) -> None:
    handle = vs.DVSState_SwitchFindByAlias(switch)
    assert handle is not None
    with pytest.raises(TypeError, match="not SwigPyObject$"):
        vs.owned(handle, "DVSQEX_DataFree")


def test_a_cell_of_numbers_holds_no_memory() -> None:
    deallocators: List[Callable[[Any], Any]] = [vs.owned, vs.VSQEX_FreeMemory]
    for take in deallocators:
        with pytest.raises(TypeError, match="^a cell of int points to nothing$"):
            take(vs.Cell("int", 5))


def test_null_is_nothing_to_release(switch: str) -> None:
    with vs.owned(None) as nothing:
        assert nothing is None
    with vs.owned(vs.Cell("VSLAGTable *")) as cell:
        assert cell.value is None
    # Numbers and texts beside memory are outputs.
    with vs.owned(vs.VSDVS_GetMcastFilterMode(switch)) as (status, mode):
        assert (status, mode) == (vs.QEX_OK, vs.VS_MCAST_FILTER_MODE_LEGACY)


def test_all_pointers_of_a_cell_are_released(switch: str) -> None:
    lags = vs.Cell("VSLAGTable *", [None, None])
    # A call fills the first of them.
    for index in (1, 0):
        assert vs.VSQEX_GetLAGTable(switch, lags.pointer) == vs.QEX_OK
        if index:
            lags[index] = lags.value
            lags.value = None
    with vs.owned(lags):
        tables = [*lags]
        assert len({int(table) for table in tables if table is not None}) == 2
    assert [*lags] == [None, None]
    assert [repr(table) for table in tables] == ["<VSLAGTable that is gone>"] * 2
