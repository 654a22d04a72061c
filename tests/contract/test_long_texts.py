"""Texts of the host that are longer than a wrapper can measure in an int."""

import ctypes
import mmap
import os
import resource
from typing import Iterator

import calls
import pytest
import results
from calls import Call
from recording_host import RecordingHost
from results import PointerTo

TOO_LONG = 2**31
PIECE = 1 << 24

MAP_FIXED = 0x10
FAILED = ctypes.c_void_p(-1).value

TEXT_CALLS = [call for call in calls.ALL if call.result == "text"]


@pytest.fixture(name="text", scope="module")
def fixture_text() -> Iterator[int]:
    """The address of a text of so many bytes, in little memory: one piece of it, over and over."""
    libc = ctypes.CDLL(None, use_errno=True)
    libc.mmap.restype = ctypes.c_void_p
    libc.mmap.argtypes = [
        ctypes.c_void_p,
        ctypes.c_size_t,
        ctypes.c_int,
        ctypes.c_int,
        ctypes.c_int,
        ctypes.c_long,
    ]
    libc.munmap.argtypes = [ctypes.c_void_p, ctypes.c_size_t]

    file = os.memfd_create("text")
    os.write(file, b"x" * PIECE)
    # The page after the text is the zeros that end it.
    size = TOO_LONG + mmap.PAGESIZE
    anonymous = mmap.MAP_PRIVATE | mmap.MAP_ANONYMOUS
    start = libc.mmap(None, size, mmap.PROT_READ, anonymous, -1, 0)
    assert start != FAILED, os.strerror(ctypes.get_errno())
    for place in range(start, start + TOO_LONG, PIECE):
        fixed = mmap.MAP_SHARED | MAP_FIXED
        assert libc.mmap(place, PIECE, mmap.PROT_READ, fixed, file, 0) == place
    os.close(file)
    yield start
    assert libc.munmap(start, size) == 0


@pytest.fixture(name="little_memory")
def fixture_little_memory() -> Iterator[None]:
    """Meanwhile the process gets no more than half of what such a text takes."""
    with open("/proc/self/statm", encoding="ascii") as statm:
        used = int(statm.read().split()[0]) * mmap.PAGESIZE
    soft, hard = resource.getrlimit(resource.RLIMIT_AS)
    resource.setrlimit(resource.RLIMIT_AS, (used + TOO_LONG // 2, hard))
    yield
    resource.setrlimit(resource.RLIMIT_AS, (soft, hard))


@calls.each(TEXT_CALLS)
def test_a_text_of_2_gib_comes_as_a_pointer(host: RecordingHost, call: Call, text: int) -> None:
    host.answer(call.name, text)
    expected = PointerTo(frozenset(["char *", "qex_Bool *"]), text, False)
    assert results.described(call(*call.given())) == expected


@calls.each(TEXT_CALLS)
def test_a_text_of_one_byte_less_is_to_be_a_str(
    host: RecordingHost, call: Call, text: int, little_memory: None
) -> None:
    """Which finds no memory here, and so costs none."""
    host.answer(call.name, text + 1)
    with pytest.raises(MemoryError):
        call(*call.given())
