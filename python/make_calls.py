"""Writes the functions of libvswitch: make_calls.py TREE FILE

Each is a function of its own, with the checks that its arguments need, the flat call, and what is
to be noted of its results: by whom they are released, and where their memory ends.
"""

import sys
from pathlib import Path
from typing import List

import call_model
import definitions
from call_model import RESULT, Argument, Call, Direction, Length, Ownership, Unit
from definitions import Definitions, Function, Parameter, Type
from python_source import function

_HEAD = '''"""The calls of the host, and what the module adds. Written by python/make_calls.py."""

import _libvswitch as flat
from libvswitch import _arrays, _checks, _memory, _ownership, _records
from libvswitch import cells as _cells

_ABSENT = object()
'''


def functions(known: Definitions) -> str:
    calls = {call.name: call for call in call_model.read(known)}
    made: List[List[str]] = []
    for name, forms in known.forms().items():
        if name in calls:
            made.append(_Writer(known, calls[name], forms).lines())
        else:
            made.append(_helper(known, forms[0]))
    names = "".join(f'    "{name}",\n' for name in sorted(known.forms()))
    text = "\n".join([_HEAD, f"__all__ = [\n{names}]", *("\n".join(["\n", *one]) for one in made)])
    return f"{text}\n"


_POINTER = "_memory.POINTER_SIZE"


class _Writer:
    """One call."""

    def __init__(self, known: Definitions, call: Call, forms: List[Function]) -> None:
        self._known = known
        self._call = call
        self._forms = forms
        self._given = [one for one in call.arguments if not one.is_added]

    def lines(self) -> List[str]:
        names = [one.name for one in self._given]
        more = []
        if len(self._forms) > 1:
            more = [f"{self._forms[1].inputs[-1].name}=_ABSENT"]
        elif self._call.takes_more:
            more = ["*more"]
        body = [line for one in self._given for line in self._check(one)]
        body += self._body([*names, *more])
        return function(self._call.name, [*names, *more], self._call.doc, body)

    def _check(self, one: Argument) -> List[str]:
        type_, where = self._known.resolve(one.type), f'"{self._call.name}: {one.name}"'
        found = []
        if _is_text(one, type_):
            found = [
                f'if {one.name}.__class__ is str and "\\0" in {one.name}:',
                f"    _checks.refuse_nul({where}, {one.name})",
            ]
        elif one.type == Type((), "qex_Bool"):
            found = [
                f"if {one.name}.__class__ is not bool:",
                f"    _checks.truth({where}, {one.name})",
            ]
        elif one.length is not None and one.direction is Direction.IN:
            found = self._check_length(one, one.length, where)
        elif one.direction is Direction.OUT and type_.target.name not in self._known.records:
            found = [f"_checks.cell({where}, {one.name}, {self._room(one)})"]
        elif one.direction is Direction.OUT and type_.target.is_pointer:
            found = [f"_checks.cell({where}, {one.name}, {_POINTER})"]
        elif one.name == "handle" and self._is_walk():
            found = [f"_checks.walked({where}, {one.name})"]
        elif one.name == "callback":
            found = [f"_checks.function({where}, {one.name})"]
        return found

    def _room(self, one: Argument) -> str:
        type_ = self._known.resolve(one.type)
        if type_.is_array:
            return str(type_.count)
        return _POINTER if type_.target.is_pointer else f'_memory.size_of("{type_.target.name}")'

    def _check_length(self, one: Argument, length: Length, where: str) -> List[str]:
        if length.unit is Unit.FORM:
            return [f"_checks.form({where}, {one.name}, {length.of})"]
        target = self._known.resolve(one.type).target.name
        size = "1" if length.unit is Unit.BYTES else f'_memory.size_of("{target}")'
        return [f'_checks.fits({where}, {one.name}, "{length.of}", {length.of}, {size})']

    def _is_walk(self) -> bool:
        return any(one.name == "callback" for one in self._call.arguments)

    def _body(self, names: List[str]) -> List[str]:
        call = f"flat.{self._call.name}({', '.join(names)})"
        if self._call.releases is not None:
            return [f"_ownership.taking_back({names[0]}, flat.{self._call.name})"]
        if self._is_walk():
            *before, callback, context = names
            listed = "".join(f"{one}, " for one in before)
            given = f"flat.{self._call.name}, ({listed}), {callback}, {context}"
            return [f"_cells.walk({given})"]
        if len(self._forms) > 1:
            return self._of_two_forms(names)
        if any(one.is_added for one in self._call.arguments):
            return self._adding(call)
        if self._leaving():
            return [f"result = {call}", *self._leaving(), "return result"]
        if self._known.resolve(self._call.result.type) == Type((), "char"):
            return [f'return {call} != "\\0"']
        returns = "" if self._call.result.c_type == "void" else "return "
        return [f"{returns}{call}"]

    def _of_two_forms(self, names: List[str]) -> List[str]:
        *first, last = names
        more = last.partition("=")[0]
        return [
            f"if {more} is _ABSENT:",
            f"    return tuple(flat.{self._call.name}({', '.join(first)}))",
            f"return flat.{self._call.name}({', '.join([*first, more])})",
        ]

    def _adding(self, call: str) -> List[str]:
        """A call with outputs: a tuple, and its records know their deallocator."""
        outputs = [one for one in self._call.arguments if one.is_added]
        names = ", ".join(one.name for one in outputs)
        body = [f"status, {names} = {call}"]
        results = ["status"]
        for one in outputs:
            result = one.name
            if one.value.ownership is Ownership.ALLOCATED:
                result = self._allocated(one)
                if one.length is not None and one.length.unit is Unit.FORM:
                    body += [
                        f"if {one.name} is not None:",
                        f'    {one.name}.__dict__["_form"] = {one.length.of}',
                    ]
            results.append(result)
        return [*body, f"return {', '.join(results)}"]

    def _allocated(self, one: Argument) -> str:
        deallocator = f'"{one.value.deallocator}"'
        if one.length is not None and one.length.unit is Unit.ELEMENTS:
            element = one.type.target.target.name
            given = f'{one.name}, "{element}", {one.length.of}, {deallocator}, status'
            return f"_ownership.allocated_array({given})"
        return f"_ownership.allocated({one.name}, {deallocator}, status)"

    def _leaving(self) -> List[str]:
        """What is to be noted of pointers that the call leaves in cells of the caller's."""
        found = []
        kinds = (Ownership.ALLOCATED, Ownership.VIEW)
        for one in self._given:
            if one.value.ownership in kinds:
                found.append(self._noted(one))
        if found and self._call.has_status:
            return ["if result == 0:", *(f"    {line}" for line in found)]
        return found

    def _noted(self, one: Argument) -> str:
        value = one.value
        deallocator = "None"
        if value.ownership is Ownership.ALLOCATED and not value.unless:
            deallocator = f'"{value.deallocator}"'
        noted = f"_cells.filled({one.name}, {deallocator}"
        if one.length is not None:
            noted += f", {'result' if one.length.of == RESULT else one.length.of}"
        return f"{noted}, is_view=True)" if value.ownership is Ownership.VIEW else f"{noted})"


