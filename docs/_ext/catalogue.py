"""All there is to describe, put together: definitions, comments, layouts, types in Python."""

import json
import re
from dataclasses import dataclass
from pathlib import Path
from typing import Dict, Iterable, List, Optional, Sequence, Tuple

import comments
import definitions
import layout
import ownership
import statuses
from comments import Comment, Family, Header, first_sentence
from definitions import Field, Function, Parameter, Record, Type
from pictures import Shape
from python_types import PythonTypes
from types_in_words import in_words

CLASSES, FLAT = "libvswitch", "_libvswitch"
TYPES = "C"  # where the names of C types have their places

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
    statuses: Dict[str, str]  # when each is answered; empty where there is none
    ownership: Tuple[str, ...]
    header: str

    @property
    def attribute(self) -> str:
        """The name in its class, or in its module."""
        return self.name[len(self.method_of) + 1 :] if self.method_of else self.name


class Catalogue:
    def __init__(self, root: Path, build: Path) -> None:
        self.known = definitions.read(build / "classes/made/tree.xml")
        self.layout = layout.read(build / "docs/layout.tsv")
        self.headers = _headers(root / "include")
        self.simulated = _simulated(build / "simhost/calls.json")
        self.types = {
            name: text for header in self.headers.values() for name, text in header.types.items()
        }
        self.helpers = {
            name: text
            for header in _headers(root / "helpers").values()
            for name, text in header.comments.items()
        }
        self.helper_prototypes = {
            name: text
            for header in _headers(root / "helpers").values()
            for name, text in header.prototypes.items()
        }
        known_statuses = {
            name for family in self.headers["qexapi/status.h"].families for name in family.names
        }
        refused = statuses.refused(self.headers.values(), known_statuses)
        if refused:
            raise ValueError("\n".join(["include/README.md asks for other comments", *refused]))
        self.python_types = (PythonTypes(self.known, "_flat."), PythonTypes(self.known))
        self.calls: Dict[str, Call] = {}
        self.methods: Dict[str, List[Call]] = {}
        for name, forms in self.known.forms().items():
            self.calls[name] = self._call(name, forms)
        for record in self.known.records.values():
            self.methods[record.name] = [self._method(record, one) for one in record.methods]
        self._places: Dict[str, List[str]] = {}
        for place, text in self._commented():
            for word in dict.fromkeys(re.findall(r"\w+", text)):
                self._places.setdefault(word, []).append(place)

    def _commented(self) -> Iterable[Tuple[str, str]]:
        """Calls, records and fields, each with what is said of it."""
        for call in self.calls.values():
            comment = call.comment
            said = [comment.text, *comment.statuses.values(), *comment.parameters.values()]
            yield call.name, " ".join(said)
        for record in self.known.records.values():
            yield record.name, record.doc
            for one in record.fields:
                yield f"{record.name}.{one.name}", one.doc

    def places_of(self, constant: str) -> List[str]:
        """The calls, records and fields of which the comments name a constant."""
        return self._places.get(constant, [])

    def title_of(self, family: Family) -> str:
        """What a family is called: its name, if no other has the same, or its comment."""
        namesakes = [
            one
            for header in self.headers.values()
            for one in header.families
            if one.title == family.title
        ]
        if family.title and len(namesakes) == 1:
            return family.title
        return re.split(r"[.;:](?:\s|$)", family.text, maxsplit=1)[0].replace("\n", " ")

    def header_of(self, record: Record) -> str:
        return "/".join(Path(record.header).parts[-2:])

    def door(self, call: Call) -> Optional[str]:
        """The call that takes back what this one hands out."""
        return ownership.door(call.name, self.headers.get(call.header), call.comment)

    def reads_as(self, one: Field) -> str:
        """What an attribute of a class reads as."""
        return self._in_words(self.python_types[0].member(one))

    def shapes(self, record: Record) -> List[Shape]:
        return [self._shape(record, one) for one in record.fields]

    def _shape(self, record: Record, one: Field) -> Shape:
        place = self.layout.places[record.name][one.name]
        type_ = self.known.resolve(one.type)
        count, element = "", 0
        if type_.is_array:
            element = self._size(type_.target)
            if type_.count is None:
                count = one.count or "as many as fit,"
        return Shape(one.name, one.type.spelled(), self._kind(one), place, element, count)

    def _size(self, type_: Type) -> int:
        """Bytes of an array's element."""
        if type_.is_array:
            return (type_.count or 0) * self._size(type_.target)
        if type_.is_pointer:
            return 8
        if type_.name in self.layout.sizes:
            return self.layout.sizes[type_.name]
        sizes = {"char": 1, "short": 2, "int": 4, "long": 8, "long long": 8}
        return sizes[re.sub(r"^(un)?signed ", "", type_.name)]

    def _kind(self, one: Field) -> str:
        type_ = self.known.resolve(one.type)
        if type_.is_pointer:
            return "pointer"
        if one.reads_as_text or (type_.is_array and type_.name == "char"):
            return "text"
        if type_.name in self.known.records:
            return "record"
        if type_.is_array:
            return "array"
        return "bits" if one.is_bit_field else "number"

    def _call(self, name: str, forms: List[Function]) -> Call:
        header = self._header_of_call(name)
        prototype, comment = self._said_of(name, header)
        longest = max(forms, key=lambda one: len(one.inputs))
        return Call(
            name,
            "",
            prototype,
            comment,
            tuple(self._arguments(longest, comment, header)),
            tuple(self._names(one) for one in forms),
            self._results(forms[0]),
            _shape_of_result(forms[0]),
            statuses.of_call(name, header) if header else {},
            tuple(ownership.of_call(self.known, longest, prototype, header, comment)),
            header.name if header else "",
        )

    def _names(self, form: Function) -> Tuple[str, ...]:
        names = tuple(_said(one.name) for one in form.inputs)
        return names + (("*more",) if form.takes_more else ())

    def _header_of_call(self, name: str) -> Optional[Header]:
        """The host's header that declares a call; none does one of the module's own."""
        return next((one for one in self.headers.values() if name in one.prototypes), None)

    def _said_of(self, name: str, header: Optional[Header]) -> Tuple[str, Comment]:
        """The prototype of a call, if it has one, and what is said of it."""
        if header is not None:
            return header.prototypes[name], header.comments[name]
        if name in self.helpers:
            return self.helper_prototypes[name], self.helpers[name]
        for part, text in _ARRAYS.items():
            if part in name:
                return "", comments.parted(text.format(array=name[len(part) :]))
        raise KeyError(f"no header says anything of {name}")

    def _method(self, record: Record, one: Function) -> Call:
        called = re.search(r"(\w+)\(\$self", one.body)
        if one.name == "__len__":
            comment = comments.parted("How many entries the record says it has.")
        elif called and called[1] in self.helpers:
            comment = self.helpers[called[1]]
        else:
            raise KeyError(f"no header says anything of {record.name}.{one.name}")
        name = f"{record.name}_{one.name}"
        typed = [dict(types.method_arguments(one)) for types in self.python_types]
        arguments = tuple(
            self._argument(parameter, typed, comment, None) for parameter in one.inputs
        )
        names = tuple(parameter.name for parameter in one.inputs)
        results, owned = self._results(one), (ownership.of_result(self.known, one),)
        return Call(name, record.name, "", comment, arguments, (names,), results, (), {}, owned, "")

    def _arguments(
        self, function: Function, comment: Comment, header: Optional[Header]
    ) -> Iterable[Argument]:
        typed = [dict(self.python_types[0].arguments(function))]
        typed.append({one.name: self.python_types[1].argument(one) for one in function.inputs})
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
        record = self.known.records.get(plain.replace(" or None", ""))
        handles = self.headers["nebpublic/handles.h"].types
        text = record.doc if record else handles.get(one.type.spelled(), "")
        return first_sentence(text).rstrip(".")

    def _is_cell(self, one: Parameter) -> bool:
        """Whether a call fills or reads a number or a pointer behind this one."""
        type_ = self.known.resolve(one.type)
        if type_.layers == ("p", "p"):
            return True
        is_number = type_.name not in ("void", "char") and type_.name not in self.known.records
        return type_.layers == ("p",) and is_number and not one.is_bytes

    def _results(self, function: Function) -> Tuple[str, str]:
        plain = self._in_words(self.python_types[0].result(function))
        if plain == "unsigned int * pointer":
            plain = "int"  # the classes read it
        if function.outputs:
            plain = f"({plain[1:-1]})"  # a tuple; the flat answer is a list
        return plain, self._in_words(self.python_types[1].result(function))

    def _in_words(self, hint: str) -> str:
        return in_words(hint, self.known.records)


def _said(name: str) -> str:
    """The name of a parameter; in capitals, it tells the generator how to treat an array."""
    return "array" if name.isupper() else name


def _headers(folder: Path) -> Dict[str, Header]:
    found = {}
    for path in sorted(folder.rglob("*.h")):
        name = str(path.relative_to(folder))
        found[name] = comments.read(path, name)
    return found


def _simulated(table: Path) -> Dict[str, str]:
    """What the simulated host does with each call; nothing if none was built."""
    if not table.exists():
        return {}
    rows = json.loads(table.read_text(encoding="utf-8"))
    return {
        row["call"]: f"answers always {row['status']}" if "status" in row else row["answer"]
        for row in rows
    }


def _shape_of_result(function: Function) -> Tuple[str, ...]:
    if not function.outputs:
        return ()
    return ("status", *(one.name for one in function.outputs))
