"""Records as objects: sequences, arrays, printing, and memory that stays while it is seen."""

import copy
import os
import pickle
import subprocess
import sys
from typing import Any, Callable, List

import libvswitch as vs
import pytest


def test_a_list_is_a_sequence(switch: str) -> None:
    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (status, uplinks):
        assert (status, len(uplinks)) == (vs.QEX_OK, 2)
        names = [name for name in uplinks]
        assert names == [uplinks[0], uplinks[1]] == [uplinks[-2], uplinks[-1]]
        assert len(set(names)) == 2 and "" not in names
        assert names[0] in uplinks
        assert [entry.name.string for entry in uplinks.entries] == names


@pytest.mark.parametrize(
    "made, length",
    [
        (lambda: vs.VSUplinks(3), 3),
        (lambda: vs.VSUplinkPorts(3), 3),
        (lambda: vs.VSUplinkPortIds(3), 3),
        (vs.VSTeamPolicy, 32),
        (lambda: vs.alloc_dvmirror_session_table(2, 3), 2),
        (vs.VSDVMirrorSessionIDs, 0),
        (vs.VSPromiscSessionActiveDsts, 0),
        (vs.VSMACTable, 0),
    ],
)
def test_an_index_out_of_range_raises(
    made: Callable[[], Any], length: int, capfd: pytest.CaptureFixture[str]
) -> None:
    table = made()
    assert len(table) == length == len(list(table))
    for index in (length, -length - 1, 2**40):
        with pytest.raises(IndexError):
            table[index]
        if hasattr(type(table), "__setitem__"):
            with pytest.raises(IndexError):
                table[index] = table[0] if length else 1
    assert capfd.readouterr() == ("", "")


def test_a_mac_table_is_a_sequence_of_its_entries(switch: str) -> None:
    mine: Any = vs.VSMACEntry()
    mine.macAddress = "02:00:00:00:00:07"
    mine.macAddrType = vs.VS_MAC_ADDR_TYPE_USER
    assert vs.VSQEX_SetPortMACTable(switch, "web", mine) == vs.QEX_OK
    with vs.owned(vs.VSQEX_GetPortMACTable(switch, "web", vs.VS_MAC_ADDR_TYPE_ALL)) as result:
        status, table = result
        assert (status, len(table)) == (vs.QEX_OK, table.numEntries)
        assert [*table] == [table[index] for index in range(len(table))] == [*table.macEntries]
        assert "02:00:00:00:00:07" in [entry.macAddress for entry in table]
        assert table[-1] == table.macEntries[-1] and table[0] in table
        with pytest.raises(IndexError, match=f"^index {len(table)} is not within"):
            table[len(table)]
        entry = table[0]
    uses: List[Callable[[], Any]] = [lambda: entry.macAddress, lambda: table[0], lambda: [*table]]
    for use in uses:
        with pytest.raises(ValueError):
            use()


@pytest.mark.parametrize("make", [vs.VSUplinks, vs.VSUplinkPorts, vs.VSUplinkPortIds])
def test_a_list_of_the_callers_has_room_for_what_it_claims(make: Callable[[int], Any]) -> None:
    for length in (0, 1, 7, 8, 9, 100):
        names = make(length)
        assert list(names) == [""] * length
        for index in range(length):
            names[index] = f"name {index}"
        assert list(names) == [f"name {index}" for index in range(length)]
    with pytest.raises(ValueError):
        make(-1)


def test_iterating_one_entry_of_an_array_does_not_run_away() -> None:
    entries: List[Any] = [vs.VSMACEntry(), vs.VSPvlanMapEntry()]
    for entry in entries:
        with pytest.raises(TypeError):
            iter(entry)
        with pytest.raises(IndexError):
            entry[1]
        assert type(entry[0]) is type(entry)


def test_printing_shows_type_and_fields() -> None:
    learning = vs.VSPMACLearning()
    learning.learning = True
    learning.macLimit = 4096
    text = "VSPMACLearning(learning=True, flooding=False, macLimit=4096, macLimitPolicy=0)"
    assert str(learning) == repr(learning) == text
    name = vs.qex_Name()
    name.string = "uplink 1"
    assert str(name) == repr(name) == "uplink 1"
    assert "name=uplink 1" in repr(entry_named(name))


