"""What the checked calls share: arguments that are looked at, outputs that are read, refusals.

A call refuses before it is made what the flat module would take and misread: a text with a NUL in
it, a text for a truth, null where nothing allows it, an integer that C has no room for.
"""

import ctypes
import typing
from typing import Any, Callable, List, Tuple, TypeVar, Union

import _libvswitch as _flat
from libvswitch import _checks, _pointers, _records, cells, errors

T = TypeVar("T")
Problem = Union[int, BaseException]
"""What a call ended with: its status, or what it raised."""

read_and_release = _pointers.read_and_release

# How the wrappers word an argument that does not convert.
_OWN = ("in method '", "invalid null reference in method '")


def failure(call: str, problem: Problem, /, **arguments: object) -> BaseException:
    """What a call is to raise that did not succeed."""
    if isinstance(problem, int):
        return errors.class_of(problem)(call=call, arguments=arguments, status=problem)
    is_own = str(problem).startswith(tuple(f"{words}{call}'" for words in _OWN))
    if is_own or isinstance(problem, errors.HostError) or not isinstance(problem, Exception):
        return problem
    trapped = errors.Trapped(call=call, arguments=arguments)
    trapped.__cause__ = problem
    return trapped


def nothing(call: str, /, **arguments: object) -> errors.HostError:
    """What a call raises that found nothing where there must be something."""
    return errors.HostError(call=call, arguments=arguments)


def deallocate(
    of_classes: Callable[[Any], object], of_flat: Callable[[Any], object], memory: Any
) -> None:
    """What classes know of, they see end; a plain pointer goes as it is."""
    is_known = memory is None or isinstance(memory, _records._Pointing)
    (of_classes if is_known else of_flat)(memory)


# Arguments


def text(name: str, value: object) -> None:
    if not isinstance(value, str):
        raise TypeError(f"{name} is a str, not {type(value).__name__}")
    if "\0" in value:
        raise ValueError(f"{name} would be cut short at its NUL: {value!r}")


def truth(name: str, value: object) -> bool:
    if value is True or value is False:
        return value
    if isinstance(value, int) and value in (0, 1):
        return bool(value)
    raise TypeError(f"{name} is a bool, not {value!r}")


def integer(name: str, value: object) -> None:
    """A C int, of which the flat module takes a larger one for -1."""
    if not isinstance(value, int):
        raise TypeError(f"{name} is an int, not {type(value).__name__}")
    if not -(2**31) <= value < 2**31:
        raise OverflowError(f"{name} has no room for {value}")


def record(name: str, value: object, kind: str) -> None:
    if value is None:
        raise TypeError(f"{name} is a {kind}, not None")


class Memory:
    """Bytes of the caller's, for the time of a call."""

    def __init__(self, name: str, data: Union[bytes, bytearray, memoryview]) -> None:
        if not isinstance(data, (bytes, bytearray, memoryview)):
            raise TypeError(f"{name} is bytes, not {type(data).__name__}")
        held = bytes(data)
        self.length = len(held)
        # One byte at the least: the address of nothing is not null.
        self._memory = ctypes.create_string_buffer(held, len(held) or 1)
        self.pointer = _pointers.pointer_object(ctypes.addressof(self._memory), "void *")

    @property
    def or_null(self) -> Any:
        return self.pointer if self.length else None


def numbers(name: str, values: typing.Iterable[int]) -> Any:
    """An array of 16 bits each; None for none."""
    held = [value for value in sequence(name, values)]
    for value in held:
        if not isinstance(value, int):
            raise TypeError(f"{name} holds int, not {type(value).__name__}")
        if not 0 <= value < 2**16:
            raise OverflowError(f"{name} has no room for {value}")
    return cells.Cell("qex_uint16", held) if held else None


def sequence(name: str, values: typing.Iterable[T]) -> List[T]:
    if isinstance(values, (str, bytes)) or not isinstance(values, typing.Iterable):
        raise TypeError(f"{name} is a sequence, not {type(values).__name__}")
    return list(values)


def records(name: str, values: typing.Iterable[Any], make: Callable[[int], Any], kind: Any) -> Any:
    """An array of the caller's own; None for none."""
    given = [as_record(f"{name}[{at}]", one, kind) for at, one in enumerate(sequence(name, values))]
    if not given:
        return None
    array = make(len(given))
    for at, one in enumerate(given):
        array[at] = one
    return array


def as_record(name: str, value: Any, kind: Any) -> Any:
    """A record of the host for one, or for a frozen value with the same fields."""
    if isinstance(value, kind):
        return value
    if type(value).__name__ != kind.__name__ or not hasattr(value, "__dataclass_fields__"):
        raise TypeError(f"{name} is a {kind.__name__}, not {type(value).__name__}")
    made = kind()
    for field in value.__dataclass_fields__:
        setattr(made, field, getattr(value, field))
    return made


def names(name: str, values: typing.Iterable[str], make: Callable[[int], Any]) -> Any:
    """A list of names of the host."""
    given = sequence(name, values)
    made = make(len(given))
    for at, one in enumerate(given):
        text(f"{name}[{at}]", one)
        made[at] = one
    return made


def group(mode: int, address: Union[str, bytes]) -> bytes:
    """The bytes of a group's address in the form of a mode."""
    if not isinstance(address, (str, bytes)):
        raise TypeError(f"group is an address, not {type(address).__name__}")
    size = _checks.FORMS.get(mode, 6)
    held = address if isinstance(address, bytes) else _parsed(mode, address)
    if len(held) != size:
        raise ValueError(f"group is an address of {size} bytes for this mode, not {address!r}")
    return held


