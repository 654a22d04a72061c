"""What the tests of methods share: records in blocks of their own, allocators, and the notice."""

import ctypes
import subprocess
import sys
from contextlib import contextmanager
from typing import Any, Callable, Iterator, Tuple

import peer

# What an index out of bounds makes a method write to standard output, without a line break.
NOTICE = "Invalid array index."

# The most that the allocator adds to a size: it rounds up to 16 bytes, and by as much again when a
# rest is too small to keep.
ROUNDING = 32

DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")

libc = ctypes.CDLL(None)
libc.malloc.argtypes = [ctypes.c_size_t]
libc.malloc.restype = ctypes.c_void_p
libc.free.argtypes = [ctypes.c_void_p]
libc.malloc_usable_size.argtypes = [ctypes.c_void_p]
libc.malloc_usable_size.restype = ctypes.c_size_t
_M_PERTURB = -6


class Block:
    """A record in memory of the test's own, which may begin in front of the record.

    The block must outlive the record's pointer object.
    """

    def __init__(self, spelling: str, data: bytes, in_front: bytes = b"") -> None:
        whole = in_front + data
        self._buffer = ctypes.create_string_buffer(whole, len(whole))
        self.address = ctypes.addressof(self._buffer) + len(in_front)
        self.record = peer.pointer_object(self.address, spelling)

    @property
    def bytes(self) -> bytes:
        """All bytes, those in front of the record included."""
        return self._buffer.raw


def patched(data: bytes, offset: int, replacement: bytes) -> bytes:
    """The data with some of its bytes replaced."""
    return data[:offset] + replacement + data[offset + len(replacement) :]


def said(capfd: Any, function: Callable[..., Any], *arguments: Any) -> Tuple[Any, str]:
    """The result of a call, and what it wrote to C's standard output."""
    libc.fflush(None)
    capfd.readouterr()
    result = function(*arguments)
    libc.fflush(None)
    return result, capfd.readouterr().out


def aborts(program: str, text: str) -> None:
    """Fails unless a program ends as a debug interpreter ends one that breaks its rules."""
    assert DEBUG_INTERPRETER
    done = subprocess.run([sys.executable, "-c", program], capture_output=True, text=True)
    assert done.returncode == -6
    assert text in done.stderr


@contextmanager
def owned(record: Any, delete: Callable[[Any], Any]) -> Iterator[Any]:
    """A record that Python must own, deleted at the end."""
    assert record.own()
    try:
        yield record
    finally:
        assert delete(record) is None
        assert not record.own()


def usable_size(record: Any) -> int:
    """How many bytes the allocator gave a record."""
    return int(libc.malloc_usable_size(int(record)))


@contextmanager
def fresh_memory_is_not_zero() -> Iterator[Callable[[int], bytes]]:
    """Meanwhile what fills fresh memory with zeros is seen; yields what such memory holds."""

    def contents(size: int) -> bytes:
        address = libc.malloc(size)
        found = ctypes.string_at(address, size)
        libc.free(address)
        assert found != bytes(size), "fresh memory shows nothing if it is zero"
        return found

    libc.mallopt(_M_PERTURB, 0x5A)
    try:
        yield contents
    finally:
        libc.mallopt(_M_PERTURB, 0)
