"""Traces: what a tool asked of its host, read back a call at a time.

    with Trace("trace.jsonl") as trace:
        for call in trace:
            print(call.function, call.inputs, call.status)

A trace is text, a line of JSON for each event. A call has a line when it begins and one when it
ends, so that one which ended its process is there, too; here both are one `Call`, which comes when
it has ended. Reading takes as much memory as there are calls in progress, however long it is.
"""

import json
from dataclasses import dataclass, field
from pathlib import Path
from typing import IO, Any, Dict, Iterator, List, Optional, Tuple, Union

__all__ = ["Call", "Callback", "Process", "Trace", "TraceError", "Trap", "has_calls"]

MARK = "vswitch trace"
VERSION = 1

_Key = Tuple[int, int]  # of an event: its process, and its number in that


class TraceError(Exception):
    """A file that is no trace, or a trace with a line that is wrong."""

    def __init__(self, path: Path, line: int, what: str) -> None:
        super().__init__(f"{path}: line {line}: {what}")
        self.line = line
        self.what = what


@dataclass(frozen=True)
class Trap:
    """How a call ended that had no status for it."""

    type: Optional[str]
    text: Optional[str]
    value: int


@dataclass(frozen=True)
class Process:
    """A process that was recorded, and the libraries that its calls went on to."""

    id: int
    parent: int
    time: str
    program: str
    libraries: Dict[str, str]


@dataclass
class Callback:
    """What the host called back, during a call."""

    number: int
    process: int
    thread: int
    argument: str
    at: int  # microseconds since its process began
    inputs: Dict[str, Any]
    within: Optional[int] = None  # the call that the host was asked
    result: Any = None
    has_ended: bool = False
    calls: List[int] = field(default_factory=list)  # made by the tool meanwhile


@dataclass
class Call:
    """A call that a tool made.

    `status` is None for a call that has none, and with a trap. Without an end, the process ended
    during the call.
    """

    number: int
    process: int
    thread: int
    function: str
    at: int  # microseconds since its process began
    inputs: Dict[str, Any]
    within: Optional[int] = None  # the callback that made it
    line: int = 0  # of the trace, in which it begins
    outputs: Dict[str, Any] = field(default_factory=dict)
    status: Optional[int] = None
    result: Any = None
    trap: Optional[Trap] = None
    took: Optional[int] = None  # nanoseconds
    has_ended: bool = False
    was_left: bool = False  # by a jump of the tool's own
    callbacks: List[Callback] = field(default_factory=list)


