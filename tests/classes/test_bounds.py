"""Nothing is read past its memory, and what misleads is refused, in words of Python."""

from typing import Any, Callable, List

import _libvswitch
import libvswitch as vs
import pytest
from libvswitch import Cell


def test_a_cell_reads_no_further_than_its_block(switch: str, switch_id: str) -> None:
    data, length = Cell("void *"), Cell("int")
    assert vs.DVSQEX_GlobalPropGet(switch_id, vs.VSPROP_MTU, data, length) == vs.QEX_OK
    with vs.owned(data):
        assert data.read(4) == (1500).to_bytes(4, "little") and data.read(2) == b"\xdc\x05"
        with pytest.raises(ValueError, match="^5 bytes are more than the 4 that there are$"):
            data.read(5)
        with pytest.raises(ValueError, match="^100000000 bytes are more than the 4 "):
            data.read(10**8)


def test_a_view_of_an_item_is_read_as_it_was(switch: str, switch_id: str) -> None:
    item, data = Cell("DVSDataItem"), Cell("void *")
    assert vs.DVSState_GlobalPropLookup(switch_id, vs.VSPROP_MTU, item) == vs.QEX_OK
    assert vs.DVSData_Data(item.value, data) == 4
    again = Cell("DVSDataItem")
    assert vs.VSDVS_SetMTU(switch, 9000) == vs.QEX_OK
    # The item after the first is another one from here on.
    assert vs.DVSState_GlobalPropLookup(switch_id, vs.VSPROP_MTU, again) == vs.QEX_OK
    assert data.read(4) == (1500).to_bytes(4, "little")
    with pytest.raises(ValueError, match="^5 bytes are more than the 4 "):
        data.read(5)


def test_what_has_no_known_length_is_not_read(switch: str) -> None:
    handle: Any = Cell("DVSwitchHandle", vs.Pointer(int(vs.VSInfo()), "void *", None))
    with pytest.raises(
        ValueError, match="^nothing tells how many bytes this DVSwitchHandle points to$"
    ):
        handle.read(1)


def test_a_cell_reads_what_was_put_in_to_its_end() -> None:
    info = vs.VSMACLearning()
    info.agingTime = 7
    whole: Any = Cell("void *", info)
    assert whole.read(4) == (7).to_bytes(4, "little")
    with pytest.raises(ValueError, match="are more than the"):
        whole.read(4096)
    part: Any = Cell("void *", Cell("int", [1, 2]))
    assert len(part.read(8)) == 8
    with pytest.raises(ValueError, match="^9 bytes are more than the 8 "):
        part.read(9)


def of_the_library(switch: str) -> List[Any]:
    """Lists that the library allocated, each with its count."""
    mine: Any = vs.VSMACEntry()
    mine.macAddress = "02:00:00:00:00:07"
    mine.macAddrType = vs.VS_MAC_ADDR_TYPE_USER
    assert vs.VSQEX_SetPortMACTable(switch, "web", mine) == vs.QEX_OK
    _, uplinks = vs.VSQEX_GetUplinks(switch)
    _, names, identifiers = vs.VSDVS_GetSwitchUplinkPorts(switch)
    _, table = vs.VSQEX_GetPortMACTable(switch, "web", vs.VS_MAC_ADDR_TYPE_ALL)
    _, ids = vs.VSQEX_GetDVMirrorSessionIDs(switch)
    _, ports = vs.VSQEX_GetPromiscSessionActiveDsts(switch)
    _, sessions = vs.VSDVS_GetDVMirrorSessions(switch, "web")
    return [
        (uplinks, "numEntries", "entries"),
        (names, "nUplinkPorts", "uplinkPortName"),
        (identifiers, "nUplinkPorts", "uplinkPortId"),
        (table, "numEntries", "macEntries"),
        (ids, "numEntries", "entries"),
        (ports, "numEntries", "entries"),
        (sessions, "numSessions", "sessions"),
    ]


def test_a_count_that_is_set_by_hand_is_not_believed(switch: str) -> None:
    for record, count, array in of_the_library(switch):
        name = type(record).__name__
        before = getattr(record, count)
        whole = list(record)
        assert len(record) == len(getattr(record, array)) == before == len(whole)
        assert all(one in record for one in record)
        setattr(record, count, 1_000_000)
        uses: List[Callable[[], Any]] = [
            lambda: list(record),
            lambda: len(record),
            lambda: record[0],
            lambda: record[500_000],
            lambda: getattr(record, array),
            lambda: "x" in record,
        ]
        text = f"^this {name} counts 1000000 elements, and has room for "
        for use in uses:
            with pytest.raises(ValueError, match=text):
                use()
        assert f"this {name} counts 1000000 elements" in repr(record)
        setattr(record, count, before)
        assert list(record) == whole
        vs.owned(record).__exit__()


