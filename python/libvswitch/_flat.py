"""The flat functions as the generated classes want them.

The classes find here what the generator assumes of a module that was made for them, and what makes
them safe: bounds that are checked before the flat functions are asked, views that keep what they
show alive, and calls that note which door takes back what they hand out.
"""

import ctypes
from functools import wraps
from typing import Any, Callable, Dict, List, Optional

import _libvswitch
from libvswitch import _arrays, _layout, _memory, _records
from libvswitch._ownership import DOORS, door_of, hand_out, release
from libvswitch.cells import Callback, Cell, cell_behind

# For the generated classes, which name what they want.
__all__: List[str] = []

_Function = Callable[..., Any]
_here: Dict[str, Any] = globals()


def _attach(record: Any, pointer: Any) -> None:
    """What the constructor of a class does with the pointer object that the flat one made."""
    if pointer is None:
        raise MemoryError(f"no memory for a {type(record).__name__}")
    record.__dict__["this"] = pointer


def _length(record: str, count: Any) -> Callable[[Any], int]:
    """How to count the elements of a record: a number, or the reader of the field that says it."""
    if isinstance(count, int) or str(count).isdigit():
        return lambda owner: int(count)
    reader: Callable[[Any], int] = getattr(_libvswitch, f"{record}_{count}_get")
    return reader


def _view(reader: _Function) -> _Function:
    return lambda record: _records.place_in(record, reader(record))


def _inner(method: _Function) -> _Function:
    """A method whose result lies in the record, which may itself lie in another."""
    return lambda record, *arguments: _records.place_in(record, method(record, *arguments))


def _truth(reader: _Function) -> _Function:
    return lambda *arguments: reader(*arguments) != "\0"


def _array(record: str, reader: _Function, element: str, inner: int, count: Any) -> _Function:
    length: Optional[Callable[[Any], int]] = None if count is None else _length(record, count)

    def read(owner: Any) -> "_arrays.Array[Any]":
        pointer = reader(owner)
        array: _arrays.Array[Any] = _arrays.Array(
            pointer, element, length(owner) if length else None, inner
        )
        _records.place_in(owner, array)
        return array

    return read


def _fill_array(read: _Function, write: _Function) -> _Function:
    """A writer that takes the elements as well as a pointer to them."""

    def fill(owner: Any, value: Any) -> None:
        if isinstance(value, (list, tuple, bytes, _arrays.Array)):
            read(owner)[:] = value
        else:
            write(owner, value)

    return fill


def _write_address(write: _Function) -> _Function:
    """A writer of a hardware address that takes what the reader gives, or six bytes."""

    def put(record: Any, value: Any) -> None:
        if isinstance(value, str):
            value = bytes.fromhex(value.replace(":", " "))
        if isinstance(value, bytes):
            if len(value) != 6:
                raise ValueError(f"a hardware address has 6 bytes, not {len(value)}")
            value = Cell("unsigned char", value).pointer
        write(record, value)

    return put


def _bounded(access: _Function, length: Callable[[Any], int]) -> _Function:
    """An access by index that raises, and takes negative indexes, as sequences do."""

    def at(record: Any, index: int, *value: Any) -> Any:
        return access(record, _memory.position(index, length(record)), *value)

    return at


