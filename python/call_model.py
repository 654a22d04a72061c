"""What is known of each call of the host: the one model that generators are written against.

    known = definitions.read(tree)
    for call in call_model.read(known):
        print(call.name, call.family, [argument.name for argument in call.arguments])

A `Call` is a function as the host's headers declare it, with what interface/calls says beyond C:
which arguments it fills, what may be null, which argument counts which, and whose memory is whose.
Nothing here depends on how either module passes the values.
"""

import enum
from dataclasses import dataclass
from typing import Dict, Iterator, List, Optional, Tuple

from definitions import Definitions, Function, Parameter, Type

STATUS = "QEX_ReturnStatus"
RESULT = "RESULT"
"""Stands for what a call returns, where an argument could be named."""


class Direction(enum.Enum):
    """Which way an argument's value goes. No call of the host reads what it then overwrites."""

    IN = "in"
    OUT = "out"


class Ownership(enum.Enum):
    """Whose memory an argument or a result points to, once the call has returned."""

    VALUE = "a value, a text or a handle: nobody has to care for memory"
    CALLER = "the caller's, which the call reads or fills and does not keep"
    ALLOCATED = "allocated, until the deallocator releases it"
    VIEW = "a view of what stays the host's, which nothing releases"
    RELEASED = "released by this call"


class Unit(enum.Enum):
    """What a length counts."""

    BYTES = "bytes"
    ELEMENTS = "elements"
    FORM = "the bytes of an address in the form that the argument names"


class Volatile(enum.Enum):
    """What is each host's own, so that calls of two hosts are not alike in it."""

    PORT_NUMBER = "the number of a port"
    SWITCH_ID = "the identifier of a switch"
    PORTSET_NAME = "the name of a port set"
    LAG_NUMBER = "the number of a LAG"
    IMAGE = "bytes in a form of the host's own"
    LENGTH = "how long those are"
    TIME = "a time"
    COUNT = "what the host has counted"
    PADDING = "bytes that mean nothing"
    CALLERS_OWN = "the caller's own, which the host hands on"


@dataclass(frozen=True)
class Length:
    """Where the length of an array stands: in the argument `of`, or in what the call returns."""

    unit: Unit
    of: str


@dataclass(frozen=True)
class Value:
    """What the memory of an argument or a result is."""

    ownership: Ownership
    deallocator: str = ""  # of what is allocated
    unless: str = ""  # when the deallocator is another, which only the caller knows
    until: str = ""  # what ends a view

    def __post_init__(self) -> None:
        if (self.ownership is Ownership.ALLOCATED) != bool(self.deallocator):
            raise ValueError("what is allocated has a deallocator, and nothing else has")


@dataclass(frozen=True)
class Argument:
    name: str
    type: Type
    c_type: str
    direction: Direction
    is_nullable: bool
    length: Optional[Length]  # of an array; none of texts, which end with a NUL
    room: int  # of a text that the call writes: bytes at most, its NUL not counted; else 0
    value: Value
    is_added: bool  # both modules own it and add its value to the result
    volatile: Optional[Volatile] = None

    @property
    def is_text(self) -> bool:
        """A text for the call to read."""
        is_character = self.type.name == "char" and len(self.type.layers) == 1
        return is_character and self.direction is Direction.IN


@dataclass(frozen=True)
class Result:
    type: Type
    c_type: str
    is_nullable: bool
    value: Value
    volatile: Optional[Volatile] = None


@dataclass(frozen=True)
class Call:
    name: str
    family: str
    doc: str
    arguments: Tuple[Argument, ...]
    result: Result
    takes_more: bool  # further arguments, as printf does
    asks: bool = False  # it changes nothing of the host; any other may

    @property
    def has_status(self) -> bool:
        return self.result.type == Type((), STATUS)

    @property
    def has_pointers(self) -> bool:
        """Whether a null can be passed, or returned."""
        types = [self.result.type, *(one.type for one in self.arguments)]
        return any("p" in one.layers for one in types)

    @property
    def texts(self) -> List[str]:
        return [one.name for one in self.arguments if one.is_text]

    @property
    def inputs(self) -> List[Argument]:
        return [one for one in self.arguments if one.direction is Direction.IN]

    @property
    def outputs(self) -> List[Argument]:
        return [one for one in self.arguments if one.direction is Direction.OUT]

    @property
    def allocates(self) -> List[Argument]:
        return [one for one in self.outputs if one.value.ownership is Ownership.ALLOCATED]

    @property
    def releases(self) -> Optional[Argument]:
        """What a deallocator takes; none of any other call."""
        taken = (one for one in self.inputs if one.value.ownership is Ownership.RELEASED)
        return next(taken, None)

    def argument(self, name: str) -> Argument:
        return next(one for one in self.arguments if one.name == name)


def read(known: Definitions) -> List[Call]:
    """Every call once, in the order of the headers."""
    found: Dict[str, Call] = {}
    for function in known.functions:
        if function.family:
            # A second form is one of the modules', not another function of the host.
            found.setdefault(function.name, _call(known, function))
    _refuse_what_is_said_of_nothing(known, found)
    return list(found.values())


