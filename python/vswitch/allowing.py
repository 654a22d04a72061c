"""Differences that are known, each with its reason: the document that replay --allow reads.

    allowed:
    - function: VSDVS_GetMTU
      path: out.mtu
      present: 9000
      reason: the laboratory has jumbo frames
"""

import re
from dataclasses import dataclass
from typing import Any, List, Optional

from vswitch import words
from vswitch._meanings import CALLS
from vswitch.likeness import Difference
from vswitch.words import DocumentError, under

__all__ = ["Allowance", "Allowances", "read"]

_ANY = object()
_KEYS = ("function", "path", "recorded", "present", "reason")


@dataclass
class Allowance:
    """What is allowed: everywhere, or of one function, path or value."""

    reason: str
    function: Optional[str] = None
    path: Optional[str] = None
    """Of a value or of what holds it; [] stands for any place in a list, and so does nothing."""
    recorded: Any = _ANY
    present: Any = _ANY
    used: int = 0

    def covers(self, function: str, difference: Difference) -> bool:
        values = (self.recorded, difference.recorded), (self.present, difference.present)
        return (
            self.function in (None, function)
            and self._leads_to(difference)
            and all(wanted is _ANY or wanted == found for wanted, found in values)
        )

    def _leads_to(self, difference: Difference) -> bool:
        if self.path is None:
            return True
        parts = [_expression(one) for one in re.split(r"(\[\d*\])", self.path)]
        return re.fullmatch("".join(parts) + r"([.\[].*)?", difference.path) is not None

    def __str__(self) -> str:
        values = [] if self.recorded is self.present is _ANY else [self._values()]
        return ": ".join([self.function or "any function", self.path or "any value", *values])

    def _values(self) -> str:
        there, here = ("any" if one is _ANY else one for one in (self.recorded, self.present))
        return f"{there} -> {here}"


def _expression(part: str) -> str:
    """A regular expression for a place, or for what stands before one or after it."""
    if part == "[]":
        return r"(\[\d+\])+"
    if part.startswith("["):
        return re.escape(part)
    return r"(\[\d+\])*\.".join(re.escape(name) for name in part.split("."))


class Allowances:
    """All that are allowed. Those that were not used are to be told, so that lists stay short."""

    def __init__(self, all_: List[Allowance]) -> None:
        self.all = all_

    def allows(self, function: str, difference: Difference) -> bool:
        covering = [one for one in self.all if one.covers(function, difference)]
        for one in covering:
            one.used += 1
        return bool(covering)

    @property
    def unused(self) -> List[Allowance]:
        return [one for one in self.all if not one.used]


def read(document: object) -> Allowances:
    """DocumentError says what is wrong with a document, and where."""
    held = words.members(document, "", ("allowed",))
    if "allowed" not in held:
        raise DocumentError("", "'allowed' is missing")
    given = words.items(held["allowed"], "allowed")
    return Allowances([_read(one, f"allowed[{at}]") for at, one in enumerate(given)])


def _read(given: object, path: str) -> Allowance:
    held = words.members(given, path, _KEYS)
    if "reason" not in held:
        raise DocumentError(path, "'reason' is missing")
    made = Allowance(words.text(held["reason"], under(path, "reason"), least=1))
    if not held.keys() - {"reason"}:
        raise DocumentError(path, "it would allow everything: what, of which function?")
    if "function" in held:
        made.function = words.text(held["function"], under(path, "function"))
        if made.function not in CALLS:
            raise words.fail(under(path, "function"), made.function, "a call of the host")
    if "path" in held:
        made.path = words.text(held["path"], under(path, "path"), least=1)
    made.recorded = held.get("recorded", _ANY)
    made.present = held.get("present", _ANY)
    return made
