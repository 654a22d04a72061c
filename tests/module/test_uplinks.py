"""The lists of uplinks: their sized constructors, and their entries by index."""

import ctypes
import mmap
import os
from dataclasses import dataclass
from typing import Any, Iterator

import pytest

import _libvswitch as vs
import methods
import native
import peer


@dataclass(frozen=True)
class Kind:
    """A list, and what the three differ in: room for an entry, way to the next one, its text."""

    name: str
    header: int
    room: int
    stride: int
    slot: int

    def call(self, method: str, *arguments: Any) -> Any:
        return getattr(vs, f"{self.name}_{method}")(*arguments)

    def length(self, uplinks: Any) -> Any:
        return self.call("__len__", uplinks)

    def get(self, uplinks: Any, index: int) -> Any:
        return self.call("__getitem__", uplinks, index)

    def set(self, uplinks: Any, index: int, text: Any) -> Any:
        return self.call("__setitem__", uplinks, index, text)

    def new(self, count: int) -> Any:
        return getattr(vs, f"new_{self.name}")(count)

    def delete(self, uplinks: Any) -> Any:
        return getattr(vs, f"delete_{self.name}")(uplinks)

    def count(self, number: int) -> bytes:
        """A header with this count, which is its last field."""
        return b"\xdd" * (self.header - 4) + number.to_bytes(4, "little")

    def offset(self, index: int) -> int:
        return self.header + index * self.stride

    def block(self, count: int = 3, filling: bytes = b"\xee") -> methods.Block:
        """A list with room for all it claims."""
        return methods.Block(f"{self.name} *", self.count(count) + filling * self.stride * count)


KINDS = [
    Kind("VSUplinks", header=8, room=32, stride=36, slot=32),
    Kind("VSUplinkPorts", header=4, room=81, stride=81, slot=81),
    Kind("VSUplinkPortIds", header=4, room=48, stride=48, slot=48),
]


@pytest.fixture(params=KINDS, ids=[kind.name for kind in KINDS])
def kind(request: Any) -> Kind:
    found: Kind = request.param
    return found


# Constructors


@pytest.mark.parametrize("count", [4, 200])
def test_a_list_is_made_with_its_room_and_its_count_alone(kind: Kind, count: int) -> None:
    size = kind.header + kind.room * count
    with methods.owned(kind.new(count), kind.delete) as uplinks:
        assert f"'struct {kind.name} *'" in repr(uplinks)
        assert kind.length(uplinks) == count
        assert size <= methods.usable_size(uplinks) < size + methods.ROUNDING


def test_nothing_but_the_count_of_a_new_list_is_set(kind: Kind) -> None:
    count = 45
    size = kind.header + kind.room * count
    with methods.fresh_memory_is_not_zero() as contents:
        expected = methods.patched(contents(size), kind.header - 4, count.to_bytes(4, "little"))
        with methods.owned(kind.new(count), kind.delete) as uplinks:
            assert native.read(uplinks, size) == expected


def test_a_list_of_uplinks_claims_more_than_it_has_room_for() -> None:
    with methods.owned(vs.new_VSUplinks(200), vs.delete_VSUplinks) as uplinks:
        assert vs.VSUplinks___len__(uplinks) == 200
        assert methods.usable_size(uplinks) < 8 + 36 * 200


def test_a_list_may_be_empty(kind: Kind) -> None:
    with methods.owned(kind.new(0), kind.delete) as uplinks:
        assert kind.length(uplinks) == 0


@pytest.mark.parametrize("count", [-1, -4, -(2**31)])
def test_a_negative_count_makes_nothing(kind: Kind, count: int) -> None:
    assert kind.new(count) is None


# Entries


@pytest.mark.parametrize("count", [0, 3, 2**31, 2**32 - 1])
def test_the_length_is_the_count_as_an_unsigned_number(kind: Kind, count: int) -> None:
    block = methods.Block(f"{kind.name} *", kind.count(count))
    assert kind.length(block.record) == count


def test_entries_are_read_as_texts(capfd: Any, kind: Kind) -> None:
    block = kind.block()
    for index, (stored, text) in enumerate(
        [
            (b"uplink1", "uplink1"),
            (b"gr\xc3\xbc\xc3\x9fe", "gr\u00fc\u00dfe"),
            (b"\xffa", "\udcffa"),
        ]
    ):
        native.write(block.record, stored + b"\0", kind.offset(index))
        assert methods.said(capfd, kind.get, block.record, index) == (text, "")
    native.write(block.record, b"\0", kind.offset(1))
    assert kind.get(block.record, 1) == ""


