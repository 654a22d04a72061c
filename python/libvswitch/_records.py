"""What all classes share: printing, memory that stays while it is seen, room that ends.

Nothing here locks, and other threads may come in between any two steps. What holds all the same:

- A pointer object is null from the moment that its memory is about to be released. Whoever releases
  makes the owner null first, and then the views that it finds.
- A view is tied to its owner before anybody looks whether the owner is null. So it is among the
  views that are found, or it is seen that its owner is gone.
- Memory is read and written by functions in C which find a pointer null, or do all of it.
"""

import typing
import weakref
from typing import Any, ClassVar, Dict, List, Optional, Tuple, Type, TypeVar

from libvswitch import _layout, _memory, _pointers

__all__ = ["CLASSES", "Record", "Table"]

T = TypeVar("T")

CLASSES: Dict[str, Type["Record"]] = {}


class _Pointing(_pointers.Pointing):
    """An object that the wrapper runtime takes for the pointer object that is its `this`.

    That is set once, and no other attribute can be set: see python/fields.i. The object's
    dictionary has what it needs to know of its memory: `_owner`, in which it lies, and `_kept`,
    the pointer objects that keep that, whatever becomes of the owner; `_end`, where the memory
    ends; `_deallocator`; `_views` into it and `_cells` that hold it.
    """

    def __int__(self) -> int:
        return _pointers.address_of(self)

    def __eq__(self, other: object) -> bool:
        """Whether both are the same memory, as with plain pointer objects."""
        if isinstance(other, _Pointing):
            return type(self) is type(other) and int(self) == int(other)
        return NotImplemented

    def __hash__(self) -> int:
        return hash(int(self))

    def __copy__(self) -> Any:
        raise TypeError(
            f"{type(self).__name__} objects cannot be copied; "
            "records are if their bytes are all of them"
        )

    def __deepcopy__(self, memo: Dict[int, Any]) -> Any:
        return self.__copy__()

    def __reduce_ex__(self, protocol: Any) -> typing.NoReturn:
        raise TypeError(
            f"{type(self).__name__} objects cannot be pickled; they are memory of this process"
        )

    def _allocated(self) -> List["_Pointing"]:
        """What a call of the library has allocated and this object points to."""
        return [self]

    def _require(self) -> None:
        if not _pointers.address_of(self):
            raise ValueError(f"this {type(self).__name__} is gone: its memory was released")


def _a(given: _Pointing) -> str:
    name = type(given).__name__
    return f"{'an' if name[0] in 'AEIOU' else 'a'} {name}"


def place_in(owner: Any, view: Any) -> Any:
    """Ties a view to the object whose memory it shows: it keeps that alive and ends with it."""
    if isinstance(view, _Pointing) and isinstance(owner, _Pointing):
        views: Dict[int, Any] = owner.__dict__.setdefault("_views", {})
        key = id(view)
        views[key] = weakref.ref(view, lambda _: views.pop(key, None))
        kept = getattr(owner, "this", None), owner.__dict__.get("_kept")
        view.__dict__.update(_owner=owner, _kept=kept)
        if not _pointers.address_of(owner):
            _pointers.clear(view)
            owner._require()
    return view


def inner(owner: Any, view: Any) -> Any:
    """Ties a record to the one in whose room it lies; IndexError if it sticks out of that."""
    if view is not None:
        available = room(owner)
        needed = _memory.RECORD_SIZES[view._name]
        offset = int(view) - int(owner)
        if available is not None and offset + needed > available:
            raise IndexError(f"{_a(view)} at this place would lie past the memory of its list")
        place_in(owner, view)
    return view


def room(pointing: Any) -> Optional[int]:
    """How many bytes there are from where an object points; None where nothing tells."""
    end = pointing.__dict__.get("_end")
    if end is None:
        end = _end(pointing)
        if end is None:
            return None
        pointing.__dict__["_end"] = end
    remaining: int = end - _pointers.address_of(pointing)
    return remaining


def _end(pointing: Any) -> Optional[int]:
    """Where the memory ends in which an object lies: its owner's, or its own record's."""
    owner = pointing.__dict__.get("_owner")
    if owner is not None:
        available = room(owner)
        return None if available is None else int(owner) + available
    if isinstance(pointing, Record) and pointing.this.own():
        return int(pointing) + _memory.RECORD_SIZES[pointing._name]
    return None


