"""The stub of `_libvswitch`, the flat module."""

from typing import Set

from definitions import Definitions, Record, Type
from python_types import PythonTypes
from stub_text import constants, function

_FLAT_HEAD = '''"""Flat functions over the libraries through which a host controls its switches.

Every function takes its arguments by position. A call with outputs returns a list, the status
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


def flat(known: Definitions, beyond: Set[str]) -> str:
    """The flat module; `beyond` are names of pointers that only the other stubs use."""
    types = PythonTypes(known)
    types.pointers |= beyond
    parts = [constants(known)]
    for record in known.records.values():
        parts.append(_record(types, record))
    for name, forms in known.forms().items():
        for one in forms:
            arguments = [(p.name, types.argument(p)) for p in one.inputs]
            if name.startswith("delete_"):
                arguments = [("array", types.argument(one.inputs[0]))]
            text = function(name, arguments, types.result(one), hidden=True)
            if one.takes_more:
                text = text.replace(") ->", ", *__more: Any) ->")
            parts.append(f"@overload\n{text}" if len(forms) > 1 else text)
    parts.append(_rest(types))
    body = "".join(parts)
    classes = "".join(
        f"\nclass {name}(_Pointer): ..." for name in sorted(types.pointers) if name != "_Pointer"
    )
    return f"{_FLAT_HEAD}{classes}\n\n{body}"


def _rest(types: PythonTypes) -> str:
    """What is neither a constant nor made of a record or a call."""
    return (
        "def SWIG_PyInstanceMethod_New(__function: Callable[..., Any]) -> Any: ...\n\n"
        "class _Variables:\n"
        "    qex_ModuleCurrentID: int\n"
        f"    runtimeOptionNames: {types.pointer(Type(('p', 'p'), 'char'))}\n\n"
        "cvar: _Variables\n"
    )


def _record(types: PythonTypes, record: Record) -> str:
    if record.is_inner:
        return ""
    name, pointer = record.name, types.pointer(Type(("p",), record.name))
    arguments = [(one.name, types.argument(one)) for one in record.constructor]
    result = f"Union[{pointer}, Any]" if arguments else pointer
    text = function(f"new_{name}", arguments, result, hidden=True)
    text += function(f"delete_{name}", [("record", f"Optional[{pointer}]")], "None", hidden=True)
    text += function(f"{name}_swigregister", [("cls", "Type[Any]")], "None", hidden=True)
    for field in record.fields:
        read = f"{name}_{field.name}_get"
        text += function(read, [("record", pointer)], types.read(field), hidden=True)
        if field.is_writable:
            arguments = [("record", f"Optional[{pointer}]"), ("value", types.write(field))]
            text += function(f"{name}_{field.name}_set", arguments, "None", hidden=True)
    for method in record.methods:
        arguments = [("record", pointer), *types.method_arguments(method)]
        if method.name == "__repr__":
            arguments = [("record", f"Optional[{pointer}]")]
        text += function(f"{name}_{method.name}", arguments, types.result(method), hidden=True)
    return text