def test_printing_reads_no_view_that_may_be_longer_than_the_record() -> None:
    filters = vs.VSMcastFilters()
    filters.numEntries = 1
    views = "macEntries=..., ipv4Entries=..., ipv6Entries=..."
    text = f"VSMcastFilters(totalEntries=0, numEntries=1, {views})"
    assert repr(filters) == text
    with pytest.raises(ValueError, match="^this VSMcastFilters counts 1 elements, and has room"):
        filters.macEntries
    assert repr(filters) == text, "nor once one has been asked for"
    stats = vs.VSMcastFilterStats()
    stats.numEntries = 1
    assert repr(stats).endswith("numEntries=1, ipv4Entries=..., ipv6Entries=...)")


def entry_named(name: Any) -> Any:
    entry = vs.VSUplinks_entries()
    entry.name = name
    return entry


@pytest.mark.parametrize(
    "make",
    [
        lambda: vs.VSUplinks(1),
        vs.VSTeamPolicy,
        lambda: vs.VSUplinks(1).entries,
        lambda: vs.VSVLANBitmap().bits,
        lambda: vs.VSTeamPolicy().uplinkPortName,
        lambda: vs.new_vidrangeArray(1),
        lambda: vs.Cell("int", [1]),
        lambda: vs.Cell("void *"),
        vs.VSMACEntry,
    ],
)
def test_an_index_is_an_integer(make: Callable[[], Any]) -> None:
    elements = make()
    for index in ("a", 1.0, None, (0,)):
        text = f"^indices must be integers, not {type(index).__name__}$"
        with pytest.raises(TypeError, match=text):
            elements[index]
        if hasattr(type(elements), "__setitem__"):
            with pytest.raises(TypeError, match=text):
                elements[index] = elements[0]
    if not isinstance(elements, vs.Array):
        with pytest.raises(TypeError, match="^indices must be integers, not slice$"):
            elements[0:1]
    # As with lists, a truth is one.
    elements[False]


def test_a_length_is_an_integer() -> None:
    makers: List[Any] = [vs.VSUplinks, vs.VSUplinkPorts, vs.VSUplinkPortIds]
    makers.append(vs.VSVLANBitmap().bits.first)
    for make in makers:
        for length in ("a", 1.0, None):
            text = f"^a length must be an integer, not {type(length).__name__}$"
            with pytest.raises(TypeError, match=text):
                make(length)
        with pytest.raises(ValueError, match="^a length is not negative$"):
            make(-1)


def test_elements_take_their_type_only() -> None:
    names: Any = vs.VSTeamPolicy().uplinkPortName
    addresses: Any = vs.VSExtraEthFilter().multicastAddrs
    with pytest.raises(TypeError, match="^a text is a str, not int$"):
        names[0] = 5
    wrong: List[Any] = [5, "text", [0] * 6]
    for value in wrong:
        with pytest.raises(TypeError, match=f"^bytes are wanted, not {type(value).__name__}$"):
            addresses[0] = value
    with pytest.raises(ValueError, match="^6 bytes are wanted, not 5$"):
        addresses[0] = bytes(5)
    addresses[0] = bytearray(b"123456")
    assert addresses[0] == b"123456"


def test_a_misspelled_field_is_an_error() -> None:
    info: Any = made(vs.VSInfo)
    with pytest.raises(AttributeError, match="VSInfo has no field 'mut'"):
        info.mut = 9000
    bits: Any = vs.VSVLANBitmap().bits
    with pytest.raises(AttributeError, match="an array's attributes cannot be set"):
        bits.first_bit = 1


def test_a_truth_is_a_bool_and_takes_one() -> None:
    entry = vs.VSMACEntry()
    read = [entry.aging]
    for value in (True, False):
        entry.aging = value
        read.append(entry.aging)
    assert read == [False, True, False]
    assert {type(value) for value in read} == {bool}


