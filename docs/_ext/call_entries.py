"""What there is to say of a call: arguments, results, statuses, and whose memory is whose."""

import re
from dataclasses import dataclass
from typing import Collection, Dict, Iterable, List, Mapping, Optional, Sequence, Tuple

import call_model
import comments
import likeness
import ownership
import statuses
from comments import Comment, Header
from definitions import Definitions, Field, Function, Parameter, Record
from python_types import PythonTypes
from types_in_words import in_words

# Methods and helpers with no text of their own anywhere else.
_ARRAYS = {
    "new_": "Room for `nelements` elements, not zero-filled; Python owns it. "
    "None if there is no memory.",
    "delete_": "Frees an array of `new_{array}`; the object no longer owns it.",
    "_getitem": "A copy of an element, which Python owns. The index is not checked.",
    "_setitem": "Copies a value into an element. The index is not checked.",
}
_INDEX = "from 0 on"


@dataclass(frozen=True)
class Argument:
    name: str
    c_type: str
    types: Tuple[str, str]  # in the module of the classes, and in the flat one
    meaning: str


@dataclass(frozen=True)
class Call:
    """A function as both modules have it."""

    name: str
    method_of: str
    prototype: str
    comment: Comment
    arguments: Tuple[Argument, ...]
    forms: Tuple[Tuple[str, ...], ...]  # the names of the arguments; mostly one form
    results: Tuple[str, str]
    shape: Tuple[str, ...]  # the names of what a list holds; empty for a single result
    statuses: Dict[str, str]  # when each is returned; empty where there is none
    ownership: Tuple[str, ...]
    between_hosts: Tuple[str, ...]  # what is each host's own; nothing of what is no call of theirs
    header: str

    @property
    def attribute(self) -> str:
        """The name in its class, or in its module."""
        return self.name[len(self.method_of) + 1 :] if self.method_of else self.name


