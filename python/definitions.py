"""The binding definitions as the generator parsed them, read from the tree that it writes as XML.

What is made beside the module, such as its stubs, is made from this and so cannot drift from it.
"""

import re
import textwrap
import xml.etree.ElementTree as ET
from dataclasses import dataclass, field
from pathlib import Path
from typing import Dict, Iterator, List, Optional, Tuple

_Attributes = Dict[str, str]

_SIZES = ("char", "short", "int", "long long")
# What numbers are by their own names.
NUMBERS = [*_SIZES, *(f"unsigned {size}" for size in _SIZES), "signed char"]


@dataclass(frozen=True)
class Type:
    """A C type: a name after pointers ("p."), arrays ("a(3).", "a()."), in the generator's order.

    Qualifiers are dropped. A function is one word, "f(...)", with its result as the name.
    """

    layers: Tuple[str, ...]
    name: str

    @property
    def is_pointer(self) -> bool:
        return self.layers[:1] == ("p",)

    @property
    def is_array(self) -> bool:
        return self.layers[:1] != () and self.layers[0].startswith("a(")

    @property
    def target(self) -> "Type":
        """What a pointer points to, or what an array holds."""
        return Type(self.layers[1:], self.name)

    @property
    def count(self) -> Optional[int]:
        """How many elements an array has; None for one that goes on past its record."""
        digits = self.layers[0][2:-1]
        return int(digits) if digits not in ("", "0") else None

    def spelled(self) -> str:
        """In C, for a pointer, an array of arrays' pointer or a name."""
        text = ""
        for layer in self.layers:
            if layer == "p":
                text = f"*{text}"
            elif layer.startswith("a("):
                text = f"({text})" if text.startswith("*") else text
                text = f"{text}[{layer[2:-1]}]"
        return f"{self.name} {text}".strip()


@dataclass(frozen=True)
class Parameter:
    name: str
    type: Type
    c_type: str
    is_const: bool  # what it points to
    is_output: bool  # the wrapper owns it and appends its value to the result
    output_record: str  # of an output that is a record: under which type it is returned
    is_required: bool  # null is refused
    python: str  # what stands for it where C does not say it: bytes, a buffer, or nothing, a "part"
    room: int  # of an output that is a text: bytes at most


@dataclass(frozen=True)
class Function:
    name: str
    parameters: Tuple[Parameter, ...]
    result: Type
    doc: str
    takes_more: bool = False
    returns: str = ""  # in Python, where the C type says nothing
    owns_elements: bool = False  # returns a new array
    null: str = ""  # when it returns null: "never", only on "failure", or in the course of things
    helper: str = ""  # of a method: the function of helpers/ that it is
    c_result: str = ""
    family: str = ""  # of a call of the host, as interface/calls names it
    is_by_hand: bool = False  # in the class's base
    deallocator: str = ""  # of what a call allocates, unless `said` names another
    asks: bool = False  # a call of the host that changes nothing of it
    said: Dict[Tuple[str, str], str] = field(default_factory=dict, hash=False)

    def says(self, kind: str, name: str) -> str:
        """What interface/calls says of a parameter or of the result; nothing if it does not."""
        return self.said.get((kind, name), "")

    @property
    def inputs(self) -> List[Parameter]:
        return [parameter for parameter in self.parameters if not parameter.is_output]

    @property
    def outputs(self) -> List[Parameter]:
        return [parameter for parameter in self.parameters if parameter.is_output]


@dataclass(frozen=True)
class Field:
    name: str
    type: Type
    is_writable: bool
    reads_as_text: bool
    doc: str
    count: str  # the field that says how many elements an array without a size has
    is_bit_field: bool = False
    rest: str = ""  # of an array that goes on to the end of its record: the field with its bytes
    holds_text: bool = False  # of an array of bytes
    is_same_bytes: bool = False  # as the first field of its union
    view: Tuple[str, ...] = ()  # of a union: the field that tells, and the constant it then is
    volatile: str = ""  # of what is each host's own: its kind


@dataclass
class Record:
    name: str
    doc: str
    is_inner: bool  # shows as a view into its parent only: no class, no accessors
    header: str
    count: str  # of a sequence: the field that counts its elements, or their number
    fields: List[Field] = field(default_factory=list)
    methods: List[Function] = field(default_factory=list)
    base: str = ""  # of its class, written by hand
    constructor: Tuple[Parameter, ...] = ()
    followed: Tuple[str, ...] = ()  # by records of a name, and the field that counts them
    packed: Tuple[
        str, ...
    ] = ()  # with such, the field with the bytes of all, theirs with their own


