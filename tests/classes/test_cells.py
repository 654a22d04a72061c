"""Cells make every call usable: those that fill or read what a pointer points to, and walks."""

import ctypes
import gc
import os
import re
import sys
from pathlib import Path
from typing import Any, List

import _libvswitch
import libvswitch as vs
import pytest
from libvswitch import Cell, _pointers


def test_a_number_that_a_call_fills(switch: str) -> None:
    mtu = Cell("qex_uint32")
    assert vs.VSDVS_SetMTU(switch, 9000) == vs.QEX_OK
    assert vs.VSDVS_GetMTU(switch, mtu.pointer) == vs.QEX_OK
    assert mtu.value == 9000
    # The cell stands for its pointer.
    assert vs.VSDVS_SetMTU(switch, 1500) == vs.QEX_OK
    assert vs.VSDVS_GetMTU(switch, mtu) == vs.QEX_OK
    assert mtu.value == 1500


def test_an_array_that_a_call_reads() -> None:
    wanted = [vs.VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM, vs.VS_RT_OPT_ALLOW_FAST_PATH]
    ids = Cell("qex_uint16", wanted)
    assert list(ids) == wanted and len(ids) == len(wanted)
    with vs.owned(vs.VSQEX_GetRuntimeOptions(ids.pointer, len(ids))) as (status, options):
        assert status == vs.QEX_OK
        found = []
        option = options.get_first_option()
        while option is not None:
            found.append(option.type)
            option = options.get_next_option(option)
    assert found == wanted


def test_a_property_by_the_raw_call(switch: str, switch_id: str) -> None:
    data, length = Cell("void *"), Cell("int")
    assert (
        vs.DVSQEX_GlobalPropGet(switch_id, vs.VSPROP_MTU, data.pointer, length.pointer) == vs.QEX_OK
    )
    assert length.value == 4
    assert int.from_bytes(data.read(length.value), "little") == 1500
    with vs.owned(data):
        pass
    assert data.value is None
    with pytest.raises(ValueError):
        data.read(4)

    mtu = Cell("qex_uint32", 2000)
    assert (
        vs.DVSQEX_GlobalPropSet(
            switch_id, vs.VSPROP_MTU, mtu.pointer, len(bytes(mtu)), vs.CONFIG_PROP_TYPE
        )
        == vs.QEX_OK
    )
    assert vs.VSDVS_GetMTU(switch, mtu.pointer) == vs.QEX_OK
    assert mtu.value == 2000


def test_a_record_that_a_pointer_points_to(switch: str, switch_id: str) -> None:
    lags = Cell("VSLAGTable *")
    assert [*lags] == [None]
    assert vs.VSQEX_GetLAGTable(switch, lags.pointer) == vs.QEX_OK
    with vs.owned(lags):
        table = lags.value
        assert table is not None and table.numLAGs == 0
    assert lags.value is None
    with pytest.raises(ValueError):
        table.numLAGs

    ports = Cell("DVPortList *")
    kind = vs.DVSPORT_TYPE_ACTIVE
    assert vs.DVSQEX_SwitchPortList(switch_id, ports.pointer, kind) == vs.QEX_OK
    with vs.owned(ports.value) as found:
        assert found is not None
        assert "web" in [port.dvPortId for port in found.dvPort]

    assert vs.VSDVS_AddOpaqueDVPort(switch, "opaque", "theirs") == vs.QEX_OK
    opaque = Cell("OpaqueDVPortData *")
    assert vs.DVSQEX_PortGetByExternalId(switch_id, "theirs", opaque.pointer) == vs.QEX_OK
    with vs.owned(opaque.value) as port:
        assert port is not None
        assert (port.dvPortId, port.externalId) == ("opaque", "theirs")


def test_lists_and_items(switch_id: str) -> None:
    made = Cell("DVSDataHandle")
    assert vs.DVSData_Alloc(made.pointer, None, None) == vs.QEX_OK
    with vs.owned(made):
        value = Cell("qex_uint32", 5)
        kind = vs.CONFIG_PROP_TYPE
        assert vs.DVSData_Update(made.value, "five", value.pointer, 4, kind) == vs.QEX_OK
    assert made.value is None

    item, data = Cell("DVSDataItem"), Cell("void *")
    assert vs.DVSState_GlobalPropLookup(switch_id, vs.VSPROP_MTU, item.pointer) == vs.QEX_OK
    assert vs.DVSData_Name(item.value) == vs.VSPROP_MTU
    assert vs.DVSData_Data(item.value, data.pointer) == 4
    assert int.from_bytes(data.read(4), "little") == 1500
    # A look at the state is nobody's to release.
    with pytest.raises(ValueError, match="name the deallocator"):
        vs.owned(item)


