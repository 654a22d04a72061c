"""Making the calls of a trace again, on the host of this process, and what became of them.

    check(path, host)
    report = replay(path, host)
    for name, of in report.functions.items():
        print(name, of.calls, of.alike, of.first)

Calls are made one after the other in the order in which they ended, whichever process and thread
made them; those of a callback within the walk that calls back. However long the trace is, it takes
as much memory as there are different things in it.
"""

from collections import Counter
from dataclasses import dataclass, field
from pathlib import Path
from typing import Any, Callable, Counter as Counts, Dict, List, Optional, Protocol, Tuple, Union

from vswitch._meanings import CALLS
from vswitch.likeness import (
    Correspondence,
    Difference,
    Untranslated,
    differences,
    end_of,
    translated,
    unread_in,
)
from vswitch.trace import Call, Callback, Process, Trace, TraceError, Trap

__all__ = ["Host", "NOT_MADE", "OfFunction", "Replay", "Report", "check", "replay"]

NOT_MADE = "not made"
"""The path of the difference that a call was not made; what is present is the reason."""

Visit = Callable[[str, Dict[str, Any]], int]
"""What a host calls back: the argument that it was given as, what it gives, and what it gets."""


class Host(Protocol):
    """A host on which calls are made."""

    def check(self, function: str, inputs: Dict[str, Any]) -> Optional[str]:
        """Why no call can be given this; nothing if one can."""

    def make(self, function: str, inputs: Dict[str, Any], visit: Visit) -> Dict[str, Any]:
        """Makes a call; its end as a trace has it, with addresses for numbers of them."""


@dataclass
class OfFunction:
    """What became of the calls of a function: how many, of each kind."""

    alike: int = 0
    allowed: int = 0
    """That differ, or were not made, as is known."""
    different: int = 0
    not_made: int = 0
    left_out: int = 0
    """Because they may change the host, and only questions were wanted."""
    paths: Counts[str] = field(default_factory=Counter)
    """What differed, without places in lists, and in how many calls."""
    reasons: Counts[str] = field(default_factory=Counter)
    """Why calls were not made, and how many."""
    first: Optional[Tuple[Call, Difference]] = None

    @property
    def calls(self) -> int:
        return self.alike + self.allowed + self.different + self.not_made + self.left_out


@dataclass
class Report:
    functions: Dict[str, OfFunction] = field(default_factory=dict)

    def of(self, function: str) -> OfFunction:
        return self.functions.setdefault(function, OfFunction())

    @property
    def is_alike(self) -> bool:
        """Whether every call that was to be made was, and went as recorded or as is known."""
        return not any(one.different or one.not_made for one in self.functions.values())


_UNKNOWN = "it is given what no call that was made has returned, or what is released"
_NO_WALK = "it was made in a callback of no walk that ended"
_WALK_NOT_MADE = "the walk that it was made in was not made"
# Records within records are far less deep.
_DEEPEST = 50

Allows = Callable[[str, Difference], bool]
Progress = Callable[[int], None]


def check(path: Union[str, Path], host: Host) -> int:
    """Reads all of a trace, and refuses one with a call that no host could be asked; how many
    calls there are."""
    count = 0
    with Trace(path) as trace:
        for count, call in enumerate(trace, 1):
            said = _wrong_with(call, host)
            if said:
                raise TraceError(trace.path, trace.line, f"call {call.number}: {said}")
    return count


def _wrong_with(call: Call, host: Host) -> Optional[str]:
    if call.function not in CALLS:
        return f"there is no call {call.function!r:.60}"
    values = [call.inputs, call.outputs, call.result, *(one.inputs for one in call.callbacks)]
    if not _is_nested_less(values, _DEEPEST):
        return "its values are nested too deeply"
    # What could not be recorded is no mistake of the trace.
    is_whole = next(unread_in("in", call.inputs), None) is None
    return host.check(call.function, call.inputs) if is_whole else None


def _is_nested_less(value: Any, deepest: int) -> bool:
    if not isinstance(value, (dict, list)):
        return True
    inner = value.values() if isinstance(value, dict) else value
    return deepest > 0 and all(_is_nested_less(one, deepest - 1) for one in inner)


def replay(
    path: Union[str, Path],
    host: Host,
    allows: Allows = lambda function, difference: False,
    questions_only: bool = False,
    progress: Progress = lambda count: None,
) -> Report:
    """Makes the calls of a trace that was checked."""
    made = Replay(host, allows, questions_only)
    with Trace(path) as trace:
        for count, call in enumerate(trace, 1):
            made.take(call, trace.processes.get(call.process))
            progress(count)
    made.end()
    return made.report


class _Addresses:
    """Where recorded addresses of a process lead on the present host."""

    def __init__(self) -> None:
        self._present: Dict[int, int] = {}

    def find(self, number: int) -> int:
        if number not in self._present:
            raise Untranslated(_UNKNOWN)
        return self._present[number]

    def learn(self, recorded: Any, present: Any) -> None:
        """Takes each address that both have at the same place."""
        if isinstance(recorded, list) and isinstance(present, list):
            for there, here in zip(recorded, present):
                self.learn(there, here)
        elif isinstance(recorded, dict) and isinstance(present, dict):
            number = _number_of(recorded)
            if number is not None and "at" in present:
                self._present[number] = present["at"]
            for name in recorded.keys() & present.keys() - {"at"}:
                self.learn(recorded[name], present[name])

    def forget(self, recorded: Any) -> None:
        number = _number_of(recorded)
        if number is not None:
            self._present.pop(number, None)


def _number_of(pointer: Any) -> Optional[int]:
    number = pointer.get("at") if isinstance(pointer, dict) else None
    return number if isinstance(number, int) else None


