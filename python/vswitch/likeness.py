"""Holding a call to the same call on another host: alike, or how they differ.

    known = Correspondence()
    for difference in differences(recorded, made, known):
        print(difference.path, difference.recorded, difference.present)

What is each host's own, as the definitions say, is not compared. Numbers of ports, identifiers and
the like are mapped one to one: the first time that both hosts tell one says what it is on the other
from then on. Times and counts need only be there. Addresses say nothing, as they come again by
chance; where a recorded one leads on the present host is learned anew each time.
"""

import re
from collections import OrderedDict
from dataclasses import dataclass
from typing import Any, Callable, Dict, Iterator, List, Optional, Tuple

from libvswitch import enums
from vswitch._meanings import CALLS
from vswitch.trace import Call

__all__ = [
    "Correspondence",
    "Difference",
    "Untranslated",
    "differences",
    "end_of",
    "named",
    "translated",
    "unread_in",
]

_MAPPED = ("PORT_NUMBER", "SWITCH_ID", "PORTSET_NAME", "LAG_NUMBER")
_ONLY_THERE = ("TIME", "COUNT", "LENGTH")
_MEANINGLESS = ("PADDING",)
_IMAGE, _CALLERS_OWN = "IMAGE", "CALLERS_OWN"
# Those learned last: a tool gives an image soon after it got it, and images can be large.
_MOST_IMAGES = 64

NOT_THERE = "nothing"
"""In place of a value that only the other call has."""


class Untranslated(Exception):
    """Why a call cannot be made with what was recorded."""


@dataclass(frozen=True)
class Difference:
    """A value that is another on the present host: where in the call, and both, by their names."""

    path: str
    recorded: Any
    present: Any
    note: str = ""

    @property
    def pattern(self) -> str:
        """The path without the places in lists."""
        return _pattern(self.path)


class Correspondence:
    """What is what on the present host, as far as both hosts have told."""

    def __init__(self) -> None:
        self._here: Dict[str, Dict[Any, Any]] = {kind: {} for kind in _MAPPED}
        self._there: Dict[str, Dict[Any, Any]] = {kind: {} for kind in _MAPPED}
        self._images: "OrderedDict[str, str]" = OrderedDict()

    def learn(self, kind: str, recorded: Any, present: Any) -> str:
        """Why the two cannot be the same thing; nothing if they can."""
        here = self._here[kind].setdefault(recorded, present)
        if here != present:
            return f"{recorded} was {here} before"
        there = self._there[kind].setdefault(present, recorded)
        return "" if there == recorded else f"{present} was {there} before"

    def learn_image(self, recorded: str, present: str) -> None:
        self._images[recorded] = present
        self._images.move_to_end(recorded)
        if len(self._images) > _MOST_IMAGES:
            self._images.popitem(last=False)

    def learn_given(self, call: Call) -> None:
        """What a tool named itself, and both hosts took, has that name on both."""
        for path, kind, value in _values_of_kinds("in", call.inputs, CALLS[call.function]):
            if kind not in _MAPPED or value in self._here[kind] or value in self._there[kind]:
                continue
            self._here[kind][value] = self._there[kind][value] = value

    def present(self, kind: str, recorded: Any) -> Any:
        """What stands on the present host for a value; the value itself until that is known."""
        if kind == _IMAGE:
            return self._images.get(recorded, recorded)
        return self._here[kind].get(recorded, recorded) if kind in _MAPPED else recorded


def named(function: str, path: str, value: Any) -> Any:
    """A value by its name, where it is a status or one of several constants."""
    family = "Status" if path == "status" else CALLS[function]["families"].get(_pattern(path))
    if family is None or type(value) is not int:
        return value
    return str(getattr(enums, family)(value))


def differences(recorded: Call, present: Call, known: Correspondence) -> List[Difference]:
    """How a call went elsewhere than the recorded one, the first difference first."""
    if recorded.trap or present.trap or recorded.status != present.status:
        ends = end_of(recorded), end_of(present)
        path = "trap" if recorded.trap or present.trap else "status"
        return [] if ends[0] == ends[1] else [Difference(path, ends[0], ends[1])]
    if not recorded.status:
        known.learn_given(recorded)
    comparison = _Comparison(recorded.function, known)
    comparison.compare("result", recorded.result, present.result)
    comparison.compare("out", recorded.outputs, present.outputs)
    comparison.compare("callbacks", _visits(recorded), _visits(present))
    return comparison.found


def end_of(call: Call) -> str:
    """How a call ended, in words."""
    if call.trap is not None:
        return f"{call.trap.type}: {call.trap.text}"
    if not call.has_ended or call.was_left:
        return "no end"
    return "an end" if call.status is None else str(named(call.function, "status", call.status))


def _visits(call: Call) -> int:
    """How often a walk called back. How often a host allocates is its own affair."""
    return sum(one.argument == "callback" for one in call.callbacks)


def _pattern(path: str) -> str:
    return re.sub(r"\[\d+\]", "", path)