def test_walks_take_functions(switch: str, switch_id: str) -> None:
    names: List[Any] = []
    vs.DVSState_SwitchForEach(lambda handle, context: names.append(vs.DVS_SwitchName(handle)), None)
    assert switch in names

    seen: List[Any] = []

    def visit(handle: Any, context: Any) -> bool:
        seen.append((vs.DVS_PortId(handle), context))
        return False

    vs.DVSState_PortForEach(vs.DVSState_SwitchFindByAlias(switch), visit, None)
    assert len(seen) == 1 and seen[0][1] is None

    def fail(handle: Any, context: Any) -> None:
        raise LookupError("from inside")

    with pytest.raises(LookupError, match="from inside"):
        vs.DVSState_SwitchForEach(fail, None)


def test_the_private_vlan_map_is_an_array_of_its_entries(switch: str) -> None:
    status, found, count = vs.VSDVS_GetPrivateVLANMap(switch)
    assert (status, found, count) == (vs.QEX_OK, None, 0)

    entries = vs.new_pvlanmapentryArray(2)
    wanted = [
        (10, 10, vs.VSPORT_PVLAN_TYPE_PROMISC),
        (10, 11, vs.VSPORT_PVLAN_TYPE_ISOLATED),
    ]
    for entry, (primary, secondary, kind) in zip(entries, wanted):
        entry.primaryVID, entry.secondaryVID, entry.pvlanType = primary, secondary, kind
        entry.pad = ""
    assert vs.VSDVS_SetPrivateVLANMap(switch, entries, len(entries)) == vs.QEX_OK
    with vs.owned(vs.VSDVS_GetPrivateVLANMap(switch)) as (status, found, count):
        assert (status, count) == (vs.QEX_OK, 2)
        read = [(entry.primaryVID, entry.secondaryVID, entry.pvlanType) for entry in found]
        assert read == wanted
    with pytest.raises(ValueError):
        found[0]


def test_a_port_exists_or_not(switch_id: str) -> None:
    assert vs.DVPortExist(switch_id, "web") is True
    assert vs.DVPortExist(switch_id, "none") is False


@pytest.mark.parametrize(
    "type, least, most",
    [
        ("int", -(2**31), 2**31 - 1),
        ("qex_uint8", 0, 255),
        ("qex_uint16", 0, 2**16 - 1),
        ("qex_uint32", 0, 2**32 - 1),
        ("qex_uint64", 0, 2**64 - 1),
        ("qex_int64", -(2**63), 2**63 - 1),
        ("NEBVersion", 0, 2**32 - 1),
    ],
)
def test_numbers_within_their_type(type: Any, least: int, most: int) -> None:
    for value in (least, most, 1):
        assert Cell(type, value).value == value
    for value in (least - 1, most + 1):
        with pytest.raises(OverflowError):
            Cell(type, value)
    with pytest.raises(TypeError):
        Cell(type, "1")
    with pytest.raises(IndexError):
        Cell(type)[1]


def test_bytes_are_numbers_of_one_byte() -> None:
    assert bytes(Cell("char", b"abc")) == b"abc"
    assert list(Cell("qex_uint8", b"\1\2")) == [1, 2]


def types_of_the_stub() -> List[str]:
    stub = Path(os.environ["BUILD_DIR"], "python", "libvswitch", "cells.pyi")
    listed = re.findall(r"type: Literal\[(.*?)\]", stub.read_text(encoding="utf-8"))
    return [name for names in listed for name in re.findall(r'"(.+?)"', names)]


def test_the_stub_names_all_kinds() -> None:
    found = types_of_the_stub()
    assert len(found) == len(set(found)) > 60
    assert {"char", "qex_Bool", "QEX_ReturnStatus", "void *", "DVSPortHandle"} < set(found)
    # What the headers pass as a pointer to a pointer to a record.
    assert {name for name in found if name.endswith(" *")} == {
        "void *",
        "DVPortList *",
        "OpaqueDVPortData *",
        "VSLAGTable *",
    }


@pytest.mark.parametrize("type", types_of_the_stub())
def test_every_type_of_the_stub_makes_a_cell(type: Any) -> None:
    is_pointer = type.endswith(("*", "Handle", "Item"))
    cell = Cell(type)
    assert cell.value == (None if is_pointer else 0)
    assert int(cell) == int(cell.pointer) != 0
    if is_pointer:
        assert len(bytes(cell)) == ctypes.sizeof(ctypes.c_void_p)
    else:
        cell.value = 1
        assert int.from_bytes(bytes(cell), sys.byteorder) == cell.value == 1


