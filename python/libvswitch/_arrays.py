"""Arrays: elements of one C type in memory of the host, as sequences."""

import ctypes
import typing
from typing import Any, List, Optional, TypeVar, overload

from libvswitch import _memory, _pointers, _records

__all__ = ["Array"]

T = TypeVar("T")

_ADDRESS_SIZE = 6
# How many elements of a long array are printed.
_PRINTED = 16


class Array(_records._Pointing, typing.Sequence[T]):
    """Elements of one C type, one after the other in memory.

    Numbers read as `int`, arrays of chars as `str`, arrays of bytes as `bytes`, records as views.
    An array whose length only the data around it tells has none: `first(n)` gives one that has.
    Records and calls make arrays; nothing else does.
    """

    _element: str
    _count: Optional[int]
    _inner: int

    def __init__(self) -> None:
        raise TypeError("arrays are made by records and calls")

    @property
    def size(self) -> int:
        """Bytes of an element."""
        return self._inner or _memory.size_of(self._element)

    def first(self, count: int) -> "Array[T]":
        """The same array with a length that the caller knows."""
        self._require()
        known = _memory.length(count)
        _records.require_room(self, known * self.size, f"an array of {known} elements")
        shorter: Array[T] = made(_pointers.same_place(self), self._element, known, self._inner)
        _records.place_in(self, shorter)
        return shorter

    def __len__(self) -> int:
        self._require()
        if self._count is None:
            raise TypeError("only the data around this array tells its length; see first()")
        return self._count

    def __iter__(self) -> typing.Iterator[T]:
        for index in range(len(self)):
            yield self[index]

    @overload
    def __getitem__(self, index: int) -> T:
        ...

    @overload
    def __getitem__(self, index: slice) -> List[T]:
        ...

    def __getitem__(self, index: Any) -> Any:
        if isinstance(index, slice):
            return [self[at] for at in range(*index.indices(len(self)))]
        offset = self._offset_of(index)
        if not self._inner and self._element in _records.CLASSES:
            element = _records.record_at(self._element, int(self) + offset)
            return _records.place_in(self, element)
        held = _pointers.read_memory(self, offset, self.size)
        if self._inner:
            return _memory.text_in(held) if self._element == "char" else held
        return _memory.number_in(self._element, held)

    @overload
    def __setitem__(self, index: int, value: T) -> None:
        ...

    @overload
    def __setitem__(self, index: slice, value: typing.Iterable[T]) -> None:
        ...

    def __setitem__(self, index: Any, value: Any) -> None:
        if not isinstance(index, slice):
            _pointers.write_memory(self, self._offset_of(index), self._bytes_for(value))
            return
        places = range(*index.indices(len(self)))
        # Read before the first is written: a value may be a view of an element here.
        values = [self._bytes_for(one) for one in value]
        if len(values) != len(places):
            raise ValueError(f"{len(places)} elements are wanted, not {len(values)}")
        for at, held in zip(places, values):
            _pointers.write_memory(self, at * self.size, held)

    def __bytes__(self) -> bytes:
        """The memory of all elements."""
        return _pointers.read_memory(self, 0, len(self) * self.size)

    def __eq__(self, other: object) -> bool:
        """Whether the elements are equal to those of another sequence."""
        if isinstance(other, bytes):
            return bytes(self) == other
        if isinstance(other, typing.Sequence):
            return list(self) == list(other)
        return NotImplemented

    __hash__ = None  # type: ignore[assignment]  # lists have none either

    def __repr__(self) -> str:
        if not int(self):
            return "<array that is gone>"
        if self._count is None:
            return "<array whose length is not known>"
        if self._element == "unsigned char" and not self._inner:
            return repr(bytes(self).rstrip(b"\0"))
        parts = [_records.shown(value) for value in self[:_PRINTED]]
        return f"[{', '.join(parts)}{', ...' if self._count > _PRINTED else ''}]"

    if not typing.TYPE_CHECKING:

        def __setattr__(self, name: str, value: Any) -> None:
            raise AttributeError("an array's attributes cannot be set; its elements can")

    def _require(self) -> None:
        if not int(self):
            raise ValueError("this array is gone: its memory was released")

    def _bytes_for(self, value: Any) -> bytes:
        """What memory of an element holds for a value."""
        if self._inner and self._element == "char":
            return _memory.text_bytes(self._inner, value)
        if self._inner:
            return _memory.exact_bytes(self._inner, value)
        if self._element in _records.CLASSES:
            return _pointers.read_memory(_records.wanted(self._element, value), 0, self.size)
        return _memory.scalar_bytes(self._element, value)

    def _offset_of(self, index: Any) -> int:
        return _memory.position(index, len(self)) * self.size


def made(pointer: Any, element: str, count: Optional[int], inner: int = 0) -> "Array[Any]":
    """The array at a pointer: its elements, how many, and the bytes of one that is an array."""
    array: Array[Any] = Array.__new__(Array)
    _pointers.attach(array, pointer)
    array.__dict__.update(_element=element, _count=count, _inner=inner)
    return array


def in_record(
    owner: Any, pointer: Any, element: str, count: Optional[int], inner: int = 0
) -> "Array[Any]":
    """The array that is a field of a record."""
    array = made(getattr(pointer, "this", pointer), element, count, inner)
    _records.place_in(owner, array)
    return array


def at(record: Any, element: str, count: int) -> "Array[Any]":
    """The array of which a record that the caller owns is the first element."""
    array = made(record.this, element, count)
    array.__dict__["_end"] = int(record) + count * array.size
    return array


def fill(array: "Array[Any]", value: Any, write: Any) -> None:
    """Writes an array that is a field: elements one by one, or those at a pointer."""
    if isinstance(value, (list, tuple, bytes, Array)):
        array[:] = value
        return
    if isinstance(value, _records._Pointing) and array._count is not None:
        _records.require_room(value, len(array) * array.size, "this array")
    write(array.__dict__["_owner"], value)


def write_address(where: str, write: Any, record: Any, value: Any) -> None:
    """Writes a hardware address: what its reader gives, six bytes, or those at a pointer."""
    if isinstance(value, str):
        value = bytes.fromhex(value.replace(":", " "))
    if isinstance(value, bytes):
        if len(value) != _ADDRESS_SIZE:
            raise ValueError(f"{where} is {_ADDRESS_SIZE} bytes, not {len(value)}")
        held = (ctypes.c_ubyte * _ADDRESS_SIZE)(*value)
        value = _pointers.pointer_object(ctypes.addressof(held), "unsigned char *")
        write(record, value)
        return
    if isinstance(value, _records._Pointing):
        _records.require_room(value, _ADDRESS_SIZE, where)
    write(record, value)
