"""Cells: memory of one C type for calls that read or fill it, and functions that C may call."""

import ctypes
import weakref
from typing import Any, Callable, Dict, Iterable, List, Optional, Union

from libvswitch import _arrays, _layout, _memory, _ownership, _pointers, _records


class Pointer(_records._Pointing):
    """A pointer to memory that it keeps alive."""

    def __init__(self, address: int, spelling: str, owner: object) -> None:
        self.this = _pointers.pointer_object(address, spelling)
        self._owner = owner

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
    pointer to a record that a call hands out so, such as `VSLAGTable *`. Integers start as zero,
    pointers as null. `Cell(type, 7)` starts with a value, `Cell(type, [1, 2, 3])` holds three, and
    bytes are as many of one byte each.
    """

    def __init__(
        self, type: str, value: Union[None, int, bytes, Iterable[int], _records.Record, Any] = None
    ) -> None:
        if not isinstance(type, str):
            raise TypeError(f"a cell's type is a str, not {type.__class__.__name__}")
        self.type = type.strip()
        self.door: Optional[str] = None
        self._is_scalar = _memory.is_scalar(self.type)
        spelling = self._spelled_pointer()
        many = isinstance(value, Iterable) and not isinstance(value, _records._Pointing)
        # What `many` says of the value, a type checker does not see.
        values: List[Any] = list(value) if many else [value]  # type: ignore[arg-type]
        self._is_single = not many
        # What pointers here read as: the same object as long as they stay the same. It is kept
        # alive, and where it was put in, what it points to.
        self._seen: Dict[int, Any] = {}
        kind: Any = _memory.scalar(self.type) if self._is_scalar else ctypes.c_void_p
        self._memory = (kind * len(values))()
        self.pointer = Pointer(ctypes.addressof(self._memory), spelling, self)
        # The runtime then takes a cell for its pointer.
        self.this = self.pointer.this
        for index, one in enumerate(values):
            if one is not None:
                self[index] = one

    @property
    def value(self) -> Any:
        """The value; of several, the first.

        A pointer reads as a record, as a plain pointer object, or as None if it is null. What a
        call of the library has put here goes back through `owned`.
        """
        return self[0]

    @value.setter
    def value(self, value: Any) -> None:
        self[0] = value

    def __getitem__(self, index: int) -> Any:
        index = _memory.position(index, len(self))
        held = self._memory[index]
        if self._is_scalar:
            return held
        if not held:
            return None
        if index not in self._seen or int(self._seen[index]) != held:
            target = self._target()
            found = _records.record_at(target, held) if target != "void" else _plain(held)
            _ownership.hand_out(found, self.door)
            self._see(index, found)
        return self._seen[index]

    def __setitem__(self, index: int, value: Any) -> None:
        index = _memory.position(index, len(self))
        if self._is_scalar:
            self._memory[index] = _memory.checked(self.type, value)
        elif value is None:
            self._memory[index] = None
            self._seen.pop(index, None)
        else:
            pointing = self._pointing(value)
            self._memory[index] = int(pointing)
            self._see(index, pointing)

    def _forget(self, gone: _records._Pointing) -> None:
        """Makes the pointers null that read as an object whose memory goes back."""
        for index in [index for index, seen in self._seen.items() if seen is gone]:
            if self._memory[index] == int(gone):
                self[index] = None

    def __len__(self) -> int:
        return len(self._memory)

    def __iter__(self) -> Any:
        return (self[index] for index in range(len(self)))

    def __bytes__(self) -> bytes:
        """The memory of the cell itself."""
        return bytes(self._memory)

    def read(self, length: int) -> bytes:
        """So many bytes of what a pointer in this cell points to."""
        self._require_pointers()
        count = _memory.length(length)
        held = self._memory[_memory.position(0, len(self))]
        if not held:
            raise ValueError("the pointer is null")
        return ctypes.string_at(held, count)

    def __repr__(self) -> str:
        held = self.value if self._is_single else list(self)
        return f"Cell({self.type!r}, {held!r})"

    def _handed_out(self) -> List[_records._Pointing]:
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
        if self._target() in ("void", *_layout.RECORDS_BEHIND_POINTERS):
            return f"{self._target()} **"
        records = ", ".join(f"{name} *" for name in _layout.RECORDS_BEHIND_POINTERS)
        raise TypeError(
            f"no cell can hold a {self.type!r}; it holds an integer such as int or qex_uint32, "
            f"void *, {', '.join(_layout.POINTERS)}, {records}"
        )


def cell_behind(argument: Any) -> Optional[Cell]:
    """The cell that an argument is or points to."""
    if isinstance(argument, Pointer):
        argument = argument.__dict__["_owner"]
    return argument if isinstance(argument, Cell) else None


class Callback(_records._Pointing):
    """A function that the library may call for each item of a walk.

    It is called with the item's handle and with the context that the walk was given, each a pointer
    or None. A result that is false ends the walk; None does not. What it raises ends the walk too,
    and `reraise` raises it.
    """

    _TYPE = ctypes.CFUNCTYPE(ctypes.c_byte, ctypes.c_void_p, ctypes.c_void_p)

    def __init__(self, function: Callable[[Any, Any], Any]) -> None:
        if not callable(function):
            raise TypeError(f"a callback is a function, not {type(function).__name__}")
        self._function = function
        self._raised: Optional[BaseException] = None
        self._thunk = self._TYPE(self._call)
        address = ctypes.cast(self._thunk, ctypes.c_void_p).value or 0
        self.pointer = Pointer(address, "DVSwitchCallback", self)
        self.this = self.pointer.this

    def _call(self, item: Optional[int], context: Optional[int]) -> int:
        try:
            answer = self._function(*(_plain(one) if one else None for one in (item, context)))
        except BaseException as raised:  # nothing may leave through the library's frames
            self._raised = raised
            return 0
        return 1 if answer is None or answer else 0

    def reraise(self) -> None:
        """Raises what the function raised in the last walk, once; nothing if it did not."""
        raised, self._raised = self._raised, None
        if raised is not None:
            raise raised


def _plain(address: int, owner: object = None) -> Pointer:
    return Pointer(address, "void *", owner)