def test_a_name_of_a_pointer_is_as_good_as_the_pointer(switch_id: str) -> None:
    types: Any = ("void *", "DVSDataHandle", "DVSDataItem", "DVSPortHandle", "DVSwitchHandle")
    for type in types:
        item = Cell(type)
        assert vs.DVSState_GlobalPropLookup(switch_id, vs.VSPROP_MTU, item.pointer) == vs.QEX_OK
        assert vs.DVSData_Name(item.value) == vs.VSPROP_MTU


@pytest.mark.parametrize(
    "type", ["", "nothing", "VSInfo", "nothing *", "float", "size_t", "VSInfo *", "VSUplinks *"]
)
def test_what_no_cell_holds(type: Any) -> None:
    with pytest.raises(TypeError) as raised:
        Cell(type)
    assert str(raised.value) == (
        f"no cell can hold a {type!r}; it holds an integer such as int or qex_uint32, void *, "
        "DVSDataHandle, DVSDataItem, DVSPortHandle, DVSwitchHandle, "
        "DVPortList *, OpaqueDVPortData *, VSLAGTable *"
    )


def test_a_cell_of_the_wrong_type_is_refused(switch: str) -> None:
    with pytest.raises(TypeError):
        vs.VSDVS_GetMTU(switch, Cell("qex_uint64").pointer)


def test_a_pointer_keeps_its_cell_alive(switch: str) -> None:
    pointers = [Cell("qex_uint32", number).pointer for number in range(500)]
    cells = [Cell("qex_uint32", 0) for _ in range(500)]
    values = [int.from_bytes(ctypes.string_at(int(one), 4), "little") for one in pointers]
    assert values == list(range(500)) and len(cells) == 500


def test_a_pointer_to_a_record_takes_no_other_record() -> None:
    wrong: List[Any] = [vs.VSInfo(), vs.VSUplinks(1), Cell("int"), 5, "text"]
    for value in wrong:
        text = f"^a VSLAGTable is wanted, not {type(value).__name__}$"
        with pytest.raises(TypeError, match=text):
            Cell("VSLAGTable *", value)
        cell: Any = Cell("VSLAGTable *")
        with pytest.raises(TypeError, match=text):
            cell.value = value
        assert cell.value is None and bytes(cell) == bytes(8)


def test_a_plain_pointer_takes_what_has_a_place() -> None:
    wrong: List[Any] = [5, "text", 1.5, object()]
    for value in wrong:
        cell: Any = Cell("void *")
        with pytest.raises(TypeError, match="^neither a pointer object nor a record$"):
            cell.value = value
        assert cell.value is None
    info, numbers = vs.VSInfo(), Cell("int", [1, 2])
    bits: Any = vs.VSVLANBitmap().bits
    for value in (info, numbers, numbers.pointer, bits, _libvswitch.new_VSStats()):
        cell = Cell("void *", value)
        assert int(cell.value) == int(value)
        assert int.from_bytes(bytes(cell), sys.byteorder) == int(value)


def test_what_was_put_in_stays_alive() -> None:
    def stats(number: int) -> Any:
        info = vs.VSPortInfo()
        info.stats.pktsTx = number
        return info

    def table(number: int) -> Any:
        lags = vs.VSLAGTable()
        lags.numLAGs = number
        return lags

    untyped: List[Any] = [Cell("void *", stats(number)) for number in range(200)]
    typed = [Cell("VSLAGTable *", table(number)) for number in range(200)]
    # And what was read from a cell stays when that is gone.
    kept = [cell.value for cell in untyped[:100]]
    del untyped[:100]
    gc.collect()
    rubbish = [(vs.VSPortInfo(), vs.VSLAGTable()) for _ in range(400)]
    offset = int(rubbish[0][0].stats) - int(rubbish[0][0])
    pointers = [*kept, *(cell.value for cell in untyped)]
    sent = [_libvswitch.VSStats_pktsTx_get(at(int(one) + offset)) for one in pointers]
    assert sent == list(range(200))
    assert [cell.value.numLAGs for cell in typed if cell.value is not None] == list(range(200))


def at(address: int) -> Any:
    return _pointers.pointer_object(address, "VSStats *")


