"""Cells: memory of one C type for calls that read or fill it, and functions that C may call."""

import ctypes
import weakref
from typing import TYPE_CHECKING, Any, Callable, Dict, Iterable, List, Optional, Tuple, Union

from libvswitch import _arrays, _layout, _locks, _memory, _ownership, _pointers, _records


class Pointer(_records._Pointing):
    """A pointer to memory that it keeps alive."""

    def __init__(self, address: int, spelling: str, owner: object) -> None:
        pointer = _pointers.pointer_object(address, spelling)
        _pointers.attach(self, pointer)
        self.__dict__["_owner"] = owner

    def __repr__(self) -> str:
        return f"<{type(self).__name__} to {int(self):#x}>"


class Cell(_records._Pointing):
    """Memory that holds one value of a C type, or several.

    >>> mtu = Cell('qex_uint32')
    >>> VSDVS_GetMTU('tour', mtu.pointer)
    0
    >>> mtu.value
    9000

    The type is an integer of up to 64 bits, under any of its names; `void *` or a handle; or a
    pointer to a record that a call allocates so, such as `VSLAGTable *`. Integers start as zero,
    pointers as null. `Cell(type, 7)` starts with a value, `Cell(type, [1, 2, 3])` holds three, and
    bytes are as many of one byte each.
    """

    def __init__(
        self, type: str, value: Union[None, int, bytes, Iterable[int], _records.Record, Any] = None
    ) -> None:
        if not isinstance(type, str):
            raise TypeError(f"a cell's type is a str, not {type.__class__.__name__}")
        if hasattr(self, "this"):
            raise TypeError("this Cell has its memory already")
        held = self.__dict__
        held["_type"] = type.strip()
        held["_deallocator"] = None
        held["_is_scalar"] = _memory.is_scalar(self.type)
        spelling = self._spelled_pointer()
        many = isinstance(value, Iterable) and not isinstance(value, _records._Pointing)
        # What `many` says of the value, a type checker does not see.
        values: List[Any] = list(value) if many else [value]  # type: ignore[arg-type]
        held["_is_single"] = not many
        # What pointers here read as: the same object as long as they stay the same. It is kept
        # alive, and where it was put in, what it points to.
        held["_seen"] = {}
        # What a call said of the pointer that it left here: the place, how many bytes are there,
        # and these bytes where they are a view that nothing keeps.
        held["_left"] = (0, None, None)
        kind: Any = _memory.scalar(self.type) if self._is_scalar else ctypes.c_void_p
        held["_memory"] = (kind * len(values))()
        address = ctypes.addressof(self._memory)
        held["_end"] = address + len(bytes(self._memory))
        held["_pointer"] = Pointer(address, spelling, self)
        # The runtime then takes a cell for its pointer.
        _pointers.attach(self, self.pointer.this)
        for index, one in enumerate(values):
            if one is not None:
                self[index] = one

    _type: str
    _deallocator: Optional[str]
    _is_scalar: bool
    _is_single: bool
    _seen: Dict[int, Any]
    _left: Tuple[int, Optional[int], Optional[bytes]]
    _memory: Any
    _pointer: Pointer

    @property
    def type(self) -> str:
        return self._type

    @property
    def pointer(self) -> Pointer:
        """The pointer to the cell, which calls take."""
        return self._pointer

    @property
    def deallocator(self) -> Optional[str]:
        """The call that releases what a call left here."""
        return self._deallocator

    if not TYPE_CHECKING:

        def __setattr__(self, name: str, value: Any) -> None:
            if name != "value":
                return super().__setattr__(name, value)
            self[0] = value

    @property
    def value(self) -> Any:
        """The value; of several, the first.

        A pointer reads as a record, as a plain pointer object, or as None if it is null. What a
        call of the library has put here is for `owned` to release.
        """
        return self[0]

    @value.setter
    def value(self, value: Any) -> None:
        self[0] = value

    def __getitem__(self, index: int) -> Any:
        index = _memory.position(index, len(self))
        if self._is_scalar:
            return self._memory[index]
        with _pointing:
            return self._object_at(index)

    def _object_at(self, index: int) -> Any:
        """What a pointer reads as: of several threads, all get the same."""
        held = self._memory[index]
        if not held:
            return None
        seen = self._seen.get(index)
        address = -1 if seen is None else int(seen)
        if not address:  # its memory goes, and this cell is about to learn it
            self._point(index, None)
            return None
        if address != held:
            target = self._target()
            seen = _records.record_at(target, held) if target != "void" else _plain(held)
            _ownership.allocated(seen, self._deallocator)
            left, size, _ = self._left
            if left == held and size is not None:
                seen.__dict__["_end"] = held + size
            self._see(index, seen)
        return seen

    def __setitem__(self, index: int, value: Any) -> None:
        index = _memory.position(index, len(self))
        if self._is_scalar:
            self._memory[index] = _memory.checked(self.type, value)
            return
        with _pointing:
            self._point(index, value)

    def _point(self, index: int, value: Any) -> None:
        if value is None:
            self._memory[index] = None
            self._seen.pop(index, None)
            return
        pointing = self._pointing(value)
        self._see(index, pointing)
        self._memory[index] = int(pointing)
        if not self._memory[index]:  # it went in between, and may not have found this cell
            self._point(index, None)
            pointing._require()

    def _withdraw(self, gone: _records._Pointing) -> List[Tuple[Any, int, Any]]:
        """Makes the pointers null that read as an object whose memory goes; says which."""
        with _pointing:
            found = [index for index, seen in self._seen.items() if seen is gone]
            for index in found:
                self._point(index, None)
        return [(self, index, gone) for index in found]

    def __len__(self) -> int:
        return len(self._memory)

    def __iter__(self) -> Any:
        return (self[index] for index in range(len(self)))

    def __bytes__(self) -> bytes:
        """The memory of the cell itself."""
        return bytes(self._memory)

    def read(self, length: int) -> bytes:
        """So many bytes of what a pointer in this cell points to.

        A ValueError for more bytes than there are, and where no call said how many that is.
        """
        self._require_pointers()
        count = _memory.length(length)
        pointing = self[0]
        if pointing is None:
            raise ValueError("the pointer is null")
        address, size, shown = self._left
        if shown is not None and address == int(pointing):
            available: Optional[int] = len(shown)
        else:
            shown, available = None, _records.room(pointing)
        if available is None:
            raise ValueError(f"nothing tells how many bytes this {self.type} points to")
        if count > available:
            raise ValueError(f"{count} bytes are more than the {available} that there are")
        return _pointers.read_memory(pointing, 0, count) if shown is None else shown[:count]

    def _filled(self, deallocator: Optional[str], size: Optional[int], is_view: bool) -> None:
        """Notes what a call left here: who releases it, how many bytes it has. A view is copied,
        for nothing tells when it ends."""
        self.__dict__["_deallocator"] = deallocator
        held = self._memory[0] or 0
        shown = ctypes.string_at(held, size) if is_view and held and size is not None else None
        self.__dict__["_left"] = (held, size, shown)
        self._seen.pop(0, None)

    def __repr__(self) -> str:
        held = self.value if self._is_single else list(self)
        return f"Cell({self.type!r}, {held!r})"

    def _allocated(self) -> List[_records._Pointing]:
        self._require_pointers()
        return [held for held in self if held is not None]

    def _require_pointers(self) -> None:
        if self._is_scalar:
            raise TypeError(f"a cell of {self.type} points to nothing")

    def _pointing(self, value: Any) -> _records._Pointing:
        """What a pointer reads as that is set to this value."""
        if self._target() != "void":
            return _records.wanted(self._target(), value)
        if isinstance(value, (_records.Record, _arrays.Array)):
            value._require()
        if isinstance(value, Pointer):
            return value
        view: _records._Pointing = _records.place_in(
            value, _plain(_pointers.address_of(value), value)
        )
        return view

    def _see(self, index: int, pointing: _records._Pointing) -> None:
        pointing.__dict__.setdefault("_cells", weakref.WeakSet()).add(self)
        self._seen[index] = pointing

    def _target(self) -> str:
        """What pointers here point to: a record, or nothing that C knows."""
        is_named = self.type in _layout.POINTERS
        return "void" if is_named else self.type.rpartition("*")[0].strip()

    def _spelled_pointer(self) -> str:
        """How the runtime spells a pointer to this type: without the names that are one in C."""
        if self._is_scalar:
            return f"{_layout.SCALARS.get(self.type, self.type)} *"
        if self._target() in ("void", *_layout.POINTEE_RECORDS):
            return f"{self._target()} **"
        records = ", ".join(f"{name} *" for name in _layout.POINTEE_RECORDS)
        raise TypeError(
            f"no cell can hold a {self.type!r}; it holds an integer such as int or qex_uint32, "
            f"void *, {', '.join(_layout.POINTERS)}, {records}"
        )