def require_room(pointing: Any, needed: int, what: str) -> None:
    available = room(pointing)
    if available is not None and needed > available:
        raise ValueError(f"{what} takes {needed} bytes, and there are {max(available, 0)}")


def counted(record: Any, count: int, array: str, element: int) -> int:
    """How many elements an array has, as its record says; ValueError if it has no room for them."""
    available = room(record)
    if available is not None:
        fitting = max(available - _memory.ARRAY_OFFSETS[array], 0) // element
        if not 0 <= count <= fitting:
            name = type(record).__name__
            raise ValueError(f"this {name} counts {count} elements, and has room for {fitting}")
    return count


class Taken:
    """An object and all views into it, made null so that their memory can be released."""

    def __init__(self, pointing: Any) -> None:
        self._pointers: List[Tuple[Any, Any]] = []
        self._cells: List[Tuple[Any, int, Any]] = []
        self._take(pointing)
        self.pointer = self._pointers[0][1]

    def _take(self, pointing: Any) -> None:
        self._pointers.append((pointing, _pointers.take(pointing)))
        for reference in list(pointing.__dict__.get("_views", {}).values()):
            view = reference()
            if view is not None:
                self._take(view)
        for cell in list(pointing.__dict__.get("_cells", ())):
            self._cells += cell._withdraw(pointing)

    def put_back(self) -> None:
        for pointing, pointer in self._pointers:
            _pointers.put_back(pointing, pointer)
        for cell, index, pointing in self._cells:
            cell[index] = pointing


class Record(_Pointing):
    """A record of the host: a C structure in memory, its fields as attributes.

    A record that Python owns is freed when it is collected. What lies in another record keeps that
    one alive. Two records are equal if they are the same memory.
    """

    _name: ClassVar[str]
    """Of the C structure."""
    _fields: ClassVar[Tuple[str, ...]] = ()
    _alternatives: ClassVar[Tuple[str, ...]] = ()
    """Fields that show the same entries, of which only one at a time holds."""
    _trailing: ClassVar[Optional[Tuple[str, Any, int]]] = None
    """The array that a record ends with: its place, the reader of its count, its element's size."""

    @classmethod
    def _end_of(cls, record: Any) -> Optional[int]:
        """Where the memory of a record ends that a library has just filled."""
        own = type(record)
        size = _memory.RECORD_SIZES[own._name]
        if own._trailing is not None:
            place, count, element = own._trailing
            size = max(size, _memory.ARRAY_OFFSETS[place] + count(record) * element)
        return int(record) + size

    def __repr__(self) -> str:
        if not int(self):
            return f"<{type(self).__name__} that is gone>"
        parts = [f"{name}={self._shown(name)}" for name in self._fields]
        return f"{type(self).__name__}({', '.join(parts)})"

    def _shown(self, name: str) -> str:
        # Only one is as long as the entries are, and the record knows not which.
        if name in self._alternatives:
            return "..."
        try:
            return shown(getattr(self, name))
        except ValueError as error:
            return f"<{error}>"

    def _set(self, fields: Dict[str, Any]) -> None:
        """Sets the fields that a constructor is given; an array may be given its first elements."""
        for name, value in fields.items():
            if name not in self._fields:
                known = ", ".join(self._fields)
                raise TypeError(f"{type(self).__name__} has no field {name!r}, but {known}")
            held = getattr(self, name) if isinstance(value, (list, tuple)) else None
            if isinstance(held, typing.Sequence) and len(value) < len(held):
                held[: len(value)] = value  # type: ignore[index]  # an Array, and no text
            else:
                setattr(self, name, value)

    def asdict(self) -> Dict[str, Any]:
        """The fields by name as values of Python's own: records as dicts, arrays as lists, bytes.

        Entries of which only the caller knows the kind or the number are left out.
        """
        self._require()
        shown = (name for name in self._fields if name not in self._alternatives)
        values = ((name, _as_value(getattr(self, name))) for name in shown)
        return {name: value for name, value in values if value is not _UNKNOWN}

    def same_values(self, other: object) -> bool:
        """Whether another record of the same class holds the same; == asks for the same memory."""
        return (
            isinstance(other, Record)
            and type(other) is type(self)
            and self.asdict() == other.asdict()
        )

    def __copy__(self) -> "Record":
        """The same bytes in a record of the caller's own, where these are all of the record."""
        if self._name not in _layout.WHOLE_RECORDS:
            super().__copy__()
        self._require()
        held = _pointers.read_memory(self, 0, _memory.RECORD_SIZES[self._name])
        made = CLASSES[self._name]()
        _pointers.write_memory(made, 0, held)
        return made

    @property
    def thisown(self) -> bool:
        """Whether Python frees the record when it is collected."""
        return bool(self.this.own())

    @thisown.setter
    def thisown(self, owned: bool) -> None:
        self.own(owned)

    def own(self, owned: Optional[bool] = None) -> bool:
        """Whether Python owned the record; with an argument, makes it so.

        Only what Python made and then disowned can be acquired again: a ValueError otherwise.
        """
        before: bool = self.this.own()
        if owned is not None and bool(owned) != before:
            if not owned:
                room(self)  # while it can be told
            elif "_disowned" not in self.__dict__ or not int(self):
                raise ValueError(f"this {type(self).__name__} is not Python's to free")
            self.__dict__["_disowned"] = True
            self.this.own(owned)
        return before

    def acquire(self) -> None:
        self.own(True)

    def disown(self) -> None:
        self.own(False)