def test_arrays_of_numbers() -> None:
    bitmap = vs.VSVLANBitmap()
    assert list(bitmap.bits) == [0] * 64
    bitmap.bits[3] = 2**64 - 1
    bitmap.bits[-1] = 1
    assert bitmap.bits[:5] == [0, 0, 0, 2**64 - 1, 0]
    assert bitmap.bits[63] == 1
    with pytest.raises(OverflowError):
        bitmap.bits[0] = 2**64
    with pytest.raises(IndexError):
        bitmap.bits[64]
    bitmap.bits[:] = range(64)
    assert list(bitmap.bits) == list(range(64))
    setattr(bitmap, "bits", [5] * 64)
    assert list(bitmap.bits) == [5] * 64
    with pytest.raises(ValueError):
        setattr(bitmap, "bits", [1, 2, 3])


def test_arrays_of_texts_bytes_and_records() -> None:
    policy = vs.VSTeamPolicy()
    policy.uplinkPortName[2] = "uplink3"
    assert policy[2] == policy.uplinkPortName[2] == "uplink3"
    with pytest.raises(ValueError):
        policy.uplinkPortName[2] = "x" * 81

    filter_ = vs.VSExtraEthFilter()
    filter_.multicastAddrs[1] = b"\1\0\x5e\0\0\1"
    assert filter_.multicastAddrs[:2] == [bytes(6), b"\1\0\x5e\0\0\1"]
    with pytest.raises(ValueError):
        filter_.multicastAddrs[1] = b"short"

    instances = vs.qex_MgmtInstances()
    instances.instanceNames[31].string = "last"
    assert instances.instanceNames[31].string == "last"
    assert instances.instanceNames[30].string == ""
    name = vs.qex_Name()
    name.string = "copied"
    instances.instanceNames[0] = name
    name.string = "changed"
    assert instances.instanceNames[0].string == "copied"
    with pytest.raises(TypeError):
        instances.instanceNames[0] = vs.VSInfo()


def test_elements_of_an_array_move_within_it() -> None:
    ranges = vs.new_vidrangeArray(4)
    for number, one in enumerate(ranges):
        one.minVID = number
    ranges[1:] = ranges[:3]
    assert [one.minVID for one in ranges] == [0, 0, 1, 2]
    ranges[::-1] = ranges
    assert [one.minVID for one in ranges] == [2, 1, 0, 0]


def test_of_several_elements_all_are_written_or_none() -> None:
    ranges = vs.new_vidrangeArray(2)
    ranges[0].minVID, ranges[1].minVID = 1, 2
    wrong: Any = [ranges[1], 5]
    with pytest.raises(TypeError, match="^a qex_NEBPortVIDRange is wanted, not int$"):
        ranges[:] = wrong
    with pytest.raises(ValueError, match="^2 elements are wanted, not 1$"):
        ranges[:] = [ranges[1]]
    assert [one.minVID for one in ranges] == [1, 2]


def test_an_array_without_a_length_gets_one_from_the_caller() -> None:
    options = vs.VSRuntimeOptions(64)
    option = options.get_first_option()
    options.add_int_option(option, "x", 3, 0x01020304)
    with pytest.raises(TypeError):
        len(option.data)
    with pytest.raises(TypeError):
        option.data[0]
    assert bytes(option.data.first(4)) == b"\4\3\2\1"


def made(kind: Callable[[], Any]) -> Any:
    """A record that a test gives what its type does not allow."""
    return kind()


def test_hardware_addresses_are_text_both_ways() -> None:
    entry: Any = made(vs.VSMACEntry)
    entry.macAddress = "02:00:00:00:00:0a"
    assert entry.macAddress == "02:00:00:00:00:0a"
    entry.macAddress = bytes(range(6))
    assert str(entry.macAddress) == "00:01:02:03:04:05"
    for wrong in ("02:00", b"12345", "no address"):
        with pytest.raises(ValueError):
            entry.macAddress = wrong
    with pytest.raises(TypeError):
        entry.macAddress = 7


def test_a_view_keeps_its_record_alive() -> None:
    views = []
    for number in range(200):
        info = vs.VSPortInfo()
        info.stats.pktsTx = number
        info.dvPortId[0] = number
        views.append((info.stats, info.dvPortId))
    del info
    rubbish = [vs.VSPortInfo() for _ in range(400)]
    assert [(stats.pktsTx, name[0]) for stats, name in views] == [(n, n) for n in range(200)]
    assert len(rubbish) == 400


def test_equal_means_the_same_memory() -> None:
    table = vs.alloc_dvmirror_session_table(2, 0)
    with vs.owned(table):
        assert table[0] == table.get_first_session() != table[1]
        assert hash(table[0]) == hash(table.get_first_session())
        assert int(table[1]) > int(table[0])