def unread_in(path: str, value: Any) -> Iterator[str]:
    """What of a value could not be recorded, and why."""
    if isinstance(value, dict) and "unread" in value:
        yield f"{path} was not recorded: {value['unread']}"
    elif isinstance(value, dict):
        for name, one in value.items():
            yield from unread_in(f"{path}.{name}", one)
    elif isinstance(value, list):
        for at, one in enumerate(value):
            yield from unread_in(f"{path}[{at}]", one)


class _Comparison:
    """Of two values, and all in them."""

    def __init__(self, function: str, known: Correspondence) -> None:
        self.found: List[Difference] = []
        self._function = function
        self._kinds: Dict[str, str] = CALLS[function]["volatile"]
        self._known = known

    def compare(self, path: str, recorded: Any, present: Any) -> None:
        self._compare(path, path, recorded, present)

    def _compare(self, path: str, pattern: str, recorded: Any, present: Any) -> None:
        if isinstance(recorded, dict) and isinstance(present, dict):
            self._compare_members(path, pattern, recorded, present)
        elif isinstance(recorded, list) and isinstance(present, list):
            self._compare_elements(path, pattern, recorded, present)
        else:
            self._compare_plain(path, pattern, recorded, present)

    def _compare_members(
        self, path: str, pattern: str, recorded: Dict[str, Any], present: Dict[str, Any]
    ) -> None:
        for name in {**recorded, **present}:
            if name == "at":
                continue
            there, here = recorded.get(name, NOT_THERE), present.get(name, NOT_THERE)
            self._compare(f"{path}.{name}", f"{pattern}.{name}", there, here)

    def _compare_elements(
        self, path: str, pattern: str, recorded: List[Any], present: List[Any]
    ) -> None:
        if len(recorded) != len(present):
            self._tell(path, recorded, present)
            return
        for at, (there, here) in enumerate(zip(recorded, present)):
            self._compare(f"{path}[{at}]", pattern, there, here)

    def _compare_plain(self, path: str, pattern: str, recorded: Any, present: Any) -> None:
        kind = self._kinds.get(pattern)
        if kind in _MEANINGLESS:
            return
        if kind is not None and type(recorded) is type(present) and recorded is not None:
            self._compare_own(path, kind, recorded, present)
        elif type(recorded) is not type(present) or recorded != present:
            self._tell(path, recorded, present)

    def _compare_own(self, path: str, kind: str, recorded: Any, present: Any) -> None:
        if kind == _IMAGE:
            self._known.learn_image(recorded, present)
        elif kind in _MAPPED:
            why = self._known.learn(kind, recorded, present)
            if why:
                self._tell(path, recorded, present, why)
        else:
            assert kind in _ONLY_THERE, kind

    def _tell(self, path: str, recorded: Any, present: Any, why: str = "") -> None:
        there, here = (named(self._function, path, one) for one in (recorded, present))
        self.found.append(Difference(path, there, here, why))


def translated(call: Call, known: Correspondence, address: Callable[[int], int]) -> Dict[str, Any]:
    """What a call is given on the present host; `address` knows where a recorded one leads.

    Untranslated says why it cannot be made.
    """
    meaning = CALLS[call.function]
    for why in unread_in("in", call.inputs):
        raise Untranslated(why)
    _refuse_nulls(call.inputs, meaning)
    given = {
        name: _Translation(meaning["volatile"], known, address).of(f"in.{name}", value)
        for name, value in call.inputs.items()
    }
    for name, length in meaning["lengths"].items():
        # An image may be longer here than it was.
        if isinstance(given.get(name), dict):
            given[length] = len(given[name]["bytes"]) // 2
    return given


def _refuse_nulls(inputs: Dict[str, Any], meaning: Dict[str, Any]) -> None:
    """No host need look before it reads or writes."""
    for name, value in inputs.items():
        if value is not None:
            continue
        if name in meaning["required"]:
            raise Untranslated(f"in.{name} is null, and something must be there")
        length = meaning["lengths"].get(name)
        if length is not None and inputs.get(length) != 0:
            raise Untranslated(f"in.{name} is null, and in.{length} is not 0")


class _Translation:
    def __init__(
        self, kinds: Dict[str, str], known: Correspondence, address: Callable[[int], int]
    ) -> None:
        self._kinds = kinds
        self._known = known
        self._address = address

    def of(self, path: str, value: Any) -> Any:
        if isinstance(value, list):
            return [self.of(path, one) for one in value]
        if not isinstance(value, dict):
            kind = self._kinds.get(path)
            return self._known.present(kind, value) if kind else value
        if "at" in value:
            is_own = self._kinds.get(path) == _CALLERS_OWN
            return {"at": value["at"] if is_own else self._address(value["at"])}
        return {name: self.of(f"{path}.{name}", one) for name, one in value.items()}


def _values_of_kinds(
    path: str, value: Any, meaning: Dict[str, Any]
) -> Iterator[Tuple[str, Optional[str], Any]]:
    if isinstance(value, dict):
        for name, one in value.items():
            yield from _values_of_kinds(f"{path}.{name}", one, meaning)
    elif isinstance(value, list):
        for one in value:
            yield from _values_of_kinds(path, one, meaning)
    elif value is not None and path in meaning["volatile"]:
        yield path, meaning["volatile"][path], value