@dataclass(frozen=True)
class Constant:
    name: str
    is_text: bool
    doc: str
    family: str  # the enumeration it belongs to, if that has a name
    header: str
    type: Type  # in which the module holds it


@dataclass
class Definitions:
    records: Dict[str, Record] = field(default_factory=dict)
    functions: List[Function] = field(default_factory=list)
    constants: List[Constant] = field(default_factory=list)
    variables: List[str] = field(default_factory=list)
    typedefs: Dict[str, Type] = field(default_factory=dict)

    def resolve(self, given: Type) -> Type:
        """The type without typedefs; a record keeps its name."""
        layers, name = given.layers, _bare(given.name)
        while name not in self.records and name in self.typedefs:
            original = self.typedefs[name]
            layers, name = layers + original.layers, _bare(original.name)
        return Type(layers, name)

    def forms(self) -> Dict[str, List[Function]]:
        """The functions by name; those of two forms are two."""
        found: Dict[str, List[Function]] = {}
        for one in self.functions:
            found.setdefault(one.name, []).append(one)
        return found

    def pointee_records(self) -> List[str]:
        """Records that calls allocate through a pointer to a pointer of the caller's."""
        original = (self.resolve(one.type) for call in self.functions for one in call.inputs)
        names = {one.name for one in original if one.layers == ("p", "p")}
        return sorted(names & set(self.records))


def read(path: Path) -> Definitions:
    found = Definitions()
    _collect(ET.parse(path).getroot(), found, "", "")
    return found


def _bare(name: str) -> str:
    return re.sub(r"^(struct|union) ", "", name)


def _attributes(node: ET.Element) -> _Attributes:
    listed = node.find("attributelist")
    if listed is None:
        return {}
    return {item.get("name", ""): item.get("value", "") for item in listed.findall("attribute")}


def _children(node: ET.Element) -> Iterator[Tuple[ET.Element, _Attributes]]:
    for child in node:
        if child.tag != "attributelist":
            yield child, _attributes(child)


def _collect(node: ET.Element, found: Definitions, header: str, family: str) -> None:
    for child, seen in _children(node):
        if child.tag == "class":
            found.records[seen["name"]] = _record(child, seen, header)
        elif child.tag == "cdecl" and seen.get("kind") == "typedef":
            found.typedefs[seen["name"]] = _type(seen["decl"] + seen["type"])
        elif child.tag == "cdecl" and seen.get("kind") == "function":
            found.functions.append(_function(child, seen))
        elif child.tag == "cdecl" and seen.get("view") == "variableHandler":
            found.variables.append(seen["name"])
        elif child.tag == "enum":
            found.typedefs[f"enum {seen.get('name', '')}"] = Type((), "int")
            _collect(child, found, header, seen.get("name", ""))
        elif child.tag == "enumitem":
            name, number = seen["sym_name"], Type((), "int")
            found.constants.append(Constant(name, False, _text(seen), family, header, number))
        elif child.tag == "constant":
            found.constants.append(_constant(seen, header))
        elif child.tag in ("include", "extern", "module"):
            _collect(child, found, seen.get("name", ""), family)


def _constant(seen: _Attributes, header: str) -> Constant:
    is_text = seen["type"].endswith("char")
    # The comment of a row of definitions stands before what the first says of itself.
    doc = re.sub(r"\.\s{2,}(?=\S)", ": ", _text(seen))
    return Constant(seen["sym_name"], is_text, doc, "", header, _type(seen["type"]))


def _record(node: ET.Element, seen: _Attributes, header: str) -> Record:
    record = Record(
        seen["name"],
        _text(seen),
        is_inner=not any(member.tag == "destructor" for member in node),
        header=header,
        count=seen.get("feature_count", ""),
        base=seen.get("feature_base", ""),
        followed=_words(seen, "followed"),
        packed=_words(seen, "packed"),
    )
    _collect_members(node, record)
    return record


def _collect_members(node: ET.Element, record: Record) -> None:
    for child, seen in _children(node):
        if child.tag == "extend":
            _collect_members(child, record)
        elif child.tag == "constructor":
            record.constructor = _parameters(child, seen)
        elif child.tag == "cdecl" and seen.get("kind") == "function":
            record.methods.append(_function(child, seen))
        elif child.tag == "cdecl" and "sym_name" in seen:
            record.fields.append(
                Field(
                    seen["sym_name"],
                    _type(seen["decl"] + seen["type"]),
                    is_writable=seen.get("feature_immutable") != "1",
                    reads_as_text=seen.get("tmap_out_python") == "text",
                    doc=_text(seen),
                    count=seen.get("feature_count", ""),
                    is_bit_field="bitfield" in seen,
                    rest=seen.get("feature_rest", ""),
                    holds_text=seen.get("feature_holds_text") == "1",
                    is_same_bytes=seen.get("feature_same_bytes") == "1",
                    view=_words(seen, "view"),
                    volatile=seen.get("feature_volatile", ""),
                )
            )


