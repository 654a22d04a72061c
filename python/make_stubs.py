"""Writes the type stubs of `_libvswitch` and `libvswitch` from the binding definitions.

Pointer objects of different C types are different classes here, although the interpreter has one
class for all of them: what the module would refuse, the type checker refuses first. Their names
start with an underscore, because they exist in stubs only.
"""

import sys
import textwrap
from pathlib import Path
from typing import Dict, Iterable, List, Set, Tuple

import definitions
from definitions import Definitions, Field, Function, Parameter, Record, Type

_FLAT_HEAD = '''"""Flat functions over the libraries through which a host controls its switches.

Every function takes its arguments by position. A call with outputs answers a list, the status
first; lists of a fixed shape are spelled as tuples here, which is the only way to say what is at
which place. A null pointer is None; where only a failure brings one, the type says
`Union[..., Any]`, so that whoever has looked at the status need not ask again.
"""

from typing import Any, Callable, Final, Optional, Tuple, Type, Union, overload

class _Pointer:
    """A pointer object of any type."""

    def __int__(self) -> int: ...
    def __eq__(self, other: object) -> bool: ...
    def __hash__(self) -> int: ...
    def own(self, owned: Optional[bool] = ...) -> bool: ...
    def acquire(self) -> None: ...
    def disown(self) -> None: ...
'''

_CLASSES_HEAD = '''"""The classes, the calls and the constants."""

from typing import Any, Callable, Final, Optional, Tuple, Union, overload

import _libvswitch as _flat
from _libvswitch import cvar as cvar
from libvswitch._records import Array, Record as Record, Table as Table

# As it was when the classes were loaded; cvar has it as it is.
qex_ModuleCurrentID: int

'''

_PACKAGE_HEAD = '''"""Virtual switches of this host, as classes and functions."""

from libvswitch._ownership import owned as owned
from libvswitch._records import Array as Array
from libvswitch.cells import Callback as Callback, Cell as Cell, Pointer as Pointer
'''

