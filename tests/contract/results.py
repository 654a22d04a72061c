"""How a result of each kind crosses: what the host returns, and what Python then gets."""

import re
from dataclasses import dataclass
from functools import lru_cache
from typing import Any, Dict, FrozenSet, List, NamedTuple, Tuple, Union

import arguments
import scalars
from recording_host import Value


class PointerTo(NamedTuple):
    """What can be said of a pointer object."""

    spellings: FrozenSet[str]
    address: int
    own: bool


class Answer(NamedTuple):
    """What the host returns, and what Python gets."""

    told: Value
    expected: Any


def described(value: Any) -> Any:
    """A result in terms that compare by type as well as by value; a bool is no int here."""
    if type(value).__name__ == "SwigPyObject":
        match = re.fullmatch(r"<Swig Object of type '(.+)' at 0x[0-9a-f]+>", repr(value))
        assert match, repr(value)
        return PointerTo(arguments.spellings_of(match[1]), int(value), value.own())
    if type(value) is list:
        return [described(item) for item in value]
    return (type(value), value)


def expected(answer: Answer) -> Any:
    """What Python gets, in the terms of described()."""
    value = answer.expected
    return value if isinstance(value, PointerTo) else (type(value), value)


@dataclass(frozen=True)
class IntegerResult:
    """An integer with its sign, or without one."""

    low: int
    high: int

    def samples(self) -> List[Answer]:
        middle = self.high // 2 + 1
        return [
            Answer(value, value) for value in (0, 1, self.low, self.high, middle, self.low // 2)
        ]


@dataclass(frozen=True)
class StatusResult:
    """A status: returned, whatever it says."""

    def samples(self) -> List[Answer]:
        low, high = scalars.SIGNED_32
        return [Answer(value, value) for value in (0, 0x0BAD0001, 0x2BAD0000, 1, -1, low, high)]


# As the host may write them and as they come back: a surrogate for each byte that is not UTF-8.
TEXTS: List[Tuple[bytes, str]] = [
    (b"", ""),
    (b"plain", "plain"),
    ("größe-\N{SNOWMAN}-\U0001f600".encode(), "größe-\N{SNOWMAN}-\U0001f600"),
    (b"bad \xff byte", "bad \udcff byte"),
    (b"\xc3", "\udcc3"),
    (b"\xed\xa0\x80", "\udced\udca0\udc80"),
]


@dataclass(frozen=True)
class TextResult:
    """A text of the library, or none."""

    def samples(self) -> List[Answer]:
        texts = [Answer(told, expected) for told, expected in TEXTS]
        return [Answer(None, None), *texts, Answer(b"x" * 70_000, "x" * 70_000)]


@dataclass(frozen=True)
class BufferResult:
    """A text that the library writes into a buffer, which has room for one more byte.

    One that is up to twice as long harms nothing, which a build with sanitizers would notice.
    """

    limit: int

    def samples(self) -> List[Answer]:
        limit = self.limit
        return [
            *(Answer(told + b"\0", expected) for told, expected in TEXTS),
            Answer(b"seen\0unseen", "seen"),
            Answer(b"x" * limit + b"\0", "x" * limit),
            Answer(b"x" * (limit + 1), "x" * limit),
            Answer(b"x" * (2 * limit + 1) + b"\0", "x" * limit),
            Answer(b"x" * (limit - 1) + "é".encode(), "x" * (limit - 1) + "\udcc3"),
            Answer(b"\xff" * (limit + 1), "\udcff" * limit),
        ]


@dataclass(frozen=True)
class CharacterResult:
    """One byte as a text."""

    def samples(self) -> List[Answer]:
        bytes_of_ascii = [Answer(byte, chr(byte)) for byte in (0, 1, 65, 127)]
        return [
            *bytes_of_ascii,
            Answer(0x80, "\udc80"),
            Answer(0xE9, "\udce9"),
            Answer(-1, "\udcff"),
        ]


@dataclass(frozen=True)
class PointerResult:
    """A pointer that Python does not own, or None."""

    type: str

    def samples(self) -> List[Answer]:
        spellings = arguments.spellings_of(self.type)
        addresses = (0x1000, 2**64 - 16)
        pointers = [Answer(place, PointerTo(spellings, place, False)) for place in addresses]
        return [Answer(0, None), *pointers]


@dataclass(frozen=True)
class NoResult:
    """None."""

    def samples(self) -> List[Answer]:
        return [Answer(None, None)]


Result = Union[
    BufferResult,
    CharacterResult,
    IntegerResult,
    NoResult,
    PointerResult,
    StatusResult,
    TextResult,
]

_NAMED: Dict[str, Result] = {
    "status": StatusResult(),
    "int": IntegerResult(*scalars.SIGNED_32),
    "unsigned": IntegerResult(*scalars.UNSIGNED_32),
    "byte": IntegerResult(-128, 127),
    "text": TextResult(),
    "character": CharacterResult(),
    "None": NoResult(),
}


@lru_cache(maxsize=None)
def kind(name: str) -> Result:
    """The kind of result that the table of functions calls so."""
    buffer = re.fullmatch(r"text \[(\d+)\]", name)
    if buffer:
        return BufferResult(int(buffer.group(1)))
    return _NAMED[name] if name in _NAMED else PointerResult(name)