def _call(known: Definitions, function: Function) -> Call:
    return Call(
        name=function.name,
        family=function.family,
        doc=function.doc,
        arguments=tuple(_argument(known, function, one) for one in function.parameters),
        result=_result(known, function),
        takes_more=function.takes_more,
        asks=function.asks,
    )


def _argument(known: Definitions, function: Function, one: Parameter) -> Argument:
    direction = _direction(known, function, one)
    return Argument(
        name=one.name,
        type=one.type,
        c_type=one.c_type,
        direction=direction,
        is_nullable=function.says("nullable", one.name) != "",
        length=_length(function, one.name),
        room=_room(known, one, direction),
        value=_value(known, function, one, direction),
        is_added=one.is_output,
        volatile=_volatile(function, one.name),
    )


def _direction(known: Definitions, function: Function, one: Parameter) -> Direction:
    type_ = known.resolve(one.type)
    is_memory = (type_.is_pointer or type_.is_array) and type_ != Type(("p",), "void")
    if not is_memory or is_function(type_) or one.is_const or function.says("reads", one.name):
        return Direction.IN
    return Direction.OUT


def _room(known: Definitions, one: Parameter, direction: Direction) -> int:
    type_ = known.resolve(one.type)
    if direction is Direction.OUT and type_.is_array and type_.name == "char":
        return (type_.count or 0) - 1
    return one.room


def _length(function: Function, name: str) -> Optional[Length]:
    names = {RESULT, *(one.name for one in function.parameters)}
    for unit in Unit:
        of = function.says(unit.name.lower(), name)
        if of in names:
            return Length(unit, of)
    return None


def _value(known: Definitions, function: Function, one: Parameter, direction: Direction) -> Value:
    type_ = known.resolve(one.type)
    if function.says("releases", one.name):
        return Value(Ownership.RELEASED)
    if direction is Direction.OUT and type_.target.is_pointer:
        return _left_behind(function, one.name)
    if one.is_output or not _is_memory_of_the_caller(known, one, direction):
        return Value(Ownership.VALUE)
    return Value(Ownership.CALLER)


def _is_memory_of_the_caller(known: Definitions, one: Parameter, direction: Direction) -> bool:
    """Whether it points to more than a text, a handle, a function or the number of an output."""
    type_ = known.resolve(one.type)
    if type_.name in known.records:
        return type_.is_pointer
    is_given = direction is Direction.IN and one.type.is_pointer
    return is_given and type_.name != "char" and not is_function(type_)


def is_function(type_: Type) -> bool:
    return type_.layers[1:2] != () and type_.layers[1].startswith("f(")


def _left_behind(function: Function, name: str) -> Value:
    """Whose is what a call leaves behind a pointer of the caller's."""
    until = function.says("shows", name)
    if until:
        return Value(Ownership.VIEW, until=until)
    deallocator = function.says("allocates", name) or function.deallocator
    return Value(Ownership.ALLOCATED, deallocator, function.says("unless", name))


def _result(known: Definitions, function: Function) -> Result:
    type_ = known.resolve(function.result)
    value = Value(Ownership.VALUE)
    until = function.says("shows", RESULT)
    if type_.is_pointer and type_.name != "char":
        value = Value(Ownership.VIEW, until=until)
    volatile = _volatile(function, RESULT)
    return Result(function.result, function.c_result, type_.is_pointer, value, volatile)


def _volatile(function: Function, name: str) -> Optional[Volatile]:
    given = (one.name for one in function.parameters)
    images = [one for one in given if function.says("volatile", one) == "image"]
    lengths = [_length(function, one) for one in images]
    if any(one is not None and one.of == name for one in lengths):
        return Volatile.LENGTH
    return kind_of(function.says("volatile", name))


def kind_of(said: str) -> Optional[Volatile]:
    """The kind that interface/ names."""
    return Volatile[said.upper()] if said else None


def _refuse_what_is_said_of_nothing(known: Definitions, found: Dict[str, Call]) -> None:
    wrong = [*_unknown_names(known), *_unknown_deallocators(found)]
    if wrong:
        raise ValueError("interface/calls says what cannot be: " + "; ".join(wrong))


def _unknown_names(known: Definitions) -> Iterator[str]:
    for function in known.functions:
        names = {RESULT, *(one.name for one in function.parameters)}
        for (kind, name), value in function.said.items():
            # These are said of a whole family, and concern the calls that have the arguments.
            if name not in names and kind not in ("bytes", "elements", "volatile"):
                yield f"{function.name} has no {name} for {kind} {value}"


def _unknown_deallocators(found: Dict[str, Call]) -> Iterator[str]:
    for call in found.values():
        for one in call.allocates:
            taker = found.get(one.value.deallocator)
            if taker is None or taker.releases is None:
                yield f"{call.name}: {one.value.deallocator} releases nothing"
