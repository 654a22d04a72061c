"""How an argument of each C type crosses: what Python gives, what the host sees, what is refused.

Everything here is written from what the module promises. A kind of argument knows a plain value for
each position, so that arguments which changed places are noticed, samples that cover its range, and
values that it refuses.
"""

import ctypes
import re
from dataclasses import dataclass
from functools import lru_cache
from typing import Any, FrozenSet, Iterator, List, NamedTuple, Optional, Tuple, Type
from unittest.mock import ANY

import _libvswitch as vs
import functions
import peer
import pointer_types
import scalars

Refused = Tuple[object, Type[Exception]]


class Sample(NamedTuple):
    """An argument as Python gives it and as it arrives."""

    given: Any
    seen: Any
    """What the host's parameter is then: an integer, the bytes of a text, an address, or None."""
    memory: Optional[bytes] = None
    """The bytes that it then leads to, if they are looked at."""


class Index:
    """Converts with __index__, which makes it no integer object."""

    def __index__(self) -> int:
        return 1


class Integer(int):
    """An integer object that is no plain int."""


class Text(str):
    """A str that is no plain str."""


class Bytes(bytes):
    """A bytes object of a derived type."""


class Proxy:
    """What a class over the flat functions looks like to them."""

    def __init__(self, this: Any) -> None:
        self.this = this


# Memory for pointers to lead to, more for each position than any record takes.
_ROOM = 1 << 16
_MEMORY = ctypes.create_string_buffer(bytes(range(1, 256)) * 2560)
_MEMORY_SEEN = 16

_SPELLINGS = pointer_types.read()


def spellings_of(c_type: str) -> FrozenSet[str]:
    """All spellings of the pointer type that a parameter has, which `const` does not change."""
    plain = c_type.replace(" const *", " *")
    (found,) = [spellings for spellings in _SPELLINGS if plain in spellings]
    return found


def _pointers() -> Iterator[Tuple[FrozenSet[str], Any]]:
    """A pointer object of each type, and of each type of record one more.

    Those that the module itself makes are of another Python type than those of its peer.
    """
    for offset, spellings in enumerate(_SPELLINGS):
        yield spellings, peer.pointer_object(ctypes.addressof(_MEMORY) + offset, min(spellings))
    for function in functions.read():
        if function.kind == "constructor":
            record = getattr(vs, function.name)(*(4096 for _ in function.arguments))
            record.disown()
            yield spellings_of(function.result.replace("own ", "")), record


_POINTERS = list(_pointers())

_NO_POINTERS = [(value, TypeError) for value in (1, 0, "a", b"a", [], 1.0, object(), Proxy(1))]


def address(position: int) -> int:
    """Memory of the argument at a position, filled with a pattern."""
    assert 0 <= position and (position + 1) * _ROOM < len(_MEMORY)
    return ctypes.addressof(_MEMORY) + position * _ROOM


def pointers_but(c_type: str) -> List[Refused]:
    """Pointer objects of every type but one, which refuses them all."""
    own = spellings_of(c_type)
    return [(pointer, TypeError) for spellings, pointer in _POINTERS if spellings != own]


class Kind:
    """The rules for arguments of one C type."""

    def plain(self, position: int) -> Sample:
        """A value that no other position has."""
        raise NotImplementedError

    def samples(self) -> List[Sample]:
        """Values that pass."""
        raise NotImplementedError

    def refused(self) -> List[Refused]:
        """Values that do not convert, each with the type of the error."""
        raise NotImplementedError


