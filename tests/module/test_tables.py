"""Tables that queries return: filters, MAC tables, mirror session identifiers, destinations."""

import ctypes
import sys
from typing import Any

import pytest

import _libvswitch as vs
import methods
import native
import peer


def counts(total: int, present: int) -> bytes:
    return total.to_bytes(4, "little") + present.to_bytes(4, "little")


# Multicast filters and their statistics

MACS = bytes.fromhex("01005e0000fb" "3333ffabcdef")
IPV4S = bytes([224, 0, 0, 251, 239, 255, 255, 250])
IPV6S = bytes.fromhex("ff02" + "00" * 13 + "fb" + "ff05" + "00" * 11 + "010003")


@pytest.mark.parametrize(
    "record, header, method, entries, texts",
    [
        ("VSMcastFilters", 8, "get_mac_entry", MACS, ["01:00:5e:00:00:fb", "33:33:ff:ab:cd:ef"]),
        ("VSMcastFilters", 8, "get_ip_entry", IPV4S, ["224.0.0.251", "239.255.255.250"]),
        ("VSMcastFilters", 8, "get_ipv6_entry", IPV6S, ["ff02::fb", "ff05::1:3"]),
        ("VSMcastFilterStats", 28, "get_ip_entry", IPV4S, ["224.0.0.251", "239.255.255.250"]),
        ("VSMcastFilterStats", 28, "get_ipv6_entry", IPV6S, ["ff02::fb", "ff05::1:3"]),
    ],
    ids=lambda value: value if isinstance(value, str) else "",
)
def test_entries_are_read_as_texts_whatever_the_counts_say(
    capfd: Any, record: str, header: int, method: str, entries: bytes, texts: Any
) -> None:
    size = len(entries) // 2
    data = bytes(header) + entries + bytes(size)
    block = methods.Block(f"{record} *", data, in_front=bytes(size))
    read = getattr(vs, f"{record}_{method}")
    for index in (0, 1):
        assert methods.said(capfd, read, block.record, index) == (texts[index], "")
    zeros = read(block.record, 2)
    assert methods.said(capfd, read, block.record, -1) == (zeros, "")
    assert zeros in ("00:00:00:00:00:00", "0.0.0.0", "::")


# MAC tables

ENTRIES = bytes(range(1, 37))


@pytest.fixture
def table() -> methods.Block:
    """A MAC table with two entries, no two of their bytes alike."""
    return methods.Block("VSMACTable *", counts(2, 2) + ENTRIES)


def test_entries_are_copies_that_python_owns(capfd: Any, table: methods.Block) -> None:
    entries = vs.VSMACTable_macEntries_get(table.record)
    before = table.bytes
    for index in (0, 1):
        copy, out = methods.said(capfd, vs.VSMACEntry___getitem__, entries, index)
        assert out == ""
        with methods.owned(copy, vs.delete_VSMACEntry):
            assert "'struct VSMACEntry *'" in repr(copy)
            assert native.read(copy, 18) == ENTRIES[18 * index : 18 * (index + 1)]
            vs.VSMACEntry_vni_set(copy, 0)
    assert table.bytes == before


def test_entries_are_read_at_any_index(table: methods.Block) -> None:
    second = peer.pointer_object(table.address + 8 + 18, "VSMACEntry *")
    with methods.owned(vs.VSMACEntry___getitem__(second, -1), vs.delete_VSMACEntry) as copy:
        assert vs.VSMACEntry_macAddress_get(copy) == "01:02:03:04:05:06"


@pytest.fixture
def entry() -> methods.Block:
    return methods.Block("VSMACEntry *", b"\xee" * 18)


@pytest.mark.parametrize(
    "address",
    [
        bytes.fromhex("001122334455"),
        bytearray.fromhex("001122334455"),
        memoryview(bytes.fromhex("001122334455")),
        memoryview(bytearray.fromhex("99001122334455"))[1:],
        bytes.fromhex("001122334455") + b"and more",
        (ctypes.c_ubyte * 6)(0x00, 0x11, 0x22, 0x33, 0x44, 0x55),
    ],
    ids=lambda address: type(address).__name__,
)
def test_an_address_is_set_from_raw_bytes(entry: methods.Block, address: Any) -> None:
    assert vs.VSMACEntry_set_mac_address(entry.record, address) is None
    assert entry.bytes == bytes.fromhex("001122334455") + b"\xee" * 12
    assert vs.VSMACEntry_macAddress_get(entry.record) == "00:11:22:33:44:55"


def test_an_address_is_bytes_and_no_text(entry: methods.Block) -> None:
    vs.VSMACEntry_set_mac_address(entry.record, b"00:11:22:33:44:55")
    assert entry.bytes[:6] == b"00:11:"