def _is_text(one: Argument, type_: Type) -> bool:
    is_chars = type_.name == "char" and (type_.is_array or type_.layers == ("p",))
    return is_chars and one.direction is Direction.IN and one.type.name == "char"


def _helper(known: Definitions, one: Function) -> List[str]:
    """A function that the module adds."""
    names = [_named(parameter) for parameter in one.inputs]
    body: List[str] = []
    for parameter in one.inputs:
        name = _named(parameter)
        array = one.says("within", name)
        if array:
            body.append(f"{name} = _memory.position({name}, len(array))")
        elif known.resolve(parameter.type) == Type(("p",), "char"):
            body.append(f'_checks.text("{name}", {name})')
    call = f"flat.{one.name}({', '.join(names)})"
    if any(one.says("releases", parameter.name) for parameter in one.parameters):
        body.append(f"_ownership.taking_back({names[0]}, flat.{one.name})")
    elif one.says("allocates", RESULT):
        body += [f"{name} = _memory.length_to_make({name})" for name in names]
        body.append(f'return _ownership.allocated({call}, "{one.says("allocates", RESULT)}")')
    elif one.says("elements", RESULT):
        body.append(f"{names[0]} = _memory.length_to_make({names[0]})")
        body.append(f"elements = {call}")
        body.append("if elements is None:")
        body.append(f'    raise MemoryError(f"no memory for {{{names[0]}}} elements")')
        element = known.resolve(one.result).name
        body.append(f'return _arrays.at(elements, "{element}", {names[0]})')
    else:
        body.append(call if one.c_result == "void" else f"return {call}")
    return function(one.name, names, one.doc, body)


def _named(one: Parameter) -> str:
    """In capitals, a name tells the generator how to treat an array."""
    return "array" if one.name.isupper() else one.name


def main() -> None:
    tree, written = sys.argv[1:]
    text = functions(definitions.read(Path(tree)))
    Path(written).write_text(text, encoding="ascii")


if __name__ == "__main__":
    main()
