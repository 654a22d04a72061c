"""Memory behind pointer objects: its addresses, and the values of C types in it."""

import ctypes
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


def scalar(name: str) -> Type[Any]:
    """The ctypes form of a scalar, under whichever name; KeyError for what is none."""
    return SIMPLE[_layout.SCALARS.get(name, name)]


def is_scalar(name: str) -> bool:
    return _layout.SCALARS.get(name, name) in SIMPLE


def checked(name: str, value: Any) -> int:
    """The value as an integer that a scalar of this type can hold; OverflowError if it cannot."""
    if isinstance(value, bytes) and len(value) == 1:
        value = value[0]
    if not isinstance(value, int):
        raise TypeError(f"a {name} is an int, not {type(value).__name__}")
    if scalar(name)(value).value != value:
        raise OverflowError(f"{value} does not fit into a {name}")
    return value


def text_at(address: int, size: int) -> str:
    """The text of an array of chars, which a NUL may end."""
    held: bytes = ctypes.string_at(address, size)
    return held.split(b"\0", 1)[0].decode("utf-8", "surrogateescape")


def put_text(address: int, size: int, text: str) -> None:
    """Text, NUL and zeros to the end of an array of chars; ValueError if it does not fit."""
    held = text.encode("utf-8", "surrogateescape")
    if len(held) >= size:
        raise ValueError(f"{text!r} takes more than {size - 1} bytes")
    ctypes.memmove(address, held.ljust(size, b"\0"), size)
