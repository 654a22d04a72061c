"""Arrays: elements of one C type in memory of the host, as sequences."""

import ctypes
import typing
from typing import Any, List, Optional, TypeVar, overload

from libvswitch import _memory, _pointers, _records

__all__ = ["Array"]

T = TypeVar("T")

# How many elements of a long array are printed.
_PRINTED = 16


class Array(_records._Pointing, typing.Sequence[T]):
    """Elements of one C type, one after the other in memory.

    Numbers read as `int`, arrays of chars as `str`, arrays of bytes as `bytes`, records as views.
    An array whose length only the data around it tells has none: `first(n)` gives one that has.
    """

    _element: str
    _count: Optional[int]
    _inner: int
    _address: int

    def __init__(
        self,
        pointer: Any,
        element: str,
        count: Optional[int],
        inner: int = 0,
        address: Optional[int] = None,
    ) -> None:
        self.__dict__.update(
            this=pointer,
            _element=element,
            _count=count,
            _inner=inner,
            _address=_pointers.address_of(pointer) if address is None else address,
        )

    @property
    def size(self) -> int:
        """Bytes of an element."""
        if self._inner:
            return self._inner
        if self._element in _records.CLASSES:
            return _memory.RECORD_SIZES[self._element]
        return ctypes.sizeof(_memory.scalar(self._element))

    def first(self, count: int) -> "Array[T]":
        """The same array with a length that the caller knows."""
        self._require()
        known = _memory.length(count)
        shorter: Array[T] = Array(self.this, self._element, known, self._inner, self._address)
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
        address = self._address_of(index)
        if self._inner:
            if self._element == "char":
                return _memory.text_at(address, self._inner)
            return ctypes.string_at(address, self._inner)
        if self._element in _records.CLASSES:
            return _records.place_in(self, _records.record_at(self._element, address))
        return _memory.scalar(self._element).from_address(address).value

    @overload
    def __setitem__(self, index: int, value: T) -> None:
        ...

    @overload
    def __setitem__(self, index: slice, value: typing.Iterable[T]) -> None:
        ...

    def __setitem__(self, index: Any, value: Any) -> None:
        if not isinstance(index, slice):
            ctypes.memmove(self._address_of(index), self._bytes_for(value), self.size)
            return
        places = range(*index.indices(len(self)))
        # Read before the first is written: a value may be a view of an element here.
        values = [self._bytes_for(one) for one in value]
        if len(values) != len(places):
            raise ValueError(f"{len(places)} elements are wanted, not {len(values)}")
        for at, held in zip(places, values):
            ctypes.memmove(self._address_of(at), held, self.size)

    def __bytes__(self) -> bytes:
        """The memory of all elements."""
        length = len(self)
        return ctypes.string_at(self._address, length * self.size)

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
            raise ValueError("this array is gone: its memory was given back")

    def _bytes_for(self, value: Any) -> bytes:
        """What memory of an element holds for a value."""
        if self._inner and self._element == "char":
            return _memory.text_bytes(self._inner, value)
        if self._inner:
            return _memory.exact_bytes(self._inner, value)
        if self._element in _records.CLASSES:
            return ctypes.string_at(int(_records.wanted(self._element, value)), self.size)
        return _memory.scalar_bytes(self._element, value)

    def _address_of(self, index: int) -> int:
        return self._address + _memory.position(index, len(self)) * self.size