class Trace:
    """A trace in a file. What is wrong in it is a TraceError that says the line."""

    def __init__(self, path: Union[str, Path]) -> None:
        self.path = Path(path)
        self.processes: Dict[int, Process] = {}
        """Those of which lines were read."""
        self.line = 1
        """That was read last."""
        self._open: Dict[_Key, Union[Call, Callback]] = {}
        self._left: List[Call] = []  # by processes that became other programs
        self._file: IO[bytes] = open(self.path, "rb")
        try:
            self.header = self._header()
        except BaseException:
            self._file.close()
            raise

    def __enter__(self) -> "Trace":
        return self

    def __exit__(self, *unused: object) -> None:
        self._file.close()

    def __iter__(self) -> Iterator[Call]:
        """The calls as they ended, and last those that did not."""
        for held in self._file:
            self.line += 1
            ended = self._read(self._parsed(held))
            if ended is not None:
                yield ended
        for process in {number for number, _ in self._open}:
            self._leave(process)
        yield from self._left
        self._left.clear()

    def _header(self) -> Dict[str, Any]:
        # A foreign file may be one endless line.
        held = self._file.readline(1 << 20)
        try:
            header = json.loads(held)
        except ValueError:
            header = None
        version = header.get(MARK) if isinstance(header, dict) else None
        if type(version) is not int:
            raise self._wrong("this is no trace: one begins with what made it")
        if version > VERSION:
            raise self._wrong(
                f"a trace of version {version}, and this program reads those up to {VERSION}"
            )
        if version < 1 or not held.endswith(b"\n"):
            raise self._wrong("the head of the trace is damaged")
        made: Dict[str, Any] = header
        return made

    def _wrong(self, what: str) -> TraceError:
        return TraceError(self.path, self.line, what)

    def _parsed(self, held: bytes) -> Dict[str, Any]:
        if not held.endswith(b"\n"):
            raise self._wrong("the trace is cut off in the middle of a line")
        try:
            event = json.loads(held)
        except (ValueError, RecursionError) as error:
            raise self._wrong(f"no JSON: {error}") from None
        if not isinstance(event, dict):
            raise self._wrong("no event: a line is an object")
        return event

    def _read(self, event: Dict[str, Any]) -> Optional[Call]:
        try:
            if "end" in event:
                return self._end(event)
            if "call" in event:
                self._begin(_call(event, self.line))
            elif "callback" in event:
                self._begin(_callback(event))
            elif "parent" in event:
                self._begin_process(_process(event))
            else:
                raise ValueError("no event that a trace has")
        except KeyError as error:
            raise self._wrong(f"the event lacks {error}") from None
        except ValueError as error:
            raise self._wrong(str(error)) from None
        return None

    def _begin_process(self, process: Process) -> None:
        # One that runs another program counts anew, and ends nothing of what it had begun.
        self._leave(process.id)
        self.processes[process.id] = process

    def _leave(self, process: int) -> None:
        """What a process has begun will not end."""
        for key in [one for one in self._open if one[0] == process]:
            event = self._open.pop(key)
            if isinstance(event, Call):
                self._left.append(event)

    def _begin(self, event: Union[Call, Callback]) -> None:
        key = event.process, event.number
        if key in self._open:
            raise ValueError(f"the number {event.number} begins a second time")
        outer = self._outer(event)
        if isinstance(event, Callback):
            if isinstance(outer, Call):
                outer.callbacks.append(event)
        elif isinstance(outer, Callback):
            outer.calls.append(event.number)
        self._open[key] = event

    def _outer(self, event: Union[Call, Callback]) -> Union[Call, Callback, None]:
        if event.within is None:
            return None
        outer = self._open.get((event.process, event.within))
        if outer is None or isinstance(outer, type(event)):
            raise ValueError(f"nothing is in progress that could have the number {event.within}")
        return outer

    def _end(self, event: Dict[str, Any]) -> Optional[Call]:
        number = _whole(event, "end")
        begun = self._open.pop((_whole(event, "process"), number), None)
        if begun is None:
            raise ValueError(f"the end of {number}, which did not begin")
        begun.has_ended = True
        begun.result = event.get("result")
        if isinstance(begun, Callback):
            return None
        begun.was_left = event.get("left", False) is True
        begun.took = _whole(event, "took") if "took" in event else None
        begun.status = _whole(event, "status") if "status" in event else None
        begun.outputs = _named(event, "out") if "out" in event else {}
        if "trap" in event:
            trap = _named(event, "trap")
            texts = [None if trap[one] is None else _text(trap, one) for one in ("type", "text")]
            begun.trap = Trap(texts[0], texts[1], _whole(trap, "value"))
        return begun


def has_calls(path: Union[str, Path]) -> bool:
    """Whether a trace has any."""
    with Trace(path) as trace:
        return any(True for _ in trace)


def _whole(event: Dict[str, Any], name: str) -> int:
    found = event[name]
    if type(found) is not int:
        raise ValueError(f"{name} is no whole number: {found!r:.40}")
    return found


def _text(event: Dict[str, Any], name: str) -> str:
    found = event[name]
    if not isinstance(found, str):
        raise ValueError(f"{name} is no text: {found!r:.40}")
    return found


def _named(event: Dict[str, Any], name: str) -> Dict[str, Any]:
    found = event[name]
    if not isinstance(found, dict):
        raise ValueError(f"{name} is no object: {found!r:.40}")
    return found


def _within(event: Dict[str, Any]) -> Optional[int]:
    return _whole(event, "within") if "within" in event else None


def _call(event: Dict[str, Any], line: int) -> Call:
    return Call(
        number=_whole(event, "call"),
        process=_whole(event, "process"),
        thread=_whole(event, "thread"),
        function=_text(event, "function"),
        at=_whole(event, "at"),
        inputs=_named(event, "in"),
        within=_within(event),
        line=line,
    )


def _callback(event: Dict[str, Any]) -> Callback:
    return Callback(
        number=_whole(event, "callback"),
        process=_whole(event, "process"),
        thread=_whole(event, "thread"),
        argument=_text(event, "argument"),
        at=_whole(event, "at"),
        inputs=_named(event, "in"),
        within=_within(event),
    )


def _process(event: Dict[str, Any]) -> Process:
    return Process(
        id=_whole(event, "process"),
        parent=_whole(event, "parent"),
        time=_text(event, "time"),
        program=_text(event, "program"),
        libraries=_named(event, "libraries"),
    )
