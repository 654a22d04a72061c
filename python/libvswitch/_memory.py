"""Values of C types in memory: numbers, texts and bytes, and how many of them there may be."""

import ctypes
import operator
from typing import Any, Dict, Type

from libvswitch import _layout, _pointers

SIMPLE: Dict[str, Type[Any]] = {
    "signed char": ctypes.c_byte,
    "unsigned char": ctypes.c_ubyte,
    "short": ctypes.c_short,
    "unsigned short": ctypes.c_ushort,
    "int": ctypes.c_int,
    "unsigned int": ctypes.c_uint,
    "long long": ctypes.c_longlong,
    "unsigned long long": ctypes.c_ulonglong,
}
# A char holds the bytes of a text or a truth; both are numbers here.
SIMPLE["char"] = ctypes.c_ubyte

RECORD_SIZES = _pointers.record_sizes()
ARRAY_OFFSETS = _pointers.array_offsets()

POINTER_SIZE = ctypes.sizeof(ctypes.c_void_p)

# No list of a host comes near, and memory for more is a mistake of the caller's.
MOST_ELEMENTS = 1_000_000


def scalar(name: str) -> Type[Any]:
    """The ctypes form of a scalar, under whichever name; KeyError for what is none."""
    return SIMPLE[_layout.SCALARS.get(name, name)]


def is_scalar(name: str) -> bool:
    return _layout.SCALARS.get(name, name) in SIMPLE


def size_of(name: str) -> int:
    """Bytes of a record or a scalar."""
    return RECORD_SIZES[name] if name in RECORD_SIZES else ctypes.sizeof(scalar(name))


def checked(name: str, value: Any) -> int:
    """The value as an integer that a scalar of this type can hold; OverflowError if it cannot."""
    if isinstance(value, bytes) and len(value) == 1:
        value = value[0]
    if not isinstance(value, int):
        raise TypeError(f"{name} takes an int, not {type(value).__name__}")
    if scalar(name)(value).value != value:
        raise OverflowError(f"{value} does not fit into a {name}")
    return value


def position(index: Any, count: int) -> int:
    """Which of so many elements an index means; a negative one counts from the end."""
    at = _whole(index, "indices must be integers")
    if not -count <= at < count:
        raise IndexError(f"index {at} is not within {count} elements")
    return at % count


def length(given: Any) -> int:
    """A number of elements that a caller names."""
    count = _whole(given, "a length must be an integer")
    if count < 0:
        raise ValueError("a length is not negative")
    return count


def length_to_make(given: Any) -> int:
    """Likewise, of elements that memory is to be made for."""
    count = length(given)
    if count > MOST_ELEMENTS:
        raise ValueError(f"a length of {count} is more than {MOST_ELEMENTS}, the most there may be")
    return count


def _whole(given: Any, rule: str) -> int:
    try:
        return operator.index(given)
    except TypeError:
        raise TypeError(f"{rule}, not {type(given).__name__}") from None


def number_in(name: str, held: bytes) -> int:
    """The number that the memory of a scalar holds."""
    return int(scalar(name).from_buffer_copy(held).value)


def scalar_bytes(name: str, value: Any) -> bytes:
    """What memory of a scalar holds for a value."""
    return bytes(scalar(name)(checked(name, value)))


def text_in(held: bytes) -> str:
    """The text in an array of chars, which a NUL may end."""
    return held.split(b"\0", 1)[0].decode("utf-8", "surrogateescape")


def text_bytes(size: int, text: Any) -> bytes:
    """Text, NUL and zeros to the end of an array of chars; ValueError if it does not fit."""
    if not isinstance(text, str):
        raise TypeError(f"a text is a str, not {type(text).__name__}")
    held = text.encode("utf-8", "surrogateescape")
    if len(held) >= size:
        raise ValueError(f"{text!r} takes more than {size - 1} bytes")
    if b"\0" in held:
        raise ValueError(f"a text has no NUL in it, as {text!r} has")
    return held.ljust(size, b"\0")


def exact_bytes(size: int, given: Any) -> bytes:
    """As many bytes as there is room for."""
    if not isinstance(given, (bytes, bytearray, memoryview)):
        raise TypeError(f"bytes are wanted, not {type(given).__name__}")
    held = bytes(given)
    if len(held) != size:
        raise ValueError(f"{size} bytes are wanted, not {len(held)}")
    return held