_CELLS_HEAD = '''"""Cells: memory of one C type for calls, and functions that C may call."""

from typing import Any, Callable, Generic, Iterable, Iterator, Literal, Optional, TypeVar, Union
from typing import overload

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

    pointer: _flat.{callback}
    def __init__(self, function: Callable[[Any, Any], Any]) -> None: ...
    def reraise(self) -> None: ...

def cell_behind(argument: Any) -> Optional[Cell[Any, Any]]: ...

class Cell(_Pointing, Generic[_Value, _Pointer]):
    """Memory that holds one value of a C type, or several."""

    type: str
    door: Optional[str]
    pointer: _Pointer
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

_SIZES = ("short", "int", "long long")
_INTEGERS = {*_SIZES, *(f"unsigned {size}" for size in _SIZES)}
_INTEGERS |= {"unsigned char", "signed char"}
_CALLBACK = Type(("p", "f(p.void,p.void)"), "char")


class Stubs:
    """Names of Python types for C types; with `prefix`, seen from the module of the classes."""

    def __init__(self, known: Definitions, prefix: str = "") -> None:
        self.known = known
        self.prefix = prefix
        self.pointers: Set[str] = set()

    def pointer(self, given: Type) -> str:
        """The class of pointers of this type."""
        type_ = self.known.resolve(given)
        target = type_.target
        if not target.layers and target.name in self.known.records:
            if self.prefix and not self.known.records[target.name].is_inner:
                return target.name
            return self._named(f"_{target.name}")
        return self._named(f"_{self._words(type_)}")

    def _named(self, name: str) -> str:
        self.pointers.add(name)
        return f"{self.prefix}{name}"

    def _words(self, type_: Type) -> str:
        if not type_.layers:
            if type_.name in self.known.records:
                return type_.name
            return "".join(word.capitalize() for word in type_.name.split())
        layer = type_.layers[0]
        inner = self._words(type_.target)
        if layer == "p":
            return f"{inner}Pointer"
        if layer.startswith("f("):
            count = 0 if layer == "f()" else layer.count(",") + 1
            return f"{inner}Function{count}"
        return f"{inner}Array{layer[2:-1]}"

    def argument(self, one: Parameter) -> str:
        type_ = self.known.resolve(one.type)
        if one.is_bytes:
            return "bytes"
        if one.name == "mac_str":
            return "Union[bytes, bytearray, memoryview]"
        if not type_.layers and type_.name in self.known.records:
            return self.pointer(Type(("p",), type_.name))
        found = self.value(type_)
        return found if one.is_required else self._or_none(type_, found)

    def arguments(self, function: Function) -> List[Tuple[str, str]]:
        """Names and types; where elements are counted or picked, an array is one."""
        found = []
        for one, behind in zip(function.inputs, [*function.inputs[1:], None]):
            type_ = self.argument(one)
            target = self.known.resolve(one.type).target.name
            is_array = function.name.endswith(("Array", "Array_getitem", "Array_setitem"))
            is_counted = behind is not None and behind.name in ("count", "numRanges")
            if self.prefix and target in self.known.records and (is_counted or is_array):
                if self.known.resolve(one.type).is_pointer:
                    type_ = type_.replace(target, f"Union[{target}, Array[{target}]]")
            found.append((one.name, type_))
        return found

    def value(self, type_: Type) -> str:
        """What stands for a value that goes in."""
        if not type_.layers:
            return "Union[int, str]" if type_.name == "char" else "int"
        if type_.name == "char" and len(type_.layers) == 1:
            return f"Union[str, {self.pointer(Type(('p',), 'char'))}]"
        if type_ == Type(("p",), "void"):
            return f"{self.prefix}_Pointer"
        if type_ == _CALLBACK and self.prefix:
            return f"Union[Callable[[Any, Any], Any], {self.pointer(type_)}]"
        return self.pointer(type_)

    def _or_none(self, type_: Type, found: str) -> str:
        return f"Optional[{found}]" if type_.layers else found

    def result(self, function: Function) -> str:
        """What a function answers."""
        first = self._single_result(function)
        if not function.outputs:
            return first
        return f"Tuple[{', '.join([first, *map(self._output, function.outputs)])}]"

    def _single_result(self, function: Function) -> str:
        type_ = self.known.resolve(function.result)
        if function.answers:
            return function.answers
        if not type_.layers:
            if type_.name == "void":
                return "None"
            if type_.name in self.known.records:
                return self.pointer(Type(("p",), type_.name))
            if type_.name == "char":
                return "bool" if self.prefix else "str"
            return "int"
        if function.owns_elements and self.prefix:
            return f"Array[{type_.name}]"
        found = "str" if type_ == Type(("p",), "char") else self.pointer(type_)
        if function.null == "never" or (function.null == "failure" and self.prefix):
            return found
        return f"Union[{found}, Any]" if function.null == "failure" else f"Optional[{found}]"

    def _output(self, one: Parameter) -> str:
        target = self.known.resolve(one.type).target
        if target.is_pointer:
            if self.prefix and target.name == "VSPvlanMapEntry":
                return f"Union[Array[{target.name}], Any]"
            return f"Union[{self.pointer(Type(('p',), one.output_record))}, Any]"
        return "str" if target.name == "char" and one.type.name == "char" else "int"

    def read(self, field: Field) -> str:
        """What a flat reader answers."""
        type_ = self.known.resolve(field.type)
        if field.reads_as_text or (type_.is_array and type_.layers[1:] == () and _is_text(type_)):
            return "str"
        if type_.is_array:
            return self.pointer(Type(("p", *type_.layers[1:]), type_.name))
        if not type_.layers:
            if type_.name in self.known.records:
                return self.pointer(Type(("p",), type_.name))
            return "str" if type_.name == "char" else "int"
        return f"Optional[{self.pointer(type_)}]"

    def write(self, field: Field) -> str:
        """What a flat writer takes."""
        type_ = self.known.resolve(field.type)
        if field.reads_as_text:
            return self.pointer(Type(("p",), "unsigned char"))
        found = self.read(field)
        if found == "str":
            return self.value(type_) if not type_.layers else f"Optional[{self.value(type_)}]"
        return "Optional[_Pointer]" if found == "Optional[_VoidPointer]" else found

    def member(self, field: Field) -> str:
        """What a property of a class reads as, and takes."""
        type_ = self.known.resolve(field.type)
        if field.type == Type((), "qex_Bool"):
            return "bool"
        if not type_.is_array or self.read(field) == "str":
            return self.read(field)
        inner = type_.target
        if inner.is_array:
            return "Array[str]" if inner.name == "char" else "Array[bytes]"
        return f"Array[{inner.name if inner.name in self.known.records else 'int'}]"


def _is_text(type_: Type) -> bool:
    return type_.name == "char"


def doc(text: str, indent: str) -> str:
    """A documentation text, or nothing."""
    if not text:
        return ""
    text = text.replace("\\", "\\\\").replace('"""', "'''")
    lines = text.splitlines()
    if len(lines) == 1:
        return f'{indent}"""{lines[0]}"""\n'
    return textwrap.indent(f'"""{lines[0]}\n' + "\n".join(lines[1:]) + '\n"""', indent) + "\n"


