"""The stubs of `libvswitch`: of its classes, and of what the package takes from where."""

from typing import List, Tuple

from definitions import Definitions, Field, Function, Record
from python_types import PythonTypes, not_null
from stub_text import constants, doc, function

_CLASSES_HEAD = '''"""The classes, the calls and the constants."""

from typing import Any, Callable, Final, Optional, Tuple, Union, overload

import _libvswitch as _flat
from _libvswitch import cvar as cvar
from libvswitch._arrays import Array
from libvswitch._records import Record as Record, Table as Table

# As it was when the classes were loaded; cvar has it as it is.
qex_ModuleCurrentID: int

'''

_PACKAGE_HEAD = '''"""Virtual switches of this host, as classes and functions."""

from libvswitch._arrays import Array as Array
from libvswitch._ownership import owned as owned
from libvswitch.cells import Callback as Callback, Cell as Cell, Pointer as Pointer
'''


def classes(types: PythonTypes) -> str:
    known = types.known
    parts = [_CLASSES_HEAD, constants(known)]
    for record in known.records.values():
        if not record.is_inner:
            parts.append(_class(types, record))
    for name, forms in known.forms().items():
        for one in forms:
            arguments = types.arguments(one)
            hidden = len(forms) > 1
            text = function(name, arguments, types.result(one), one.doc, hidden=hidden)
            parts.append(f"@overload\n{text}" if hidden else text)
    return "".join(parts)


def package(known: Definitions) -> str:
    """What the package takes from where."""
    names = ["Record", "Table", "cvar"]
    names += [one.name for one in known.constants]
    names += [one.name for one in known.records.values() if not one.is_inner]
    names += list(known.forms())
    taken = "".join(f"    {name} as {name},\n" for name in sorted(names))
    names += ["Array", "Callback", "Cell", "Pointer", "owned"]
    listed = "".join(f'    "{name}",\n' for name in sorted(names))
    return f"{_PACKAGE_HEAD}from libvswitch._classes import (\n{taken})\n\n__all__ = [\n{listed}]\n"


def _class(types: PythonTypes, record: Record) -> str:
    element = _element(types, record)
    base = f"Table[{element}]" if record.count else "Record"
    text = f"\nclass {record.name}({base}, _flat._{record.name}):\n{doc(record.doc, '    ')}"
    arguments = [("self", ""), *((one.name, types.argument(one)) for one in record.constructor)]
    text += _method("__init__", arguments, "None", "")
    text += "".join(_property(field, types.member(field)) for field in record.fields)
    text += "".join(_method_of(types, record, one, element) for one in record.methods)
    if any(one.name == "__getitem__" for one in record.methods) and not record.count:
        text += "    __iter__: None  # an entry is no sequence\n"
    return text


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