def _zeroed(make: _Function, write_count: _Function, header: int, element: int) -> _Function:
    """A constructor of a list with room for all its elements, empty texts at first."""

    def new(size: int) -> Any:
        size = _memory.length(size)
        needed = header + size * element
        # The flat constructor makes room for 32 bytes an entry at the least.
        made = make(max(size, -(-needed // 32)))
        if made is not None:
            ctypes.memset(int(made), 0, needed)
            write_count(made, size)
        return made

    return new


def _number_at(method: _Function) -> _Function:
    def read(record: Any, index: int) -> int:
        address = int(method(record, index))
        return int(_memory.scalar("unsigned int").from_address(address).value)

    return read


def _put_number(method: _Function) -> _Function:
    def write(record: Any, index: int, value: Any) -> None:
        method(record, index, Cell("unsigned int", value) if isinstance(value, int) else value)

    return write


def _tuple(call: _Function, door: Optional[str]) -> _Function:
    """A call with outputs: a tuple, and its records know their door."""

    @wraps(call)
    def called(*arguments: Any) -> Any:
        result = call(*arguments)
        if not isinstance(result, list):
            return result
        for output in result[1:]:
            hand_out(output, door)
        return tuple(result)

    return called


def _filling(call: _Function, positions: Any, door: Optional[str]) -> _Function:
    """A call that leaves pointers in the caller's cells."""

    def called(*arguments: Any) -> Any:
        result = call(*arguments)
        for position in positions:
            cell = cell_behind(arguments[position])
            if cell is not None:
                cell.door = door
        return result

    return called


def _calling_back(call: _Function, position: int) -> _Function:
    """A call that takes a Python function where C wants one; what that raises, the call raises."""

    def called(*arguments: Any) -> Any:
        given = arguments[position] if position < len(arguments) else None
        if not callable(given):
            return call(*arguments)
        callback = Callback(given)
        changed = list(arguments)
        changed[position] = callback
        result = call(*changed)
        callback.reraise()
        return result

    return called


def _allocating(make: _Function, door: str) -> _Function:
    def called(*arguments: Any) -> Any:
        made = make(*arguments)
        hand_out(made, door)
        return made

    return called


def _new_array(make: _Function, element: str) -> _Function:
    """Elements of the caller's own: an array that knows its length and frees itself."""

    def new(length: int) -> "_arrays.Array[Any]":
        made = make(length)
        if made is None:
            raise MemoryError(f"no memory for {length} elements")
        return _arrays.Array(made.this, element, length)

    return new


def _delete_array(free: _Function) -> _Function:
    def delete(array: Any) -> None:
        free(array)
        if isinstance(array, _records._Pointing):
            _records.end(array)

    return delete


def _private_vlan_map(call: _Function) -> _Function:
    """The library's array under its own type, with its length."""

    def called(*arguments: Any) -> Any:
        status, entries, count = call(*arguments)
        if entries is not None:
            place = _records.record_at("VSPvlanMapEntry", int(entries))
            array: _arrays.Array[Any] = _arrays.Array(place.this, "VSPvlanMapEntry", count)
            hand_out(array, door_of("VSDVS_GetPrivateVLANMap"))
            entries = array
        return status, entries, count

    return called


def _taking_back(free: _Function) -> _Function:
    """A door: what went through it is null from then on, and cannot go through again."""

    def called(given: Any) -> None:
        if not isinstance(given, _records._Pointing):
            free(given)
            return
        for one in given._handed_out():
            release(one, free)

    return called


def _text_or_gone(method: _Function) -> _Function:
    """Of a name that is gone there is no text, and a printed form must be one."""

    def text(name: Any) -> str:
        found = method(name)
        return "<qex_Name that is gone>" if found is None else str(found)

    return text


def _replace(name: str, *makers: Callable[[_Function], _Function]) -> None:
    for make in makers:
        _here[name] = make(_here[name])


_here.update({name: value for name, value in vars(_libvswitch).items() if name[:2] != "__"})

for _name in [name for name in _here if name.endswith("_swigregister")]:
    _here[_name.replace("_swigregister", "_swiginit")] = _attach

for _name in _layout.VIEWS:
    _replace(f"{_name}_get", _view)
for _name in _layout.BOOLEANS:
    _replace(f"{_name}_get", _truth)
for _name, (_element, _size, _count) in _layout.ARRAYS.items():
    _record = max((one for one in _layout.RECORDS if _name.startswith(f"{one}_")), key=len)
    _here[f"{_name}_get"] = _array(_record, _here[f"{_name}_get"], _element, _size, _count)
    if f"{_name}_set" in _here:
        _here[f"{_name}_set"] = _fill_array(_here[f"{_name}_get"], _here[f"{_name}_set"])
for _name in _layout.ADDRESSES:
    _replace(f"{_name}_set", _write_address)
for _name in _layout.METHODS_WITH_VIEWS:
    _replace(_name, _inner)
for _name in _layout.METHODS_WITH_NUMBERS:
    _replace(_name, _number_at)
    _replace(_name.replace("getitem", "setitem"), _put_number)
for _name, _count in _layout.TABLES.items():
    for _access in (f"{_name}___getitem__", f"{_name}___setitem__"):
        if _access in _here:
            _here[_access] = _bounded(_here[_access], _length(_name, _count))
# An entry alone is an array of one; of more there is an Array.
for _name in ("VSMACEntry", "VSPvlanMapEntry"):
    _here[f"{_name}___getitem__"] = _bounded(_here[f"{_name}___getitem__"], lambda entry: 1)
_replace("qex_Name___repr__", _text_or_gone)

for _name, _field, _header, _size in (
    ("VSUplinks", "numEntries", 8, _memory.RECORD_SIZES["VSUplinks_entries"]),
    ("VSUplinkPorts", "nUplinkPorts", 4, 81),
    ("VSUplinkPortIds", "nUplinkPorts", 4, 48),
):
    _here[f"new_{_name}"] = _zeroed(
        getattr(_libvswitch, f"new_{_name}"),
        getattr(_libvswitch, f"{_name}_{_field}_set"),
        _header,
        _size,
    )

_here["alloc_dvmirror_session_table"] = _allocating(
    _libvswitch.alloc_dvmirror_session_table, "free_dvmirror_session_table"
)
for _name, _element in (
    ("vidrangeArray", "qex_NEBPortVIDRange"),
    ("pvlanmapentryArray", "VSPvlanMapEntry"),
):
    _here[f"new_{_name}"] = _new_array(_here[f"new_{_name}"], _element)
    _replace(f"delete_{_name}", _delete_array)
    _here[f"{_name}_getitem"] = _bounded(_here[f"{_name}_getitem"], len)
    _here[f"{_name}_setitem"] = _bounded(_here[f"{_name}_setitem"], len)
_replace("VSDVS_GetPrivateVLANMap", _private_vlan_map)
for _name in _layout.CALLS_WITH_OUTPUTS:
    if _name != "VSDVS_GetPrivateVLANMap":
        _here[_name] = _tuple(_here[_name], door_of(_name))
for _name, _positions in _layout.CALLS_WITH_CELLS.items():
    _here[_name] = _filling(_here[_name], _positions, door_of(_name))
for _name, _positions in _layout.CALLS_WITH_CALLBACKS.items():
    _here[_name] = _calling_back(_here[_name], _positions[0])
for _name in _layout.CALLS_WITH_TRUTHS:
    _replace(_name, _truth)
for _name in DOORS:
    _replace(_name, _taking_back)