def function(
    name: str,
    arguments: Iterable[Tuple[str, str]],
    result: str,
    text: str = "",
    indent: str = "",
    hidden: bool = False,
) -> str:
    """A function; with `hidden`, its arguments have no names for the caller."""
    listed = ", ".join(f"{'__' if hidden else ''}{one}: {type_}" for one, type_ in arguments)
    head = f"{indent}def {name}({listed}) -> {result}:"
    body = doc(text, f"{indent}    ")
    return f"{head}\n{body}" if body else f"{head} ...\n"


def constants(known: Definitions) -> str:
    lines = []
    for one in known.constants:
        lines.append(f"{one.name}: Final[{'str' if one.is_text else 'int'}]\n")
        lines.append(doc(one.doc, ""))
    return "".join(lines)


def overloads(known: Definitions) -> Dict[str, List[Function]]:
    """The functions by name; those of two forms are two."""
    found: Dict[str, List[Function]] = {}
    for one in known.functions:
        found.setdefault(one.name, []).append(one)
    return found


def flat(known: Definitions, beyond: Set[str]) -> str:
    """The flat module; `beyond` are names of pointers that only the other stubs use."""
    stubs = Stubs(known)
    stubs.pointers |= beyond
    parts = [constants(known)]
    for record in known.records.values():
        parts.append(flat_record(stubs, record))
    for name, forms in overloads(known).items():
        for one in forms:
            arguments = [(p.name, stubs.argument(p)) for p in one.inputs]
            if name.startswith("delete_"):
                arguments = [("array", stubs.argument(one.inputs[0]))]
            text = function(name, arguments, stubs.result(one), hidden=True)
            if one.takes_more:
                text = text.replace(") ->", ", *__more: Any) ->")
            parts.append(f"@overload\n{text}" if len(forms) > 1 else text)
    parts.append(
        "def SWIG_PyInstanceMethod_New(__function: Callable[..., Any]) -> Any: ...\n\n"
        "class _Variables:\n"
        "    qex_ModuleCurrentID: int\n"
        f"    runtimeOptionNames: {stubs.pointer(Type(('p', 'p'), 'char'))}\n\n"
        "cvar: _Variables\n"
    )
    body = "".join(parts)
    classes = "".join(
        f"\nclass {name}(_Pointer): ..." for name in sorted(stubs.pointers) if name != "_Pointer"
    )
    return f"{_FLAT_HEAD}{classes}\n\n{body}"


def flat_record(stubs: Stubs, record: Record) -> str:
    if record.is_inner:
        return ""
    name, pointer = record.name, stubs.pointer(Type(("p",), record.name))
    arguments = [(one.name, stubs.argument(one)) for one in record.constructor]
    result = f"Union[{pointer}, Any]" if arguments else pointer
    text = function(f"new_{name}", arguments, result, hidden=True)
    text += function(f"delete_{name}", [("record", f"Optional[{pointer}]")], "None", hidden=True)
    text += function(f"{name}_swigregister", [("cls", "Type[Any]")], "None", hidden=True)
    for field in record.fields:
        read = f"{name}_{field.name}_get"
        text += function(read, [("record", pointer)], stubs.read(field), hidden=True)
        if field.is_writable:
            arguments = [("record", f"Optional[{pointer}]"), ("value", stubs.write(field))]
            text += function(f"{name}_{field.name}_set", arguments, "None", hidden=True)
    for method in record.methods:
        arguments = [("record", pointer), *method_arguments(stubs, method)]
        if method.name == "__repr__":
            arguments = [("record", f"Optional[{pointer}]")]
        text += function(f"{name}_{method.name}", arguments, stubs.result(method), hidden=True)
    return text


def method_arguments(stubs: Stubs, method: Function) -> List[Tuple[str, str]]:
    """The arguments of methods must be there, whatever their type."""
    found = [(one.name, stubs.argument(one)) for one in method.inputs]
    return [
        (name, type_[9:-1] if type_.startswith("Optional[") else type_) for name, type_ in found
    ]


def classes(stubs: Stubs) -> str:
    known = stubs.known
    parts = [_CLASSES_HEAD, constants(known)]
    for record in known.records.values():
        if not record.is_inner:
            parts.append(class_of(stubs, record))
    for name, forms in overloads(known).items():
        for one in forms:
            arguments = stubs.arguments(one)
            hidden = len(forms) > 1
            text = function(name, arguments, stubs.result(one), one.doc, hidden=hidden)
            parts.append(f"@overload\n{text}" if hidden else text)
    return "".join(parts)