def _parsed(mode: int, address: str) -> bytes:
    """The bytes of an address that is written in the form of a mode, or none."""
    import socket  # takes a tenth of the time to import this module, and few programs need it

    try:
        if mode == _flat.VS_MCAST_FILTER_MODE_IGMP:
            return socket.inet_pton(socket.AF_INET, address)
        if mode == _flat.VS_MCAST_FILTER_MODE_MLD:
            return socket.inet_pton(socket.AF_INET6, address)
        return bytes.fromhex(address.replace(":", " ").replace("-", " "))
    except (OSError, ValueError):
        return b""


# Outputs


class Number:
    """Room for an integer that a call puts there."""

    def __init__(self, spelling: str) -> None:
        kind: Any = ctypes.c_uint if spelling.startswith("unsigned") else ctypes.c_int
        self._memory = kind()
        self.pointer = _pointers.pointer_object(ctypes.addressof(self._memory), spelling)

    @property
    def value(self) -> int:
        value: int = self._memory.value
        return value


class Place:
    """Room for a pointer that a call puts there."""

    def __init__(self, spelling: str) -> None:
        self._spelling = spelling
        self._memory = ctypes.c_void_p()
        self.pointer = _pointers.pointer_object(ctypes.addressof(self._memory), f"{spelling}*")

    @property
    def address(self) -> int:
        return self._memory.value or 0

    @property
    def pointee(self) -> Any:
        """What is there as a pointer object, None for a null."""
        address = self.address
        return _pointers.pointer_object(address, self._spelling) if address else None

    def read(self, length: int) -> bytes:
        held: bytes = ctypes.string_at(self.address, length) if self.address else b""
        return held


def walk(
    call: Callable[..., object], handle: Tuple[Any, ...], take: Callable[[Any], T]
) -> Tuple[Problem, List[T]]:
    """What `take` makes of each handle or item, while the walk has not gone on."""
    found: List[T] = []
    callback = cells.Callback(lambda reached, _: found.append(take(reached)))
    try:
        call(*handle, callback, None)
        callback.reraise()
    except BaseException as raised:
        return raised, found
    return 0, found


# Handles


class _Handle:
    """What the library knows something by; a reset of the state ends it."""

    __slots__ = ("_address", "_resets")

    _resets_so_far = 0

    def __init__(self, pointer: Any) -> None:
        self._address = int(pointer)
        self._resets = _Handle._resets_so_far

    def __eq__(self, other: object) -> bool:
        return isinstance(other, _Handle) and _key(self) == _key(other)

    def __hash__(self) -> int:
        return hash(_key(self))

    def __repr__(self) -> str:
        return f"<{type(self).__name__} {self._address:#x}>"


def _key(handle: _Handle) -> Tuple[type, int, int]:
    return type(handle), handle._address, handle._resets


class DVSwitchHandle(_Handle):
    """A switch of the state."""

    __slots__ = ()


class DVSPortHandle(_Handle):
    """A port of a switch of the state."""

    __slots__ = ()


def state_was_reset() -> None:
    """Ends the handles that there are."""
    _Handle._resets_so_far += 1


def live(name: str, handle: Any, kind: type) -> Any:
    """The pointer object of a handle that has not ended."""
    if not isinstance(handle, kind):
        raise TypeError(f"{name} is a {kind.__name__}, not {type(handle).__name__}")
    assert isinstance(handle, _Handle)
    if handle._resets != _Handle._resets_so_far:
        raise ValueError(f"this {kind.__name__} is gone: the state was reset")
    return _pointers.pointer_object(handle._address, "void *")


class DVSDataItem(typing.NamedTuple):
    """A property of the state as it was when it was looked up."""

    name: str
    data: bytes
    propertyType: int


def name_of(item: Any) -> str:
    found = _flat.DVSData_Name(item)
    if found is None:
        raise nothing("DVSData_Name", item=item)
    return found


def data_of(item: Any) -> bytes:
    data = Place("void *")
    return data.read(_flat.DVSData_Data(item, data.pointer))


def propertyType_of(item: Any) -> int:
    return _flat.DVSData_PropType(item)


def item_at(item: Any) -> DVSDataItem:
    """A copy of what the host may change when it is next asked for the same."""
    return DVSDataItem(name_of(item), data_of(item), propertyType_of(item))


class DVSDataHandle:
    """A list of items. It ends with its block, with DVSData_Free or when it is collected: once."""

    __slots__ = ("_addresses", "_release", "__weakref__")

    def __init__(self, address: int, release: Any = None) -> None:
        self._addresses = [address]
        self._release = release

    def __enter__(self) -> "DVSDataHandle":
        return self

    def __exit__(self, *unused: object) -> None:
        self.end()

    def __del__(self) -> None:
        self.end()

    def end(self) -> None:
        """Frees the list with its items; a list that has ended is left alone."""
        try:
            address = self._addresses.pop()
        except (AttributeError, IndexError):
            return
        try:
            _flat.DVSData_Free(_pointers.pointer_object(address, "void *"))
        except BaseException as raised:
            raise failure("DVSData_Free", raised, list=self)

    @property
    def deallocator(self) -> Callable[[Any], object]:
        """What releases what this list allocates."""
        if self._release is None:
            return _flat.DVSQEX_DataFree
        function = ctypes.PYFUNCTYPE(None, ctypes.c_void_p)(_pointers.address_of(self._release))
        return lambda pointer: function(_pointers.address_of(pointer))

    def __repr__(self) -> str:
        held = f"{self._addresses[0]:#x}" if self._addresses else "that has ended"
        return f"<DVSDataHandle {held}>"


def live_list(name: str, given: Any) -> Any:
    if not isinstance(given, DVSDataHandle):
        raise TypeError(f"{name} is a DVSDataHandle, not {type(given).__name__}")
    if not given._addresses:
        raise ValueError("this DVSDataHandle has ended")
    return _pointers.pointer_object(given._addresses[0], "void *")
