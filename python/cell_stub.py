"""The stub of cells, in which each C type has a form of its own."""

from typing import Dict, List

from definitions import NUMBERS, Type
from python_types import CALLBACK, PythonTypes

_CELLS_HEAD = '''"""Cells: memory of one C type for calls, and functions that C may call."""

from typing import Any, Callable, Generic, Iterable, Iterator, Literal, Optional, Tuple, TypeVar
from typing import Union, overload

import _libvswitch as _flat
from libvswitch import _classes
from libvswitch._records import _Pointing

_Value = TypeVar("_Value")
_Pointer = TypeVar("_Pointer", covariant=True)
_Numbers = Union[None, int, bytes, Iterable[int]]

class Pointer(_Pointing, _flat._VoidPointer):
    """A pointer to memory that it keeps alive."""

    def __init__(self, address: int, spelling: str, owner: object) -> None: ...

class Callback(_Pointing, _flat.{callback}):
    """A function that the library may call for each item of a walk."""

    @property
    def pointer(self) -> _flat.{callback}: ...
    def __init__(self, function: Callable[[Any, Any], Any]) -> None: ...
    def reraise(self) -> None: ...

def cell_of(argument: Any) -> Optional[Cell[Any, Any]]: ...
def filled(
    argument: Any, deallocator: Optional[str], length: Any = ..., is_view: bool = ...
) -> None: ...
def walk(
    call: Callable[..., None], before: Tuple[Any, ...], function: Any, context: Any
) -> None: ...

class Cell(_Pointing, Generic[_Value, _Pointer]):
    """Memory that holds one value of a C type, or several."""

    @property
    def type(self) -> str: ...
    @property
    def pointer(self) -> _Pointer: ...
    @property
    def deallocator(self) -> Optional[str]: ...
    @property
    def value(self) -> _Value: ...
    @value.setter
    def value(self, value: _Value) -> None: ...
    def __getitem__(self, index: int) -> _Value: ...
    def __setitem__(self, index: int, value: _Value) -> None: ...
    def __len__(self) -> int: ...
    def __iter__(self) -> Iterator[_Value]: ...
    def __bytes__(self) -> bytes: ...
    def read(self, length: int) -> bytes: ...
'''


def cells(types: PythonTypes) -> str:
    callback = types.pointer(CALLBACK).split(".")[1]
    forms = _of_numbers(types) + _of_handles(types) + _of_records(types)
    return _CELLS_HEAD.replace("{callback}", callback) + forms


def _of_numbers(types: PythonTypes) -> str:
    """Numbers of the same pointer are one form."""
    known = types.known
    spellings: Dict[str, List[str]] = {}
    for name in sorted(NUMBERS):
        spellings.setdefault(types.pointer(Type(("p",), name)), []).append(name)
    for name in known.typedefs:
        original = known.resolve(Type((), name))
        if not original.layers and original.name in NUMBERS and " " not in name:
            spellings.setdefault(types.pointer(Type(("p",), name)), []).append(name)
    return "".join(
        _form(f"int, {pointer}", names, "_Numbers") for pointer, names in spellings.items()
    )


def _of_handles(types: PythonTypes) -> str:
    known = types.known
    pointer = types.pointer(Type(("p", "p"), "void"))
    handles = [
        name for name in known.typedefs if known.resolve(Type((), name)) == Type(("p",), "void")
    ]
    held = f"Optional[_flat._VoidPointer], {pointer}"
    return _form(held, ["void *", *handles], _one_or_several("_flat._Pointer"))


def _of_records(types: PythonTypes) -> str:
    text = ""
    for name in types.known.pointee_records():
        record, pointer = f"_classes.{name}", types.pointer(Type(("p", "p"), name))
        held = f"Optional[{record}], {pointer}"
        text += _form(held, [f"{name} *"], _one_or_several(record))
    return text


def _one_or_several(pointer: str) -> str:
    """What a cell of pointers starts with."""
    return f"Union[None, {pointer}, Iterable[Optional[{pointer}]]]"


def _form(parameters: str, spellings: List[str], value: str) -> str:
    listed = ", ".join(f'"{name}"' for name in spellings)
    return (
        "    @overload\n"
        f"    def __init__(self: Cell[{parameters}], type: Literal[{listed}], "
        f"value: {value} = ...) -> None: ...\n"
    )
