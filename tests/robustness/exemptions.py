"""What the sweep leaves out, and what may end in SystemError: each rule with its reason.

What a rule leaves out is the contract's own freedom: the module promises no check there.
"""

import functools
import re
from typing import Callable, List, NamedTuple, Optional

from arguments import IntegerKind
from every import BufferKind, Function, spellings
from pool import Value


class Rule(NamedTuple):
    """Values of some argument that are not tried, or outcomes that are right."""

    reason: str
    functions: str
    """A pattern of their names."""
    applies: Callable[[Function, int, Value], bool]


def _number(value: Value) -> Optional[int]:
    """The number that an integer object is; some objects fail when they are asked what they are."""
    return int.__index__(value.object) if issubclass(type(value.object), int) else None


def _is_other_index(function: Function, position: int, value: Value) -> bool:
    """An index that converts and leads far away; those near stay inside the memory of a test."""
    number = _number(value)
    if not isinstance(function.arguments[position], IntegerKind) or number is None:
        return False
    return not -4 <= number <= 4 and abs(number) < 2**64


def _converts(function: Function, position: int, value: Value) -> bool:
    return bool(value.spellings & spellings(function.arguments[position]))


def _is_short_buffer(function: Function, position: int, value: Value) -> bool:
    if not isinstance(function.arguments[position], BufferKind):
        return False
    try:
        return memoryview(value.object).nbytes < 6
    except (TypeError, ValueError):
        return False


def _is_large(function: Function, position: int, value: Value) -> bool:
    number = _number(value)
    return number is not None and not -1 <= number < 2**15


def _is_beyond(function: Function, position: int, value: Value) -> bool:
    kind, number = function.arguments[position], _number(value)
    if not isinstance(kind, IntegerKind) or kind.low == 0 or number is None:
        return False
    return not -(2**63) <= number < 2**63


def _always(function: Function, position: int, value: Value) -> bool:
    return True


NOT_TRIED: List[Rule] = [
    Rule(
        "These indexes are not checked: outside the array they lead to whatever memory is there.",
        r"VSMcastFilter\w*_get_\w+|(VSMACEntry|VSPvlanMapEntry|VSTeamPolicy)___[gs]etitem__"
        r"|VSPortVlanPolicy_get_vid_range|DVMirrorSessionTable_get_first_session_entity"
        r"|\w+Array_[gs]etitem",
        _is_other_index,
    ),
    Rule(
        "What a destructor is given must have come from its constructor; it goes to free().",
        r"delete_\w+|free_dvmirror_session_table",
        _converts,
    ),
    Rule(
        "Six bytes are read, however long the buffer is.",
        r"VSMACEntry_set_mac_address",
        _is_short_buffer,
    ),
    Rule(
        "A table's size has 32 bits; counts beyond them get less memory than they ask for.",
        r"alloc_dvmirror_session_table",
        _is_large,
    ),
]

SYSTEM_ERRORS: List[Rule] = [
    Rule(
        "An int beyond 64 bits makes the call with -1, and its OverflowError follows.",
        r"\w+",
        _is_beyond,
    ),
    Rule(
        "An index of no session returns null without an error.",
        r"VSDVMirrorSessionIDs___getitem__",
        _always,
    ),
]


@functools.lru_cache(maxsize=None)
def _rules(name: str, tried: bool) -> List[Rule]:
    rules = SYSTEM_ERRORS if tried else NOT_TRIED
    return [rule for rule in rules if re.fullmatch(rule.functions, name)]


def not_tried(function: Function, position: int, value: Value) -> bool:
    """Whether a rule leaves this value out."""
    return any(rule.applies(function, position, value) for rule in _rules(function.name, False))


def may_be_system_error(function: Function, position: int, value: Value) -> bool:
    """Whether a call with this value may rightly end in SystemError."""
    return any(rule.applies(function, position, value) for rule in _rules(function.name, True))