def run(program: str) -> "subprocess.CompletedProcess[str]":
    # AddressSanitizer would keep what is freed.
    options = f"{os.environ.get('ASAN_OPTIONS', '')}:quarantine_size_mb=1"
    return subprocess.run(
        [sys.executable, "-c", program],
        env={**os.environ, "ASAN_OPTIONS": options},
        capture_output=True,
        text=True,
    )


# Kibibytes. The peak that the system knows would begin with that of the process that ran it.
RESIDENT = """
import resource
def resident():
    with open("/proc/self/statm") as file:
        return int(file.read().split()[1]) * resource.getpagesize() // 1024
"""


def test_records_are_freed_when_collected() -> None:
    """100,000 records of 1.4 KB would be 140 MB; a second free would end the process."""
    done = run(
        RESIDENT + "import libvswitch as vs\n"
        "before = resident()\n"
        "for _ in range(100_000): vs.VSPortInfo().stats\n"
        "for _ in range(10_000): vs.VSMACEntry()[0], vs.new_vidrangeArray(8)\n"
        "print(resident() - before < 50_000)"
    )
    assert (done.returncode, done.stdout, done.stderr) == (0, "True\n", "")


def test_a_record_that_is_never_freed_would_be_noticed() -> None:
    """What the test above looks for is there when ownership is dropped."""
    done = run(
        RESIDENT + "import libvswitch as vs\n"
        "before = resident()\n"
        "for _ in range(100_000): vs.VSPortInfo().disown()\n"
        "print(resident() - before < 50_000)"
    )
    assert (done.returncode, done.stdout) == (0, "False\n")


@pytest.mark.parametrize("copied", [copy.copy, copy.deepcopy])
def test_a_copy_is_a_record_of_its_own(copied: Callable[[Any], Any], switch: str) -> None:
    info = vs.VSPortInfo()
    info.stats.pktsTx, info.dvPortId[0] = 7, 8
    other = copied(info)
    assert type(other) is vs.VSPortInfo and other != info and other.thisown
    info.stats.pktsTx = info.dvPortId[0] = 0
    assert (other.stats.pktsTx, other.dvPortId[0]) == (7, 8)
    stats = copied(other.stats)
    del other
    assert stats.pktsTx == 7 and stats.thisown

    with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
        names = list(uplinks)
        entries = [copied(entry) for entry in uplinks.entries]
    assert [entry.name.string for entry in entries] == names
    with pytest.raises(ValueError, match="^this VSUplinks_entries is gone"):
        with vs.owned(vs.VSQEX_GetUplinks(switch)) as (_, uplinks):
            entry = uplinks.entries[0]
        copied(entry)


def beyond_their_bytes() -> List[Any]:
    """What has more to it than the bytes of its record, as the headers declare it."""
    return [
        vs.VSUplinks(1),
        vs.VSRuntimeOptions(64),
        vs.VSMACTable(),
        vs.DVPortList(),
        vs.VSPortVlanPolicy(),
        vs.qex_ListLinks(),
        vs.VSVLANBitmap().bits,
        vs.new_vidrangeArray(1),
        vs.Cell("int", 5),
        vs.Cell("int").pointer,
        vs.Callback(print),
    ]


@pytest.mark.parametrize("given", beyond_their_bytes(), ids=lambda one: type(one).__name__)
@pytest.mark.parametrize("copied", [copy.copy, copy.deepcopy])
def test_what_is_more_than_its_bytes_is_not_copied(
    copied: Callable[[Any], Any], given: Any
) -> None:
    with pytest.raises(TypeError) as raised:
        copied(given)
    assert str(raised.value) == (
        f"{type(given).__name__} objects cannot be copied; "
        "records are if their bytes are all of them"
    )


@pytest.mark.parametrize("protocol", range(pickle.HIGHEST_PROTOCOL + 1))
def test_memory_is_not_pickled(protocol: int) -> None:
    for given in (vs.VSInfo(), *beyond_their_bytes()):
        with pytest.raises(TypeError) as raised:
            pickle.dumps(given, protocol)
        assert str(raised.value) == (
            f"{type(given).__name__} objects cannot be pickled; they are memory of this process"
        )