def test_so_are_those_of_the_callers_own() -> None:
    made: List[Any] = [vs.VSUplinks(3), vs.VSUplinkPorts(3), vs.VSUplinkPortIds(3)]
    for record in made:
        count = "numEntries" if isinstance(record, vs.VSUplinks) else "nUplinkPorts"
        setattr(record, count, 4)
        with pytest.raises(ValueError, match="counts 4 elements, and has room for 3$"):
            list(record)
        with pytest.raises(ValueError, match="counts 4 elements, and has room for 3$"):
            record[3] = "x"
    policy = vs.VSPortVlanPolicy()
    policy.numRanges = 1
    uses: List[Callable[[], Any]] = [lambda: policy.vidRanges, lambda: policy.get_vid_range(0)]
    for use in uses:
        with pytest.raises(ValueError, match="counts 1 elements, and has room for 0$"):
            use()
    ports = vs.DVPortList()
    ports.nports = -1
    with pytest.raises(ValueError, match="counts -1 elements"):
        ports.dvPort


def test_entities_end_with_their_table(switch: str) -> None:
    with vs.owned(vs.alloc_dvmirror_session_table(1, 2)) as table:
        entity = table.get_first_session_entity(0)
        last = entity.next()
        pasts: List[Callable[[], Any]] = [last.next, lambda: table.get_first_session_entity(2)]
        for past in pasts:
            with pytest.raises(IndexError, match="would lie past the memory of its list$"):
                past()
    with pytest.raises(IndexError):
        vs.DVMirrorEntity().next()


def test_options_end_with_their_list() -> None:
    options: Any = vs.VSRuntimeOptions(24)
    first = options.get_first_option()
    second = options.add_int_option(first, "x", 3, 5)
    assert second is not None and first.get_option_value() == 5
    assert options.add_int_option(second, "x", 4, 6) is not None
    options.totalLength = 4000
    uses: List[Callable[[], Any]] = [
        lambda: options.add_int_option(second, "x", 3, 5),
        lambda: options.add_str_option(second, "x", 13, "10.0.0.1"),
        lambda: options.get_next_option(second),
        lambda: options.set_options_length(4000),
    ]
    for use in uses:
        with pytest.raises(ValueError, match="takes 400[04] bytes, and there are "):
            use()
    other = vs.VSRuntimeOptions(8).get_first_option()
    options.totalLength = 24
    with pytest.raises(ValueError, match="^at is no place in this list$"):
        options.add_int_option(other, "x", 3, 5)
    first.type = 15
    with pytest.raises(ValueError, match="^there is no option 15, and so no name of it$"):
        first.get_option_name()
    first.type, first.length = vs.VS_RT_OPT_IGMP_ROUTER_IP, 8
    first.data.first(4)[:] = [65] * 4
    with pytest.raises(ValueError, match="has no end within it$"):
        first.get_option_value()


@pytest.mark.parametrize("count", [10**8, 2**62])
def test_a_count_of_elements_that_cannot_be(switch: str, count: int) -> None:
    ranges = vs.new_vidrangeArray(2)
    entries = vs.new_pvlanmapentryArray(2)
    makers: List[Callable[[], Any]] = [
        lambda: vs.new_vidrangeArray(count),
        lambda: vs.VSUplinks(count),
        lambda: vs.VSRuntimeOptions(count),
        lambda: vs.alloc_dvmirror_session_table(count, 1),
        lambda: vs.alloc_dvmirror_session_table(1, count),
    ]
    for make in makers:
        with pytest.raises(ValueError, match=f"^a length of {count} is more than 1000000, "):
            make()
    with pytest.raises(ValueError, match="bytes, and there are "):
        ranges.first(count)
    text = f"^count is {count}, and VSDVS_SetPrivateVLANMap: entries has 2$"
    with pytest.raises(ValueError, match=text):
        vs.VSDVS_SetPrivateVLANMap(switch, entries, count)