def test_an_entry_without_a_terminator_is_read_up_to_the_next_nul(kind: Kind) -> None:
    block = kind.block()
    native.write(block.record, b"x" * kind.slot + b"\x41\x42\0", kind.offset(0))
    assert kind.get(block.record, 0) == "x" * kind.slot + "AB"


def test_a_short_text_is_padded(kind: Kind) -> None:
    for text in ("", "a", "uplink1", "x" * (kind.slot - 1)):
        block = kind.block()
        stored = text.encode().ljust(kind.slot, b"\0")
        expected = methods.patched(block.bytes, kind.offset(1), stored)
        assert kind.set(block.record, 1, text) is None
        assert block.bytes == expected
        assert kind.get(block.record, 1) == text


def test_a_text_that_fills_its_slot_has_no_terminator(kind: Kind) -> None:
    for length in (kind.slot, kind.slot + 1, 5000):
        block = kind.block(filling=b"\0")
        expected = methods.patched(block.bytes, kind.offset(2), b"x" * kind.slot)
        assert kind.set(block.record, 2, "x" * length) is None
        assert block.bytes == expected


def test_a_text_is_cut_between_its_bytes(kind: Kind) -> None:
    block = kind.block(filling=b"\0")
    text = "x" * ((kind.slot + 1) % 2) + "\u00e9" * kind.slot
    kind.set(block.record, 0, text)
    stored = text.encode()[: kind.slot]
    assert native.read(block.record, kind.slot, kind.offset(0)) == stored
    assert kind.get(block.record, 0) == stored[:-1].decode() + "\udcc3"


def test_a_text_ends_at_its_first_nul(kind: Kind) -> None:
    block = kind.block()
    kind.set(block.record, 0, "ab\0cd")
    stored = native.read(block.record, kind.slot, kind.offset(0))
    assert stored == b"ab".ljust(kind.slot, b"\0")


@pytest.mark.parametrize("index", [3, 4, 2**31 - 1, -1, -3, -(2**31)])
def test_an_index_that_is_not_below_the_count_is_noticed(
    capfd: Any, kind: Kind, index: int
) -> None:
    block = kind.block(3)
    before = block.bytes
    assert methods.said(capfd, kind.get, block.record, index) == (None, methods.NOTICE)
    assert methods.said(capfd, kind.set, block.record, index, "ab") == (None, methods.NOTICE)
    assert block.bytes == before


def test_no_index_lies_below_a_count_of_nothing(capfd: Any, kind: Kind) -> None:
    block = kind.block(0)
    assert methods.said(capfd, kind.get, block.record, 0) == (None, methods.NOTICE)


def test_the_last_negative_index_lies_below_no_count(capfd: Any, kind: Kind) -> None:
    block = methods.Block(f"{kind.name} *", kind.count(2**32 - 1))
    assert methods.said(capfd, kind.get, block.record, -1) == (None, methods.NOTICE)


# Texts that are too long for a str

_PAGE = mmap.PAGESIZE
_PIECE = 16 * 2**20


@pytest.fixture
def endless() -> Iterator[int]:
    """The address of 2 GiB of text after a page of zeros, one piece of memory again and again."""
    size = _PAGE + 2**31 + _PAGE
    piece = os.memfd_create("text")
    os.write(piece, b"x" * _PIECE)
    libc = methods.libc
    libc.mmap.restype = ctypes.c_void_p
    libc.mmap.argtypes = [ctypes.c_void_p, ctypes.c_size_t, *[ctypes.c_int] * 3, ctypes.c_long]
    libc.munmap.argtypes = [ctypes.c_void_p, ctypes.c_size_t]
    access = mmap.PROT_READ | mmap.PROT_WRITE
    fixed = 0x10
    start = libc.mmap(None, size, access, mmap.MAP_PRIVATE | mmap.MAP_ANONYMOUS, -1, 0)
    text = start + _PAGE
    for address in range(text, text + 2**31, _PIECE):
        assert libc.mmap(address, _PIECE, access, mmap.MAP_SHARED | fixed, piece, 0) == address
    yield text
    libc.munmap(start, size)
    os.close(piece)


def test_a_text_of_2_gib_is_a_char_pointer(endless: int) -> None:
    ports = peer.pointer_object(endless - 4, "VSUplinkPorts *")
    native.write(ports, b"\1\0\0\0")
    text = vs.VSUplinkPorts___getitem__(ports, 0)
    assert "'char *'" in repr(text)
    assert int(text) == endless
    assert not text.own()