def test_six_bytes_are_taken_whatever_the_length(entry: methods.Block) -> None:
    whole = bytearray.fromhex("001122334455")
    for length in (0, 3, 5):
        native.write(entry.record, bytes(6))
        vs.VSMACEntry_set_mac_address(entry.record, memoryview(whole)[:length])
        assert entry.bytes[:6] == whole


def test_a_buffer_is_released(entry: methods.Block) -> None:
    address = bytearray(6)
    vs.VSMACEntry_set_mac_address(entry.record, address)
    address.append(0)  # a BufferError while somebody holds the bytes
    with pytest.raises(ValueError):
        vs.VSMACEntry_set_mac_address(None, address)
    address.append(0)


# Mirror session identifiers


@pytest.fixture
def ids() -> methods.Block:
    entries = b"first".ljust(32, b"\0") + b"x" * 32 + b"\0a\xff".ljust(32, b"\0")
    return methods.Block("VSDVMirrorSessionIDs *", counts(9, 2) + entries)


@pytest.mark.parametrize("index, expected", [(0, b"first" + bytes(27)), (1, b"x" * 32)])
def test_an_identifier_is_all_of_its_bytes(
    capfd: Any, ids: methods.Block, index: int, expected: bytes
) -> None:
    method = vs.VSDVMirrorSessionIDs___getitem__
    assert methods.said(capfd, method, ids.record, index) == (expected, "")


@pytest.mark.parametrize("index", [2, 3, 2**31 - 1, -1, -(2**31)])
def test_an_identifier_out_of_bounds_fails_without_an_error(
    capfd: Any, ids: methods.Block, index: int
) -> None:
    if methods.DEBUG_INTERPRETER:
        program = (
            "import _libvswitch as vs\n"
            f"vs.VSDVMirrorSessionIDs___getitem__(vs.new_VSDVMirrorSessionIDs(), {index})"
        )
        methods.aborts(program, "returned NULL without setting an exception")
        return

    def failure() -> str:
        with pytest.raises(SystemError) as caught:
            vs.VSDVMirrorSessionIDs___getitem__(ids.record, index)
        return str(caught.value)

    function = "<built-in function VSDVMirrorSessionIDs___getitem__>"
    what = "error" if sys.version_info < (3, 10) else "exception"
    text = f"{function} returned NULL without setting an {what}"
    assert methods.said(capfd, failure) == (text, methods.NOTICE)


# Destinations of promiscuous sessions


@pytest.fixture
def destinations() -> methods.Block:
    entries = bytes.fromhex("01000000" "02000080" "03000000")
    return methods.Block("VSPromiscSessionActiveDsts *", counts(9, 2) + entries)


def test_destinations_are_views_into_the_record(capfd: Any, destinations: methods.Block) -> None:
    for index, port in enumerate([1, 2**31 + 2]):
        method = vs.VSPromiscSessionActiveDsts___getitem__
        view, out = methods.said(capfd, method, destinations.record, index)
        assert out == ""
        assert int(view) == destinations.address + 8 + 4 * index
        assert not view.own()
        assert peer.address_at(view) == port


def test_a_destination_is_replaced(destinations: methods.Block) -> None:
    port = methods.Block("qex_SwitchPortID *", b"\xfc\xfd\xfe\xff")
    expected = methods.patched(destinations.bytes, 12, b"\xfc\xfd\xfe\xff")
    method = vs.VSPromiscSessionActiveDsts___setitem__
    assert method(destinations.record, 1, port.record) is None
    assert destinations.bytes == expected
    # What is read may be written, under any spelling of its type.
    first = vs.VSPromiscSessionActiveDsts___getitem__(destinations.record, 0)
    method(destinations.record, 1, first)
    assert destinations.bytes[8:16] == bytes.fromhex("01000000" "01000000")


@pytest.mark.parametrize("index", [2, 3, 2**31 - 1, -1, -(2**31)])
def test_a_destination_out_of_bounds_is_noticed(
    capfd: Any, destinations: methods.Block, index: int
) -> None:
    before = destinations.bytes
    noticed = (None, methods.NOTICE)
    reading = (vs.VSPromiscSessionActiveDsts___getitem__, destinations.record, index)
    assert methods.said(capfd, *reading) == noticed
    port = methods.Block("qex_SwitchPortID *", bytes(4))
    writing = (vs.VSPromiscSessionActiveDsts___setitem__, destinations.record, index, port.record)
    assert methods.said(capfd, *writing) == noticed
    assert destinations.bytes == before