@dataclass(frozen=True)
class IntegerKind(Kind):
    """An integer object between two bounds."""

    low: int
    high: int

    @property
    def signed(self) -> bool:
        return self.low < 0

    def plain(self, position: int) -> Sample:
        return Sample(position, position)

    def samples(self) -> List[Sample]:
        # The interpreter keeps integers in digits of 30 bits.
        edges = [2**30 - 1, 2**30, -(2**30) + 1, -(2**30)]
        values = [self.low, self.high, 0, 1, self.high // 2 + 1, True, Integer(7)]
        values += [value for value in edges if self.low <= value <= self.high]
        return [Sample(value, int(value)) for value in values]

    def refused(self) -> List[Refused]:
        no_integers: Tuple[object, ...] = (1.0, "1", b"1", None, [], Index(), object())
        outside = [self.low - 1, self.high + 1, -(2**63)]
        outside += [2**63 - 1] if self.signed else [2**63, 2**64 - 1]
        # A signed reading of what is further out fails only after the call.
        beyond = [] if self.signed else [2**64, -(2**63) - 1]
        return [
            *((value, TypeError) for value in no_integers),
            *((value, OverflowError) for value in outside),
            *((value, TypeError) for value in beyond),
        ]


@dataclass(frozen=True)
class BooleanKind(Kind):
    """One byte: as an integer, or as a text of at most one byte."""

    def plain(self, position: int) -> Sample:
        return Sample(position, position)

    def samples(self) -> List[Sample]:
        numbers = [Sample(value, int(value)) for value in (0, 1, 127, -1, -128, True, Integer(7))]
        return [*numbers, Sample("", 0), Sample("\0", 0), Sample("1", 49), Sample("\x7f", 127)]

    def refused(self) -> List[Refused]:
        others: Tuple[object, ...] = ("ab", "\x80", "\ud800", b"a", None, 1.0, [], Index())
        outside = (128, -129, 255, 2**63, -(2**70))
        return [
            *((value, TypeError) for value in others),
            *((value, OverflowError) for value in outside),
        ]


# Kept for good, as the pointer objects to them are.
_TEXT = ctypes.create_string_buffer("größe".encode())
_TEXT_POINTER = peer.pointer_object(ctypes.addressof(_TEXT), "char *")


@dataclass(frozen=True)
class TextKind(Kind):
    """A text of any length, or none."""

    def plain(self, position: int) -> Sample:
        return self._of(f"argument {position}")

    def samples(self) -> List[Sample]:
        texts = ("", "dvs0", "größe-\N{SNOWMAN}-\U0001f600", "y" * 300, "y" * 70_000)
        # Whatever the size of an array for short texts, one of these just does not fit it.
        lengths = (size + more for size in (16, 32, 64, 128, 256, 512, 1024) for more in (-1, 0))
        return [
            *map(self._of, texts),
            *(self._of("x" * length) for length in lengths),
            self._of(Text("derived")),
            self._of("seen\0unseen"),
            Sample(None, None),
            Sample(_TEXT_POINTER, _TEXT.value, _TEXT.raw),
            Sample(Proxy(_TEXT_POINTER), _TEXT.value, _TEXT.raw),
        ]

    def refused(self) -> List[Refused]:
        others: Tuple[object, ...] = (
            b"a",
            bytearray(b"a"),
            1,
            1.0,
            [],
            object(),
            "\ud800",
            "a\udcff",
        )
        return [*((value, TypeError) for value in others), *pointers_but("char *")]

    @staticmethod
    def _of(text: str) -> Sample:
        """C sees a text up to its first NUL, but all of it is there."""
        encoded = text.encode()
        return Sample(text, encoded.split(b"\0")[0], encoded + b"\0")


@dataclass(frozen=True)
class ArrayKind(Kind):
    """A text that with its NUL must fit an array, which is the wrapper's and filled with zeros."""

    size: int

    def plain(self, position: int) -> Sample:
        return self._of(f"array {position}"[: self.size - 1])

    def samples(self) -> List[Sample]:
        longest = self.size - 1
        texts = ("", "a", "x" * longest, "é" * (longest // 2), "a\0b", Text("derived"))
        return [
            *map(self._of, texts),
            Sample(None, ANY, bytes(self.size)),
            Sample(_TEXT_POINTER, ANY, _TEXT.value.ljust(self.size, b"\0")),
        ]

    def refused(self) -> List[Refused]:
        too_long = ("x" * self.size, "x" * (self.size + 1), "é" * (self.size // 2), "x" * 70_000)
        others: Tuple[object, ...] = (b"a", bytearray(b"a"), 1, 1.0, [], object(), "\ud800")
        return [*((value, TypeError) for value in too_long + others), *pointers_but("char *")]

    def _of(self, text: str) -> Sample:
        return Sample(text, ANY, text.encode().ljust(self.size, b"\0"))


@dataclass(frozen=True)
class PointerKind(Kind):
    """A pointer object of one type, passed by address."""

    type: str

    def plain(self, position: int) -> Sample:
        pointer = peer.pointer_object(address(position), self._spelling)
        pattern = ctypes.string_at(address(position), _MEMORY_SEEN)
        return Sample(pointer, address(position), pattern)

    def samples(self) -> List[Sample]:
        own = spellings_of(self.type)
        pointers = [pointer for spellings, pointer in _POINTERS if spellings == own]
        proxies = [Proxy(pointer) for pointer in pointers]
        return [
            Sample(None, None),
            *(Sample(pointer, int(pointer)) for pointer in pointers),
            *(Sample(proxy, int(proxy.this)) for proxy in proxies),
        ]

    def refused(self) -> List[Refused]:
        return [*_NO_POINTERS, *pointers_but(self.type)]

    @property
    def _spelling(self) -> str:
        return min(spellings_of(self.type))


@dataclass(frozen=True)
class AnyPointerKind(Kind):
    """A pointer object of any type, passed by address."""

    def plain(self, position: int) -> Sample:
        return Sample(peer.pointer_object(address(position), "void *"), address(position))

    def samples(self) -> List[Sample]:
        pointers = [Sample(pointer, int(pointer)) for _, pointer in _POINTERS]
        proxy = Proxy(_POINTERS[-1][1])
        return [Sample(None, None), *pointers, Sample(proxy, int(_POINTERS[-1][1]))]

    def refused(self) -> List[Refused]:
        return list(_NO_POINTERS)


def marked(function: int, runtime_type: str) -> Any:
    """A built-in function with the mark of a function that C may be given in its documentation."""
    digits = function.to_bytes(8, "little").hex()
    return peer.documented_function(f"Calls back.\nswig_ptr: _{digits}{runtime_type}")


@dataclass(frozen=True)
class FunctionKind(Kind):
    """A function of C: a pointer object of its type, or a built-in function with its mark."""

    type: str

    def plain(self, position: int) -> Sample:
        return Sample(peer.pointer_object(address(position), self.type), address(position))

    def samples(self) -> List[Sample]:
        pointer = peer.pointer_object(address(0), self.type)
        samples = [
            Sample(None, None),
            Sample(pointer, address(0)),
            Sample(Proxy(pointer), address(0)),
            Sample(marked(address(0), FUNCTIONS[self.type]), address(0)),
            Sample(peer.documented_function("swig_ptr: NULL"), None),
        ]
        if FUNCTIONS[self.type] == FUNCTIONS["DVSPortCallback"]:
            samples.append(Sample(peer.visit, int(peer.visit_address)))
        return samples

    def refused(self) -> List[Refused]:
        own = FUNCTIONS[self.type]
        functions = [
            lambda *arguments: None,
            len,
            print,
            peer.pointer_object,
            peer.documented_function(None),
            peer.documented_function("swig_ptr: "),
            peer.documented_function(f"swig_ptr: _nodigits{own}"),
            peer.documented_function(f"swig_ptr: {own}"),
            *(marked(address(0), other) for other in set(FUNCTIONS.values()) - {own}),
            marked(address(0), "_p_void"),
        ]
        return [
            *((function, TypeError) for function in functions),
            *_NO_POINTERS,
            *pointers_but(self.type),
        ]


def contents_of(value: bytes) -> int:
    """Where the contents of a bytes object lie."""
    get = ctypes.pythonapi.PyBytes_AsString
    get.argtypes = [ctypes.py_object]
    get.restype = ctypes.c_void_p
    found: int = get(value)
    return found


@dataclass(frozen=True)
class BytesKind(Kind):
    """The inside of a bytes object, passed by address."""

    def plain(self, position: int) -> Sample:
        return self._of(_GROUP)

    def samples(self) -> List[Sample]:
        return [self._of(value) for value in (b"", _GROUP, b"\0" * 16, Bytes(b"derived"))]

    def refused(self) -> List[Refused]:
        """None: the wrapper does not look at it before the call."""
        return []

    @staticmethod
    def _of(value: bytes) -> Sample:
        return Sample(value, contents_of(value), bytes(value) + b"\0")


_GROUP = bytes([239, 255, 0, 1])

# The function types, each with the name that the wrapper runtime gives it in marks.
FUNCTIONS = {
    "DVSwitchCallback": "_p_f_p_void_p_void__char",
    "DVSPortCallback": "_p_f_p_void_p_void__char",
    "DVSPortDataCallback": "_p_f_p_void_p_void__char",
    "DVSData_MemAlloc": "_p_f_size_t__p_void",
    "DVSData_MemFree": "_p_f_p_void__void",
}

_ANY_POINTERS = {"void *", "DVSwitchHandle", "DVSPortHandle", "DVSDataHandle", "DVSDataItem"}


@lru_cache(maxsize=None)
def kind(c_type: str) -> Kind:
    """The kind of argument that a parameter of this type takes."""
    array = re.fullmatch(r"char (?:const )?\[(\d+)\]", c_type)
    if array:
        return ArrayKind(int(array.group(1)))
    if c_type in scalars.BOUNDS:
        return IntegerKind(*scalars.BOUNDS[c_type])
    if c_type == "qex_Bool":
        return BooleanKind()
    if c_type == "char const *":
        return TextKind()
    if c_type == "bytes":
        return BytesKind()
    if c_type in FUNCTIONS:
        return FunctionKind(c_type)
    if c_type in _ANY_POINTERS:
        return AnyPointerKind()
    return PointerKind(c_type)