def cell_of(argument: Any) -> Optional[Cell]:
    """The cell that an argument is or points to."""
    if isinstance(argument, Pointer):
        argument = argument.__dict__["_owner"]
    return argument if isinstance(argument, Cell) else None


def filled(
    argument: Any, deallocator: Optional[str], length: Any = None, is_view: bool = False
) -> None:
    """Notes what a call left in the cell of an argument; its length may be in a cell, too."""
    cell = cell_of(argument)
    if cell is not None:
        size = length if length is None or isinstance(length, int) else cell_of(length)
        cell._filled(deallocator, size.value if isinstance(size, Cell) else size, is_view)


class Callback(_records._Pointing):
    """A function that the library may call for each item of a walk.

    It is called with the item's handle and with the context that the walk was given, each a pointer
    or None. A result that is false ends the walk; None does not. What it raises ends the walk too,
    and `reraise` raises it.
    """

    _TYPE = ctypes.CFUNCTYPE(ctypes.c_byte, ctypes.c_void_p, ctypes.c_void_p)

    _function: Callable[[Any, Any], Any]
    _raised: List[BaseException]
    _contexts: List[Any]
    _thunk: Any
    _pointer: Pointer

    def __init__(self, function: Callable[[Any, Any], Any]) -> None:
        if not callable(function):
            raise TypeError(f"a callback is a function, not {type(function).__name__}")
        if hasattr(self, "this"):
            raise TypeError("this Callback has its function already")
        # Through here nothing of what the function raises is lost, even before its first line.
        raised: List[BaseException] = []
        thunk = self._TYPE(_pointers.guarded(self._call, raised))
        address = ctypes.cast(thunk, ctypes.c_void_p).value or 0
        pointer = Pointer(address, "DVSwitchCallback", self)
        self.__dict__.update(
            _function=function, _raised=raised, _contexts=[], _thunk=thunk, _pointer=pointer
        )
        _pointers.attach(self, pointer.this)

    @property
    def pointer(self) -> Pointer:
        """The pointer to the function, which calls take."""
        return self._pointer

    def _call(self, item: Optional[int], context: Optional[int]) -> Any:
        handle = _plain(item) if item else None
        return self._function(handle, self._context(context))

    def _context(self, address: Optional[int]) -> Optional[Pointer]:
        if not address:
            return None
        given = self._contexts[-1] if self._contexts else None
        pointer = _plain(address)
        is_given = isinstance(given, _records._Pointing) and int(given) == address
        if is_given:
            _records.place_in(given, pointer)
        return pointer

    def reraise(self) -> None:
        """Raises what the function raised in the last walk, once; nothing if it did not."""
        raised = list(self._raised)
        self._raised.clear()
        if raised:
            raise raised[0]


def walk(call: Callable[..., None], before: Tuple[Any, ...], function: Any, context: Any) -> None:
    """A walk over the state with a Python function where C wants one, which may raise."""
    if not isinstance(function, Callback):
        if not callable(function):
            return call(*before, function, context)
        function = Callback(function)
    function._contexts.append(context)
    try:
        call(*before, function, context)
    finally:
        function._contexts.pop()
        function.reraise()


def _plain(address: int, owner: object = None) -> Pointer:
    return Pointer(address, "void *", owner)


# Held while a pointer in a cell becomes an object, or an object a pointer in a cell.
_pointing = _locks.RLock()