def package(known: Definitions) -> str:
    """What the package takes from where."""
    names = ["Record", "Table", "cvar"]
    names += [one.name for one in known.constants]
    names += [one.name for one in known.records.values() if not one.is_inner]
    names += list(overloads(known))
    taken = "".join(f"    {name} as {name},\n" for name in sorted(names))
    names += ["Array", "Callback", "Cell", "Pointer", "owned"]
    listed = "".join(f'    "{name}",\n' for name in sorted(names))
    return f"{_PACKAGE_HEAD}from libvswitch._classes import (\n{taken})\n\n__all__ = [\n{listed}]\n"


def class_of(stubs: Stubs, record: Record) -> str:
    elements = [stubs.result(one) for one in record.methods if one.name == "__getitem__"]
    elements += [
        one.type.name for one in record.fields if record.count and one.count == record.count
    ]
    element = elements[0] if elements else "object"
    element = "int" if "UnsignedIntPointer" in element else element
    element = element[9:-1] if element.startswith("Optional[") else element
    base = f"Table[{element}]" if record.count else "Record"
    text = f"\nclass {record.name}({base}, _flat._{record.name}):\n{doc(record.doc, '    ')}"
    arguments = [("self", ""), *((one.name, stubs.argument(one)) for one in record.constructor)]
    text += method("__init__", arguments, "None", "")
    for field in record.fields:
        type_ = stubs.member(field)
        text += f"    @property\n{method(field.name, [('self', '')], type_, field.doc)}"
        if field.is_writable:
            text += f"    @{field.name}.setter\n"
            text += method(field.name, [("self", ""), ("value", type_)], "None", "")
    for one in record.methods:
        arguments = [("self", ""), *method_arguments(stubs, one)]
        result = stubs.result(one)
        if one.name == "__getitem__" and record.count:
            result = element
        if one.name == "__setitem__" and record.name == "VSPromiscSessionActiveDsts":
            arguments[-1] = (arguments[-1][0], f"Union[int, {arguments[-1][1]}]")
        result = "str" if one.name == "__repr__" else result
        text += method(one.name, arguments, result, one.doc)
    if any(one.name == "__getitem__" for one in record.methods) and not record.count:
        text += "    __iter__: None  # an entry is no sequence\n"
    return text


def method(name: str, arguments: List[Tuple[str, str]], result: str, text: str) -> str:
    made = function(name, arguments, result, text, "    ")
    return made.replace("(self: ", "(self", 1)


def cells(stubs: Stubs) -> str:
    known = stubs.known
    callback = stubs.pointer(_CALLBACK).split(".")[1]
    names: Dict[str, List[str]] = {}
    for name in sorted(_INTEGERS | {"char"}):
        names.setdefault(stubs.pointer(Type(("p",), name)), []).append(name)
    for name in known.typedefs:
        resolved = known.resolve(Type((), name))
        if not resolved.layers and resolved.name in _INTEGERS | {"char"} and " " not in name:
            names.setdefault(stubs.pointer(Type(("p",), name)), []).append(name)
    text = ""
    for pointer, spellings in names.items():
        text += cell_form(f"int, {pointer}", spellings, "_Numbers")
    handle = stubs.pointer(Type(("p", "p"), "void"))
    handles = [
        name for name in known.typedefs if known.resolve(Type((), name)) == Type(("p",), "void")
    ]
    any_pointer = one_or_several("_flat._Pointer")
    text += cell_form(f"Optional[_flat._VoidPointer], {handle}", ["void *", *handles], any_pointer)
    for name in known.records_behind_pointers():
        record, pointer = f"_classes.{name}", stubs.pointer(Type(("p", "p"), name))
        held = f"Optional[{record}], {pointer}"
        text += cell_form(held, [f"{name} *"], one_or_several(record))
    return _CELLS_HEAD.replace("{callback}", callback) + text


def one_or_several(pointer: str) -> str:
    """What a cell of pointers starts with."""
    return f"Union[None, {pointer}, Iterable[Optional[{pointer}]]]"


def cell_form(parameters: str, spellings: List[str], value: str) -> str:
    listed = ", ".join(f'"{name}"' for name in spellings)
    return (
        "    @overload\n"
        f"    def __init__(self: Cell[{parameters}], type: Literal[{listed}], "
        f"value: {value} = ...) -> None: ...\n"
    )


def main() -> None:
    tree, folder = sys.argv[1:]
    known = definitions.read(Path(tree))
    stubs = Stubs(known, "_flat.")
    written = {
        "libvswitch/__init__.pyi": package(known),
        "libvswitch/_classes.pyi": classes(stubs),
        "libvswitch/cells.pyi": cells(stubs),
    }
    written["_libvswitch.pyi"] = flat(known, stubs.pointers)
    for name, text in written.items():
        Path(folder, name).write_text(text, encoding="utf-8")


if __name__ == "__main__":
    main()