class Table(Record, typing.Generic[T]):
    """A record that is a sequence: it has a length, elements by index, and can be iterated."""

    _elements: ClassVar[str]
    """The array that holds them."""

    def __iter__(self) -> typing.Iterator[T]:
        return iter(self._sequence())

    def __len__(self) -> int:
        return len(self._sequence())

    def __getitem__(self, index: int) -> T:
        elements = self._sequence()
        return elements[_memory.position(index, len(elements))]

    def _sequence(self) -> typing.Sequence[T]:
        self._require()
        elements: typing.Sequence[T] = getattr(self, self._elements)
        return elements

    def __contains__(self, element: object) -> bool:
        return any(one is element or one == element for one in self)


def register(cls: Type[Record], registered: Any) -> None:
    """Makes a class the one of which pointers of its type become instances."""
    registered(cls)
    # The runtime has taken it; called by anybody else, it would free what a record still shows.
    del cls.__swig_destroy__  # type: ignore[attr-defined]  # generated
    CLASSES[cls._name] = cls


def attach_bytes(record: Any, pointer: Any, size: int) -> None:
    """Gives a new record memory that is as large as its caller says, and starts as zeros."""
    _pointers.attach(record, pointer)
    _pointers.write_memory(record, 0, bytes(size))
    record.__dict__["_end"] = int(record) + size


def record_at(name: str, address: int) -> Record:
    """A record of which Python knows nothing but the place."""
    return wrap(name, _pointers.pointer_object(address, f"{name} *"))


def wrap(name: str, pointer: Any) -> Record:
    made = CLASSES[name].__new__(CLASSES[name])
    _pointers.attach(made, pointer)
    return made


def wanted(name: str, value: Any) -> Record:
    """The value, which must be a record of this name and not be gone."""
    if not isinstance(value, CLASSES[name]):
        raise TypeError(f"a {name} is wanted, not {type(value).__name__}")
    value._require()
    return value


def shown(value: Any) -> str:
    if isinstance(value, (int, str, bytes, _Pointing)) or value is None:
        return repr(value)
    return hex(int(value))


_UNKNOWN = object()


def _as_value(value: Any) -> Any:
    if isinstance(value, Record):
        return value.asdict()
    if isinstance(value, (int, str, bytes)) or value is None:
        return value
    if not isinstance(value, typing.Sequence):
        return int(value)
    try:
        elements = [_as_value(one) for one in value]
    except TypeError:
        return _UNKNOWN  # nobody told its length
    is_bytes = value.__dict__["_element"] == "unsigned char" and not value.__dict__["_inner"]
    return bytes(elements) if is_bytes else elements