class Replay:
    """Takes the calls of a trace as they ended, and makes them."""

    def __init__(self, host: Host, allows: Allows, questions_only: bool) -> None:
        self.report = Report()
        self._host = host
        self._allows = allows
        self._questions_only = questions_only
        self._known = Correspondence()
        self._addresses: Dict[int, Tuple[Optional[Process], _Addresses]] = {}
        # Calls of callbacks, until the walk that called back is there.
        self._waiting: Dict[Tuple[int, int], Call] = {}

    def take(self, call: Call, process: Optional[Process]) -> None:
        known = self._addresses.get(call.process)
        if known is None or known[0] is not process:
            # One that runs another program has other memory, and counts anew.
            self._leave_waiting([key for key in self._waiting if key[0] == call.process])
            self._addresses[call.process] = process, _Addresses()
        if call.within is not None:
            self._waiting[call.process, call.number] = call
        else:
            self._replay(call)

    def end(self) -> None:
        """There are no more calls."""
        self._leave_waiting(list(self._waiting))

    def _leave_waiting(self, keys: List[Tuple[int, int]]) -> None:
        for key in keys:
            self._note_not_made(self._waiting.pop(key), _NO_WALK)

    def _replay(self, call: Call) -> None:
        of = self.report.of(call.function)
        if self._questions_only and not CALLS[call.function]["asks"]:
            of.left_out += 1
            self._leave(call.callbacks, _WALK_NOT_MADE)
            return
        try:
            made, found = self._made(call)
        except Untranslated as why:
            self._note_not_made(call, str(why))
            self._leave(call.callbacks, _WALK_NOT_MADE)
            return
        new = [one for one in found if not self._allows(call.function, one)]
        if not found:
            of.alike += 1
        elif not new:
            of.allowed += 1
        else:
            of.different += 1
            of.paths.update({one.pattern for one in new})
            of.first = of.first or (call, new[0])

    def _note_not_made(self, call: Call, why: str) -> None:
        of = self.report.of(call.function)
        missing = Difference(NOT_MADE, end_of(call), why)
        if self._allows(call.function, missing):
            of.allowed += 1
        else:
            of.not_made += 1
            of.reasons[why] += 1
            of.first = of.first or (call, missing)

    def _leave(self, callbacks: List[Callback], why: str) -> None:
        """Says of the calls in callbacks, and in theirs, that they were not made either."""
        left = list(callbacks)
        for callback in left:
            for number in callback.calls:
                inner = self._waiting.pop((callback.process, number), None)
                if inner is not None:
                    self._note_not_made(inner, why)
                    left += inner.callbacks

    def _made(self, call: Call) -> Tuple[Call, List[Difference]]:
        meaning = CALLS[call.function]
        _refuse_what_cannot_be(call)
        addresses = self._addresses[call.process][1]
        inputs = translated(call, self._known, addresses.find)
        visits = _Visits(call, addresses, self._make_within)
        end = self._host.make(call.function, inputs, visits.visit)
        self._leave(visits.left(), "the host did not call back so often")
        if meaning["releases"]:
            addresses.forget(call.inputs[meaning["releases"]])
        made = _as_call(call, inputs, end, visits.made)
        addresses.learn([call.result, call.outputs], [made.result, made.outputs])
        return made, differences(call, made, self._known)

    def _make_within(self, callback: Callback) -> None:
        for number in callback.calls:
            inner = self._waiting.pop((callback.process, number), None)
            if inner is not None:
                self._replay(inner)


def _refuse_what_cannot_be(call: Call) -> None:
    if CALLS[call.function]["takes_more"]:
        raise Untranslated("what follows its format is not recorded")
    if not call.has_ended:
        raise Untranslated("its process ended during it")
    if call.was_left:
        raise Untranslated("the tool left it by a jump")


class _Visits:
    """What the host calls back during a call, beside what it called back when that was recorded."""

    def __init__(
        self, call: Call, addresses: _Addresses, make_within: Callable[[Callback], None]
    ) -> None:
        self.made: List[Callback] = []
        self._recorded: Dict[str, List[Callback]] = {}
        for one in call.callbacks:
            self._recorded.setdefault(one.argument, []).append(one)
        self._call = call
        self._addresses = addresses
        self._make_within = make_within

    def visit(self, argument: str, inputs: Dict[str, Any]) -> int:
        call = self._call
        made = Callback(0, call.process, call.thread, argument, 0, inputs, has_ended=True)
        self.made.append(made)
        recorded = self._recorded.get(argument)
        if not recorded:
            # Go on: how often the host calls back is to be seen.
            return 1
        there = recorded.pop(0)
        if argument == "release":
            self._addresses.forget(there.inputs.get("memory"))
            return 0
        self._addresses.learn(there.inputs, inputs)
        if argument == "alloc":
            # What it gets is where it lies.
            self._addresses.learn(there.result, inputs.get("result"))
            return 0
        self._make_within(there)
        return there.result if isinstance(there.result, int) else 1

    def left(self) -> List[Callback]:
        return [one for held in self._recorded.values() for one in held]


def _as_call(
    recorded: Call, inputs: Dict[str, Any], end: Dict[str, Any], callbacks: List[Callback]
) -> Call:
    trap = end.get("trap")
    return Call(
        number=recorded.number,
        process=recorded.process,
        thread=recorded.thread,
        function=recorded.function,
        at=recorded.at,
        inputs=inputs,
        outputs=end.get("out", {}),
        status=end.get("status"),
        result=end.get("result"),
        trap=Trap(trap["type"], trap["text"], trap["value"]) if trap else None,
        has_ended=True,
        callbacks=callbacks,
    )