def _words(seen: _Attributes, feature: str) -> Tuple[str, ...]:
    return tuple(seen.get(f"feature_{feature}", "").split())


def _function(node: ET.Element, seen: _Attributes) -> Function:
    whole = _split_layers(seen["decl"] + seen["type"])
    parameters = _parameters(node, seen)
    named = tuple(parameter for parameter in parameters if parameter.type.name != "...")
    result = ".".join(whole[1:])
    return Function(
        seen["sym_name"],
        named,
        _type(result),
        _text(seen),
        takes_more=len(named) != len(parameters),
        returns=seen.get("feature_returns", ""),
        owns_elements=seen.get("feature_new") == "1",
        null=seen.get("feature_null", ""),
        helper=seen.get("feature_helper", ""),
        c_result=_spelled_in_c(result),
        family=seen.get("feature_family", ""),
        is_by_hand=seen.get("feature_by_hand") == "1",
        deallocator=seen.get("feature_deallocator", ""),
        asks=seen.get("feature_asks") == "1",
        said=_said(seen),
    )


# The words of interface/calls/facts.i that are said of one parameter, or of the result.
_WORDS = (
    "allocates",
    "bytes",
    "elements",
    "form",
    "nullable",
    "reads",
    "releases",
    "shows",
    "takes",
    "unless",
    "volatile",
    "within",
)


def _said(seen: _Attributes) -> Dict[Tuple[str, str], str]:
    found = {}
    for key, value in seen.items():
        kind, _, name = key[len("feature_") :].partition("_")
        if key.startswith("feature_") and kind in _WORDS and name and value:
            found[kind, name] = value
    return found


def _parameters(node: ET.Element, of: _Attributes) -> Tuple[Parameter, ...]:
    found = []
    listed = node.find("attributelist/parmlist")
    said = _said(of)
    for parm in [] if listed is None else list(listed):
        seen = _attributes(parm)
        if seen.get("type") == "void":
            continue
        name, encoded = seen.get("name", ""), seen["type"]
        found.append(
            Parameter(
                name,
                Type((), "...") if encoded == "v(...)" else _type(encoded),
                c_type="..." if encoded == "v(...)" else _spelled_in_c(encoded),
                is_const="q(const)" in encoded,
                is_output=seen.get("tmap_in_numinputs") == "0",
                output_record=seen.get("tmap_argout_record", ""),
                is_required="tmap_check_required" in seen,
                python=seen.get("tmap_in_python", "") or said.get(("takes", name), ""),
                room=int(seen.get("tmap_in_room", "0")),
            )
        )
    # An argument of several C parameters is one of Python's.
    return tuple(one for one in found if one.python != "part")


def _split_layers(encoded: str) -> List[str]:
    """Parts of the generator's spelling at the dots that no parentheses enclose."""
    parts, depth, last = [], 0, ""
    for char in encoded:
        depth += (char == "(") - (char == ")")
        if char == "." and depth == 0 and not last.endswith(".."):
            parts.append(last)
            last = ""
        else:
            last += char
    return parts + [last]


def _type(encoded: str) -> Type:
    *layers, name = _split_layers(encoded)
    return Type(tuple(layer for layer in layers if not layer.startswith("q(")), _bare(name))


def _spelled_in_c(encoded: str) -> str:
    """A type as C has it: `char const *`, `VSUplinks **`, `char const [32]`."""
    *layers, name = _split_layers(encoded)
    text = ""
    for layer in layers:
        if layer == "p":
            text = f"*{text}"
        elif layer.startswith("q("):
            text = f" {layer[2:-1]} {text}"
        elif layer.startswith("a("):
            text = f"{text}[{layer[2:-1]}]"
        else:
            return f"{name} (*)({layer[2:-1]})"
    return re.sub(r"\s+", " ", f"{name} {text}").strip()


def _text(seen: _Attributes) -> str:
    return undecorated(seen.get("doxygen", ""))


def undecorated(comment: str) -> str:
    """A header's comment without what makes it one."""
    lines = [re.sub(r"^\s*\*? ?", "", line) for line in comment.splitlines()]
    return textwrap.dedent("\n".join(line.rstrip() for line in lines)).strip()