def test_fewer_elements_than_a_call_is_told(switch: str, switch_id: str) -> None:
    ids, mtu = Cell("qex_uint16", [1, 2]), Cell("qex_uint32", 1500)
    with pytest.raises(ValueError, match="^count is 3, and VSQEX_GetRuntimeOptions: ids has 2$"):
        vs.VSQEX_GetRuntimeOptions(ids.pointer, 3)
    given = (switch_id, vs.VSPROP_MTU, mtu.pointer, 5, vs.CONFIG_PROP_TYPE)
    with pytest.raises(ValueError, match="^length is 5, and DVSQEX_GlobalPropSet: data has 4$"):
        vs.DVSQEX_GlobalPropSet(*given)
    ranges = vs.new_vidrangeArray(1)
    with pytest.raises(ValueError, match="^numRanges is 2, and VSDVS_SetPortVLANPolicy: ranges "):
        vs.VSDVS_SetPortVLANPolicy(switch, "web", 1, -1, False, False, ranges, 2)


def test_a_cell_without_elements_is_no_output(switch: str, switch_id: str) -> None:
    with pytest.raises(ValueError, match="^VSDVS_GetMTU: mtu has no element for the call to fill$"):
        vs.VSDVS_GetMTU(switch, Cell("qex_uint32", []).pointer)
    nothing: Any = Cell("VSLAGTable *", [])
    with pytest.raises(ValueError, match="^VSQEX_GetLAGTable: table has no element"):
        vs.VSQEX_GetLAGTable(switch, nothing)
    data: Any = Cell("void *", [])
    with pytest.raises(ValueError, match="^DVSQEX_StateGet: state has no element"):
        vs.DVSQEX_StateGet(data.pointer, Cell("int").pointer)


def test_a_table_of_groups_has_them_as_elements(switch: str) -> None:
    """By hand, for what the fields tell: two groups, with two uplinks and none."""
    name, header = 32, 88
    held = Cell("qex_uint8", [0] * (4 + header + 2 * name + header))
    memory: Any = bytearray(bytes(held))
    memory[0] = 2
    memory[4 + 8 : 4 + 12] = b"lag1"
    memory[4 + 84] = 2
    memory[4 + header : 4 + header + 4] = b"nic0"
    memory[4 + header + name : 4 + header + name + 4] = b"nic1"
    memory[4 + header + 2 * name + 8 : 4 + header + 2 * name + 12] = b"lag2"
    held = Cell("qex_uint8", list(memory))
    table: Any = from_memory("VSLAGTable", held)
    assert len(table) == 2 == table.numLAGs
    assert [bytes(group.name).rstrip(b"\0") for group in table] == [b"lag1", b"lag2"]
    assert [[str(one) for one in group.uplinkNames] for group in table] == [["nic0", "nic1"], []]
    assert table[-1] == table[1] and table[0] in table
    table.numLAGs = 3
    with pytest.raises(IndexError, match="would lie past the memory of its list$"):
        list(table)
    table.numLAGs = 2
    table[0].numUplinks = 9
    with pytest.raises(ValueError, match="counts 9 elements"):
        table[0].uplinkNames


def from_memory(name: str, held: Any) -> Any:
    """A record in memory that a test has filled."""
    from libvswitch import _records

    record = _records.record_at(name, int(held))
    record.__dict__["_end"] = int(held) + len(held)
    record.__dict__["_held"] = held
    return record


def test_a_table_of_groups_of_the_host(switch: str) -> None:
    lags = Cell("VSLAGTable *")
    assert vs.VSQEX_GetLAGTable(switch, lags) == vs.QEX_OK
    with vs.owned(lags):
        table: Any = lags.value
        assert list(table) == [] and len(table) == 0


def test_sessions_are_texts_without_padding(switch: str) -> None:
    _, ids = vs.VSQEX_GetDVMirrorSessionIDs(switch)
    made = Cell("qex_uint8", list(bytes([0, 0, 0, 0, 1, 0, 0, 0]) + b"audit".ljust(32, b"\0")))
    mine: Any = from_memory("VSDVMirrorSessionIDs", made)
    assert list(mine) == list(mine.entries) == ["audit"] and "audit" in mine
    assert "entries=['audit']" in repr(mine)
    vs.VSQEX_FreeMemory(ids)


NUL = "web\0evil"


def test_a_text_with_a_nul_is_refused_by_name(switch: str) -> None:
    info: Any = vs.VSTeamPolicy()
    name: Any = vs.qex_Name()
    refused: List[Any] = [
        ("VSDVS_AddDVPort: port", lambda: vs.VSDVS_AddDVPort(switch, NUL, 7)),
        ("VSDVS_DestroyVSwitch: switchName", lambda: vs.VSDVS_DestroyVSwitch(NUL)),
        (
            "VSDVS_RemoveDVMirrorSession: sid",
            lambda: vs.VSDVS_RemoveDVMirrorSession(switch, "web", NUL),
        ),
        ("DVSAliasToPortsetName: alias", lambda: vs.DVSAliasToPortsetName(NUL)),
        ("qex_Name.string", lambda: setattr(name, "string", NUL)),
        ("text", lambda: info.__setitem__(0, NUL)),
    ]
    for where, use in refused:
        with pytest.raises(ValueError, match=f"^{where} is a text without a NUL, .* not 'web"):
            use()
    with pytest.raises(ValueError, match="^a text has no NUL in it"):
        info.uplinkPortName[0] = NUL
    assert vs.DVPortExist(switch, "web") is False  # the switch's alias is no identifier


