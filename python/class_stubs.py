"""The stubs of `libvswitch`: of its classes, and of what the package takes from where."""

from typing import List, Tuple

import families
from definitions import Definitions, Field, Function, Record
from python_types import PythonTypes, not_null
from stub_text import constants, doc, function

_CLASSES_HEAD = '''"""The records of the host as classes."""

import typing
from typing import Any, Optional, Tuple, Union

import _libvswitch as _flat
from libvswitch import _by_hand, _constants as _numbers
from libvswitch._arrays import Array
from libvswitch._records import Record, Table

'''

_CALLS_HEAD = '''"""The calls of the host, and what the module adds to them."""

from typing import Any, Callable, Optional, Tuple, Union, overload

import _libvswitch as _flat
from libvswitch import _constants as _numbers
from libvswitch._arrays import Array
from libvswitch._classes import (
{classes})

'''

_CONSTANTS_HEAD = '''"""The constants of the host.

Those of a family have a type of their own, so that no other can be given in their place. It exists
in stubs only, as the underscore says; at run time there is an `int`, no member of the enumeration.
"""

from typing import Final, TypeVar, Union

from libvswitch import enums as _enums

_Some = TypeVar("_Some", bound="_Bits")

class _Bits(int):
    def __and__(self: _Some, other: int) -> _Some: ...
    def __or__(self: _Some, other: int) -> _Some: ...
    def __xor__(self: _Some, other: int) -> _Some: ...

'''

_PACKAGE_HEAD = '''"""Virtual switches of this host, as classes and functions."""

from _libvswitch import cvar as cvar
from libvswitch._arrays import Array as Array
from libvswitch._ownership import owned as owned
from libvswitch._records import Record as Record, Table as Table
from libvswitch.cells import Callback as Callback, Cell as Cell, Pointer as Pointer
'''


def classes(types: PythonTypes) -> str:
    made = [one for one in types.known.records.values() if not one.is_inner]
    listed = "".join(f'    "{one.name}",\n' for one in made)
    return f"{_CLASSES_HEAD}__all__ = [\n{listed}]\n{''.join(_class(types, one) for one in made)}"


def calls(types: PythonTypes) -> str:
    made = [one.name for one in types.known.records.values() if not one.is_inner]
    listed = "".join(f"    {name},\n" for name in made)
    parts = [_CALLS_HEAD.replace("{classes}", listed)]
    for name, forms in types.known.forms().items():
        for one in forms:
            arguments = [
                ("array" if given.isupper() else given, type_)
                for given, type_ in types.arguments(one)
            ]
            text = function(name, arguments, types.result(one), one.doc)
            if one.takes_more:
                text = text.replace(") ->", ", *more: Any) ->", 1)
            parts.append(f"@overload\n{text}" if len(forms) > 1 else text)
    return "".join(parts)


def constants_of(known: Definitions) -> str:
    numbers = "".join(_number(one.name, one.is_set) for one in families.FAMILIES)
    types = {name: f"_{family}Number" for name, family in families.of_constants(known).items()}
    return f"{_CONSTANTS_HEAD}{numbers}\n{constants(known, types)}"


def _number(family: str, is_set: bool) -> str:
    return (
        f"class _{family}Number({'_Bits' if is_set else 'int'}): ...\n\n"
        f"_{family} = Union[_enums.{family}, _{family}Number]\n\n"
    )


def package(known: Definitions) -> str:
    """What the package takes from where."""
    taken = {
        "_constants": [one.name for one in known.constants],
        "_classes": [one.name for one in known.records.values() if not one.is_inner],
        "_calls": list(known.forms()),
    }
    text = _PACKAGE_HEAD
    names = ["Array", "Callback", "Cell", "Pointer", "Record", "Table", "cvar", "owned"]
    for module, found in taken.items():
        listed = "".join(f"    {name} as {name},\n" for name in sorted(found))
        text += f"from libvswitch.{module} import (\n{listed})\n"
        names += found
    listed = "".join(f'    "{name}",\n' for name in sorted(names))
    return f"{text}\n__all__ = [\n{listed}]\n"


def _class(types: PythonTypes, record: Record) -> str:
    element = _element(types, record)
    base = f"Table[{element}]" if record.count else "Record"
    if record.base:
        base = f"_by_hand.{record.base}"
    text = f"\nclass {record.name}({base}, _flat._{record.name}):\n{doc(record.doc, '    ')}"
    arguments = [("self", ""), *((one.name, types.argument(one)) for one in record.constructor)]
    text += _constructor(types, record) or _method("__init__", arguments, "None", "")
    text += "".join(_property(field, types.property(record, field)) for field in record.fields)
    methods = [one for one in record.methods if not one.is_by_hand]
    text += "".join(_method_of(types, record, one, element) for one in methods)
    if any(one.name == "__getitem__" for one in record.methods) and not record.count:
        text += "    __iter__: None  # an entry is no sequence\n"
    return text


def _constructor(types: PythonTypes, record: Record) -> str:
    """With a keyword for each field that can be set, where no size is to be given."""
    written = [one for one in record.fields if one.is_writable]
    if record.constructor or not written:
        return ""
    keywords = [(one.name, f"{_given(types.property(record, one))} = ...") for one in written]
    return _method("__init__", [("self", ""), *keywords], "None", "").replace(
        "self,", "self, *,", 1
    )


def _given(member: str) -> str:
    """What a field takes from a constructor: of an array, also some elements."""
    is_array = member.startswith("Array[")
    return f"typing.Sequence[{member[len('Array['):]}" if is_array else member


def _element(types: PythonTypes, record: Record) -> str:
    """What a table holds."""
    found = [types.result(one) for one in record.methods if one.name == "__getitem__"]
    found += [one.type.name for one in record.fields if record.count and one.count == record.count]
    element = found[0] if found else "object"
    return "int" if "UnsignedIntPointer" in element else not_null(element)


def _property(field: Field, type_: str) -> str:
    text = f"    @property\n{_method(field.name, [('self', '')], type_, field.doc)}"
    if field.is_writable:
        text += f"    @{field.name}.setter\n"
        text += _method(field.name, [("self", ""), ("value", type_)], "None", "")
    return text


def _method_of(types: PythonTypes, record: Record, one: Function, element: str) -> str:
    arguments = [("self", ""), *types.method_arguments(one)]
    result = types.result(one)
    if one.name == "__getitem__" and record.count:
        result = element
    if one.name == "__setitem__" and record.name == "VSPromiscSessionActiveDsts":
        arguments[-1] = (arguments[-1][0], f"Union[int, {arguments[-1][1]}]")
    result = "str" if one.name == "__repr__" else result
    return _method(one.name, arguments, result, one.doc)


def _method(name: str, arguments: List[Tuple[str, str]], result: str, text: str) -> str:
    made = function(name, arguments, result, text, "    ")
    return made.replace("(self: ", "(self", 1)