class Entries:
    """Makes them of the definitions and of what the headers say."""

    def __init__(
        self,
        known: Definitions,
        calls: Mapping[str, call_model.Call],
        headers: Dict[str, Header],
        helpers: Collection[Header],
    ) -> None:
        self._known = known
        self._calls = calls
        self._headers = headers
        self._helpers = helpers
        self._said_of_types = {
            **headers["nebpublic/handles.h"].types,
            **{one.title: one.text for header in headers.values() for one in header.families},
        }
        self._python_types = (PythonTypes(known, "_flat."), PythonTypes(known))

    def reads_as(self, one: Field) -> str:
        """What an attribute of a class reads as."""
        return self._in_words(self._python_types[0].member(one))

    def _in_words(self, hint: str) -> str:
        return in_words(hint, self._known.records)

    def of_call(self, name: str, forms: List[Function]) -> Call:
        header = self._header_of_call(name)
        prototype, comment = self._said_of(name, header)
        longest = max(forms, key=lambda one: len(one.inputs))
        return Call(
            name=name,
            method_of="",
            prototype=prototype,
            comment=comment,
            arguments=tuple(self._arguments(longest, comment, header)),
            forms=tuple(self._names(one) for one in forms),
            results=self._results(forms[0]),
            shape=_shape_of_result(forms[0]),
            statuses=statuses.of_call(self._calls[name], header) if header else {},
            ownership=tuple(self._ownership(longest)),
            between_hosts=tuple(likeness.of_call(self._calls[name])) if header else (),
            header=header.name if header else "",
        )

    def _ownership(self, function: Function) -> List[str]:
        call = self._calls.get(function.name)
        if call is not None:
            return ownership.of_call(call)
        return ownership.of_function(self._known, function)

    def _names(self, form: Function) -> Tuple[str, ...]:
        names = tuple(_said(one.name) for one in form.inputs)
        return names + (("*more",) if form.takes_more else ())

    def _header_of_call(self, name: str) -> Optional[Header]:
        """The host's header that declares a call; none does one of the module's own."""
        return next((one for one in self._headers.values() if name in one.prototypes), None)

    def _said_of(self, name: str, header: Optional[Header]) -> Tuple[str, Comment]:
        """The prototype of a call, if it has one, and what is said of it."""
        if header is not None:
            return header.prototypes[name], header.comments[name]
        for helper in self._helpers:
            if name in helper.prototypes:
                return helper.prototypes[name], helper.comments[name]
        for part, text in _ARRAYS.items():
            if part in name:
                return "", comments.parted(text.format(array=name[len(part) :]))
        raise KeyError(f"no header says anything of {name}")

    def of_method(self, record: Record, one: Function) -> Call:
        if one.helper:
            _, comment = self._said_of(one.helper, None)
        elif one.name == "__len__":
            comment = comments.parted("How many entries the record says it has.")
        else:
            raise KeyError(f"no header says anything of {record.name}.{one.name}")
        typed = [dict(types.method_arguments(one)) for types in self._python_types]
        return Call(
            name=f"{record.name}_{one.name}",
            method_of=record.name,
            prototype="",
            comment=comment,
            arguments=tuple(
                self._argument(parameter, typed, comment, None) for parameter in one.inputs
            ),
            forms=(tuple(parameter.name for parameter in one.inputs),),
            results=self._results(one),
            shape=(),
            statuses={},
            ownership=(ownership.of_result(self._known, one),),
            between_hosts=(),
            header="",
        )

    def _arguments(
        self, function: Function, comment: Comment, header: Optional[Header]
    ) -> Iterable[Argument]:
        typed = [dict(self._python_types[0].arguments(function))]
        typed.append({one.name: self._python_types[1].argument(one) for one in function.inputs})
        for one in function.inputs:
            yield self._argument(one, typed, comment, header)

    def _argument(
        self,
        one: Parameter,
        typed: Sequence[Dict[str, str]],
        comment: Comment,
        header: Optional[Header],
    ) -> Argument:
        plain, flat = (self._in_words(types[one.name]) for types in typed)
        meaning = self._meaning(one, plain, comment, header)
        if header is not None and self._is_cell(one):
            plain = f'Cell("{one.type.target.spelled()}").pointer'
        return Argument(_said(one.name), one.type.spelled(), (plain, flat), meaning)

    def _meaning(
        self, one: Parameter, plain: str, comment: Comment, header: Optional[Header]
    ) -> str:
        """What a parameter is: as its call says, or its header, or its type."""
        if one.name in comment.parameters:
            return comment.parameters[one.name]
        if header is not None and one.name in header.text.parameters:
            return header.text.parameters[one.name]
        if one.name == "index":
            return _INDEX
        record = self._known.records.get(plain.replace(" or None", ""))
        text = record.doc if record else self._said_of_types.get(one.type.spelled(), "")
        return re.split(r"[.;](?:\s|$)", text, maxsplit=1)[0].replace("\n", " ")

    def _is_cell(self, one: Parameter) -> bool:
        """Whether a call fills or reads the number or the pointer that this one points to."""
        type_ = self._known.resolve(one.type)
        if type_.layers == ("p", "p"):
            return True
        is_number = type_.name not in ("void", "char") and type_.name not in self._known.records
        return type_.layers == ("p",) and is_number and one.python != "bytes"

    def _results(self, function: Function) -> Tuple[str, str]:
        plain = self._in_words(self._python_types[0].result(function))
        if plain == "unsigned int * pointer":
            plain = "int"  # the classes read it
        if function.outputs:
            plain = f"({plain[1:-1]})"  # a tuple; the flat result is a list
        return plain, self._in_words(self._python_types[1].result(function))


def _said(name: str) -> str:
    """The name of a parameter; in capitals, it tells the generator how to treat an array."""
    return "array" if name.isupper() else name


def _shape_of_result(function: Function) -> Tuple[str, ...]:
    if not function.outputs:
        return ()
    return ("status", *(one.name for one in function.outputs))