def test_what_was_put_in_reads_back_and_ends_with_its_memory(switch: str) -> None:
    lags: Any = vs.VSLAGTable()
    cell = Cell("VSLAGTable *", lags)
    assert cell.value is lags
    # It is the caller's own, whatever call the cell went through.
    with pytest.raises(ValueError, match="name the deallocator"):
        vs.owned(cell)

    _, uplinks = vs.VSQEX_GetUplinks(switch)
    plain: Any = Cell("void *", [None, uplinks])
    with pytest.raises(ValueError, match="lies in memory of another object"):
        vs.VSQEX_FreeMemory(plain)
    vs.VSQEX_FreeMemory(uplinks)
    assert [*plain] == [None, None] and bytes(plain) == bytes(16)
    with pytest.raises(ValueError, match="^this VSUplinks is gone: its memory was released$"):
        plain.value = uplinks


def test_a_pointer_that_a_call_changes_is_another(switch: str) -> None:
    mine = vs.VSLAGTable()
    cell = Cell("VSLAGTable *", mine)
    assert vs.VSQEX_GetLAGTable(switch, cell.pointer) == vs.QEX_OK
    with vs.owned(cell) as given:
        assert given.value is not None and given.value is not mine
    assert cell.value is None and mine.numLAGs == 0


def test_indexes_count_from_the_end_too() -> None:
    numbers = Cell("int", [1, 2, 3])
    numbers[-1] = 9
    numbers[-3] = 7
    assert [*numbers] == [7, 2, 9] == [numbers[-3], numbers[-2], numbers[-1]]
    for index in (3, -4, 2**40):
        with pytest.raises(IndexError, match=f"^index {index} is not within 3 elements$"):
            numbers[index]
        with pytest.raises(IndexError, match=f"^index {index} is not within 3 elements$"):
            numbers[index] = 1
    tables = Cell("VSLAGTable *", [None, None])
    tables[-1] = vs.VSLAGTable()
    assert tables[1] is tables[-1] is not None and tables[0] is None


def test_a_cell_of_nothing_has_nothing() -> None:
    cells: List[Any] = [Cell("int", []), Cell("char", b""), Cell("void *", [])]
    for cell in cells:
        assert len(cell) == 0 and [*cell] == [] and bytes(cell) == b""
        assert int(cell.pointer)
        with pytest.raises(IndexError, match="^index 0 is not within 0 elements$"):
            cell.value
        with pytest.raises(IndexError, match="^index 0 is not within 0 elements$"):
            cell.value = None
    assert repr(cells[0]) == "Cell('int', [])"
    with pytest.raises(IndexError, match="^index 0 is not within 0 elements$"):
        cells[2].read(1)


@pytest.mark.parametrize("type", [None, 5, b"int", int])
def test_a_type_is_named_by_a_text(type: Any) -> None:
    with pytest.raises(TypeError) as raised:
        Cell(type)
    assert str(raised.value) == f"a cell's type is a str, not {type.__class__.__name__}"


@pytest.mark.parametrize("function", [None, 3, "see"])
def test_a_callback_is_a_function(function: Any) -> None:
    with pytest.raises(TypeError) as raised:
        vs.Callback(function)
    assert str(raised.value) == f"a callback is a function, not {type(function).__name__}"


def test_a_length_is_a_number() -> None:
    data: Any = Cell("void *", Cell("int", 5))
    assert data.read(4) == (5).to_bytes(4, sys.byteorder) and data.read(0) == b""
    with pytest.raises(TypeError, match="^a length must be an integer, not str$"):
        data.read("4")
    with pytest.raises(ValueError, match="^a length is not negative$"):
        data.read(-1)


def test_neither_a_cell_nor_a_callback_is_made_twice() -> None:
    cell, callback = Cell("int", 5), vs.Callback(lambda item, context: None)
    places = [int(cell), int(callback)]
    with pytest.raises(TypeError, match="^this Cell has its memory already$"):
        cell.__init__("int", 6)  # type: ignore[misc]
    with pytest.raises(TypeError, match="^this Callback has its function already$"):
        callback.__init__(print)  # type: ignore[misc]
    assert [int(cell), int(callback)] == places and cell.value == 5


def test_what_goes_while_it_is_put_in_is_refused(
    switch: str, monkeypatch: pytest.MonkeyPatch
) -> None:
    """As another thread may release it."""
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    kind: Any = Cell
    see = kind._see

    def release_and_see(cell: Any, index: int, pointing: Any) -> None:
        vs.VSQEX_FreeMemory(uplinks)
        see(cell, index, pointing)

    monkeypatch.setattr(kind, "_see", release_and_see)
    cell = Cell("void *")
    with pytest.raises(ValueError, match="^this Pointer is gone: its memory was released$"):
        cell.value = uplinks
    assert cell.value is None and bytes(cell) == bytes(8)
