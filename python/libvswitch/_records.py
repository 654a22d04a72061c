"""What all classes share: printing, keeping memory alive, sequences of records."""

import ctypes
import typing
import weakref
from typing import Any, ClassVar, Dict, List, Optional, Tuple, Type, TypeVar

from libvswitch import _layout, _memory, _pointers

__all__ = ["CLASSES", "Record", "Table", "end", "place_in", "record_at", "shown", "wanted", "wrap"]

T = TypeVar("T")

CLASSES: Dict[str, Type["Record"]] = {}


class _Pointing:
    """An object that the wrapper runtime takes for the pointer object in its `this`.

    The runtime looks for `this` in the object's dictionary and nowhere else.
    """

    this: Any

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

    def _handed_out(self) -> List["_Pointing"]:
        """What a call of the library has handed out through this object."""
        return [self]


def place_in(owner: Any, view: Any) -> Any:
    """Ties a view to the object whose memory it shows: it keeps that alive and ends with it."""
    if isinstance(view, _Pointing) and isinstance(owner, _Pointing):
        views: Dict[int, Any] = owner.__dict__.setdefault("_views", {})
        key = id(view)
        views[key] = weakref.ref(view, lambda _: views.pop(key, None))
        view.__dict__["_owner"] = owner
    return view


def end(pointing: Any) -> None:
    """Makes an object null, and all views into it."""
    for view in list(pointing.__dict__.get("_views", {}).values()):
        if view() is not None:
            end(view())
    for cell in list(pointing.__dict__.get("_cells", ())):
        cell._forget(pointing)
    _pointers.clear(pointing)


class Record(_Pointing):
    """A record of the host: a C structure in memory, its fields as attributes.

    A record that Python owns is freed when it is collected. What lies in another record keeps that
    one alive. Two records are equal if they are the same memory.
    """

    thisown: bool
    __swig_destroy__: ClassVar[Any]
    _fields: ClassVar[Tuple[str, ...]] = ()
    _alternatives: ClassVar[Tuple[str, ...]] = ()
    """Fields that show the same entries, of which only one at a time holds."""

    def __init_subclass__(cls) -> None:
        members = vars(cls)
        if "thisown" not in members:
            return
        # Unless it has a printed form of its own, it prints as all records do.
        if members["__repr__"].__name__ == "_swig_repr":
            del cls.__repr__
        # A name with two underscores in front is another one inside a class body.
        hidden = f"_{cls.__name__.lstrip('_')}__"
        for name in [name for name in members if name.startswith(hidden)]:
            setattr(cls, name[len(hidden) - 2 :], members[name])
        cls._fields = tuple(
            name
            for name, member in vars(cls).items()
            if isinstance(member, property) and name != "thisown" and not name.startswith(hidden)
        )
        counts = [_layout.ARRAYS.get(f"{cls.__name__}_{name}", (None,))[-1] for name in cls._fields]
        cls._alternatives = tuple(
            name
            for name, count in zip(cls._fields, counts)
            if isinstance(count, str) and counts.count(count) > 1
        )
        # An access by index alone would let Python iterate without an end.
        if "__getitem__" in vars(cls) and not issubclass(cls, Table):
            cls.__iter__ = None  # type: ignore[attr-defined]  # so Python is told
        CLASSES[cls.__name__] = cls

    # A type checker that saw this would let every name pass.
    if not typing.TYPE_CHECKING:

        def __setattr__(self, name: str, value: Any) -> None:
            if name in self._fields:
                self._require()
            elif name not in ("this", "thisown"):
                raise AttributeError(f"{type(self).__name__} has no field {name!r}")
            object.__setattr__(self, name, value)

    def __repr__(self) -> str:
        if not int(self):
            return f"<{type(self).__name__} that is gone>"
        parts = [f"{name}={self._shown(name)}" for name in self._fields]
        return f"{type(self).__name__}({', '.join(parts)})"

    def _shown(self, name: str) -> str:
        # Only one is as long as the entries are, and the record knows not which.
        return "..." if name in self._alternatives else shown(getattr(self, name))

    def __copy__(self) -> "Record":
        """The same bytes in a record of the caller's own, where these are all of the record."""
        name = type(self).__name__
        if name not in _layout.WHOLE_RECORDS:
            super().__copy__()
        self._require()
        made = CLASSES[name]()
        ctypes.memmove(int(made), int(self), _memory.RECORD_SIZES[name])
        return made

    def own(self, owned: Optional[bool] = None) -> bool:
        """Whether Python owned the record; with an argument, makes it so."""
        before: bool = self.this.own() if owned is None else self.this.own(owned)
        return before

    def acquire(self) -> None:
        self.this.acquire()

    def disown(self) -> None:
        self.this.disown()

    def _require(self) -> None:
        if not int(self):
            raise ValueError(f"this {type(self).__name__} is gone: its memory was given back")


class Table(Record, typing.Generic[T]):
    """A record that is a sequence: it has a length, elements by index, and can be iterated."""

    def __iter__(self) -> typing.Iterator[T]:
        for index in range(len(self)):
            yield self[index]

    def __len__(self) -> int:
        self._require()
        count = _layout.TABLES[type(self).__name__]
        return int(count) if count.isdigit() else int(getattr(self, count))

    def __getitem__(self, index: int) -> T:
        """An element of the array that is counted, where the record has no method for it."""
        elements: typing.Sequence[T] = getattr(self, _layout.ELEMENTS[type(self).__name__])
        return elements[_memory.position(index, len(self))]


def record_at(name: str, address: int) -> Record:
    """A record of which Python knows nothing but the place."""
    return wrap(name, _pointers.pointer_object(address, f"{name} *"))


def wrap(name: str, pointer: Any) -> Record:
    made = CLASSES[name].__new__(CLASSES[name])
    made.__dict__["this"] = pointer
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
