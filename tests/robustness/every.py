"""Every flat function with the kinds of its arguments, and valid values for them."""

import ctypes
from dataclasses import dataclass
from typing import Any, Callable, Dict, FrozenSet, List, Tuple

import _libvswitch as vs
import arguments
import fields
import functions
import peer
import records
from arguments import (
    AnyPointerKind,
    ArrayKind,
    BooleanKind,
    FunctionKind,
    IntegerKind,
    Kind,
    PointerKind,
    Sample,
    TextKind,
)

# Each pointer leads into a block of its own, far enough in that a small index of either sign stays
# inside. Whatever is a count there says 2, and so does whatever is a type.
ROOM = 1 << 15
BLOCKS = 9
USED = 1 << 12
_PATTERN = b"\x02\0\0\0" * (2 * USED // 4)
_ARENA = ctypes.create_string_buffer(ROOM * BLOCKS)
_TEXT = ctypes.create_string_buffer(b"text")

libc = ctypes.CDLL(None)
libc.free.argtypes = [ctypes.c_void_p]


class AnyObject(Kind):
    """Anything at all."""

    def plain(self, position: int) -> Sample:
        return Sample(type("Shadow", (), {}), None)

    def refused(self) -> List[arguments.Refused]:
        return []


class BufferKind(Kind):
    """Six bytes of an object that has a buffer."""

    def plain(self, position: int) -> Sample:
        return Sample(b"\x02\0\0\0\0\x01", None)

    def refused(self) -> List[arguments.Refused]:
        return [(value, TypeError) for value in (None, 1, "abcdef", [], object())]


@dataclass(frozen=True)
class Function:
    """A function of the module, or one form of it."""

    kind: str
    name: str
    arguments: Tuple[Kind, ...]
    result: str

    @property
    def makes_memory(self) -> bool:
        """Whether its result is the caller's to free."""
        return self.result.startswith("own ") or self.name.startswith("alloc_")

    @property
    def takes_memory(self) -> bool:
        """Whether it frees what its argument leads to."""
        return self.kind == "destructor" or self.name.startswith("free_")

    def function(self) -> Callable[..., Any]:
        found: Callable[..., Any] = getattr(vs, self.name)
        return found


def spellings(kind: Kind) -> FrozenSet[str]:
    """The spellings of the pointer type that an argument of this kind is."""
    if isinstance(kind, PointerKind):
        return frozenset(arguments.spellings_of(kind.type))
    if isinstance(kind, (TextKind, ArrayKind)):
        return frozenset(["char *"])
    return frozenset([kind.type]) if isinstance(kind, FunctionKind) else frozenset()


def block(position: int) -> int:
    """Where the pointers of a position lead."""
    return ctypes.addressof(_ARENA) + ROOM * position + ROOM // 2


POOL = 8
"""The position, after those of all arguments, of what takes an argument's place."""


def refresh(positions: int) -> None:
    """Fill anew the memory of the first positions, and of what takes an argument's place.

    A count that another call wrote there would lead out of the memory that there is.
    """
    for position in (*range(positions), POOL):
        ctypes.memmove(block(position) - USED, _PATTERN, len(_PATTERN))


def pointer(spelling: str, position: int) -> Any:
    """A pointer object that Python does not own; a text's leads to a text."""
    address = ctypes.addressof(_TEXT) if spelling == "char *" else block(position)
    return peer.pointer_object(address, spelling)


def release(result: Any) -> None:
    """Free what a function that makes memory has made."""
    if result is not None:
        raw = getattr(result, "this", result)
        libc.free(int(raw))
        raw.disown()


class Plain:
    """Valid arguments of a function; those that it will free are made for each call."""

    def __init__(self, function: Function) -> None:
        self._function = function
        self._values = [
            self._value(kind, position) for position, kind in enumerate(function.arguments)
        ]

    def __call__(self) -> List[Any]:
        values = list(self._values)
        if self._function.takes_memory:
            values[0] = self._made()
        return values

    def _made(self) -> Any:
        name = self._function.name
        if name.startswith("free_"):
            return vs.alloc_dvmirror_session_table(1, 1)
        record = name[len("delete_") :]
        if record in fields.RECORDS:
            return fields.make(fields.RECORDS[record])
        return getattr(vs, f"new_{record}")(2)

    @staticmethod
    def _value(kind: Kind, position: int) -> Any:
        if isinstance(kind, (IntegerKind, BooleanKind)):
            return 1
        if isinstance(kind, (PointerKind, FunctionKind)):
            return pointer(min(spellings(kind)), position)
        if isinstance(kind, AnyPointerKind):
            return pointer("void *", position)
        return kind.plain(position).given


def _kind(function: functions.Function, c_type: str) -> Kind:
    case = _WRITERS.get(function.name)
    if (
        case
        and c_type != case.pointer
        and case.field.kind in ("array", "array2", "flexible", "mac")
    ):
        return PointerKind(fields.pointer_type(case))
    if c_type == "object":
        return AnyObject()
    if c_type == "size_t":
        return IntegerKind(0, 2**64 - 1)
    if c_type == "char *":
        return TextKind()
    if c_type == "(unsigned char *mac_str, SIZE)":
        return BufferKind()
    if c_type in _RECORDS:
        return PointerKind(f"{c_type} *")
    return arguments.kind(c_type)


_RECORDS = records.read()
_WRITERS: Dict[str, fields.Case] = {case.writer: case for case in fields.ALL}

ALL: List[Function] = [
    Function(
        function.kind,
        function.name,
        tuple(_kind(function, c_type) for c_type in function.arguments if c_type != "..."),
        function.result,
    )
    for function in functions.read()
]