def test_a_text_is_no_boolean(switch: str) -> None:
    entry: Any = vs.VSMACEntry()
    wrong: Any = "1"
    with pytest.raises(TypeError, match="^VSMACEntry.aging is True or False, not '1'$"):
        entry.aging = wrong
    text = "^VSDVS_SetTxUplinkAlways: enabled is True or False, not '1'$"
    with pytest.raises(TypeError, match=text):
        vs.VSDVS_SetTxUplinkAlways(switch, "web", wrong)
    for value in (True, 1):
        assert vs.VSDVS_SetTxUplinkAlways(switch, "web", value) == vs.QEX_OK


def test_addresses_of_no_known_form_are_read_as_the_host_counts_them(
    monkeypatch: pytest.MonkeyPatch,
) -> None:
    """A host may know a mode whose form nobody here does: where its record ends is not guessed."""
    _, port = vs.VSDVS_DvPortIDToPortID("vswitch0", "web-1")
    igmp, unknown = vs.VS_MCAST_FILTER_MODE_IGMP, vs.VS_MCAST_FILTER_MODE_SNOOPING
    known = _libvswitch.VSQEX_GetMcastFilters
    monkeypatch.setattr(
        _libvswitch, "VSQEX_GetMcastFilters", lambda of, at, mode: known(of, at, igmp)
    )
    with vs.owned(vs.VSQEX_GetMcastFilters("vswitch0", port, unknown)) as (status, filters):
        assert status == vs.QEX_OK and filters is not None
        assert [*filters.ipv4Entries] == [int.from_bytes(bytes([239, 1, 1, 1]), "little")]


def test_an_address_shorter_than_its_form_is_refused(switch: str) -> None:
    _, port = vs.VSDVS_DvPortIDToPortID(switch, "web")
    for mode, size in (
        (vs.VS_MCAST_FILTER_MODE_LEGACY, 6),
        (vs.VS_MCAST_FILTER_MODE_IGMP, 4),
        (vs.VS_MCAST_FILTER_MODE_MLD, 16),
    ):
        text = (
            f"^VSQEX_GetMcastFilterStats: group is {size} bytes with mode {mode}, not {size - 1}$"
        )
        with pytest.raises(ValueError, match=text):
            vs.VSQEX_GetMcastFilterStats(switch, port, mode, bytes(size - 1))
        status, stats = vs.VSQEX_GetMcastFilterStats(switch, port, mode, bytes(size))
        assert (status, stats) == (vs.QEX_NOT_FOUND, None)
    wrong: Any = "text"
    with pytest.raises(TypeError, match="^VSQEX_GetMcastFilterStats: group is bytes, not str$"):
        vs.VSQEX_GetMcastFilterStats(switch, port, vs.VS_MCAST_FILTER_MODE_IGMP, wrong)
    with pytest.raises(ValueError, match="^mac_str is 6 bytes, not 5$"):
        vs.VSMACEntry().set_mac_address(bytes(5))


def test_bytes_of_a_field_come_from_memory_that_has_them() -> None:
    info: Any = vs.VSInfo()
    with pytest.raises(ValueError, match="^this array takes 128 bytes, and there are 3$"):
        info.dvsName = Cell("unsigned char", b"abc").pointer
    entry: Any = vs.VSMACEntry()
    with pytest.raises(ValueError, match="^VSMACEntry.macAddress takes 6 bytes, and there are 3$"):
        entry.macAddress = Cell("unsigned char", b"abc").pointer


def test_a_class_of_the_callers_own_works() -> None:
    class Owning(vs.VSInfo):
        thisown = property(lambda self: True)  # type: ignore[assignment]  # as some tools do

    class Named(vs.VSUplinks):
        note = "mine"

    owning, named = Owning(), Named(2)
    owning.mtu = 9000
    assert owning.mtu == 9000 and owning.thisown is True and "mtu=9000" in repr(owning)
    assert list(named) == ["", ""] and repr(named).startswith("Named(")
    assert _libvswitch.VSInfo_mtu_get(owning) == 9000
    # Pointers go on being instances of the class that there is for them.
    assert type(vs.VSMACEntry()[0]) is vs.VSMACEntry
