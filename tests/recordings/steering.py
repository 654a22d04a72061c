"""Recordings of tools that steer their simulated host, and replays that steer theirs likewise."""

from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Optional

from saying import said_in, say
from simhost import Host, SimulatedHost
from vswitch._replayer import PresentHost
from vswitch.likeness import Difference
from vswitch.replay import NOT_MADE, Allows, Replay, Report
from vswitch.trace import Trace

__all__ = ["SteeredHost", "differences", "replayed", "steer"]

_STEERING = ("apply", "clear_faults", "fault", "learn", "reset", "restart")
_OF_CLOCK = ("run", "set", "step", "stop")
_ERRORS = {one.__name__: one for one in (OSError, RuntimeError, ValueError)}
_DEALLOCATORS = ("VSDVS_FreeMemory", "VSQEX_FreeMemory", "DVSQEX_DataFree", "DVSData_Free")


class _Saying:
    """An object whose methods are said before they are called."""

    def __init__(self, of: Any, names: Any, prefix: str = "") -> None:
        self._of = of
        self._names = names
        self._prefix = prefix

    def __getattr__(self, name: str) -> Any:
        found = getattr(self._of, name)
        if name not in self._names:
            return found

        def said(*arguments: Any, **more: Any) -> Any:
            say(self._prefix + name, *arguments, **more)
            return found(*arguments, **more)

        return said


class SteeredHost(_Saying):
    """A host of which the trace says what is done to it."""

    def __init__(self, host: Host) -> None:
        super().__init__(host, _STEERING)
        self.clock = _Saying(host.clock, _OF_CLOCK, "clock.")


def steer(host: SimulatedHost, what: str, arguments: List[Any], more: Dict[str, Any]) -> None:
    if what == "fault" and "panic" in more:
        name, text = more["panic"]
        more = {**more, "panic": (_ERRORS[name], text)}
    of: Any = host
    for name in what.split("."):
        of = getattr(of, name)
    of(*arguments, **more)


def replayed(
    trace: Path,
    begin: Callable[..., SimulatedHost],
    steer: Callable[..., None] = steer,
    present: Optional[PresentHost] = None,
    allows: Allows = lambda function, difference: False,
) -> Iterator[Report]:
    """Replays what a tool did with each host that it said to begin with."""
    made = present or PresentHost()

    def is_known(function: str, difference: Difference) -> bool:
        return _is_known(function, difference) or allows(function, difference)

    host, replay = begin(), Replay(made, is_known, questions_only=False)
    with Trace(trace) as read:
        for call in read:
            said = said_in(call.function, call.inputs)
            if said is not None and said.what == "begin":
                replay.end()
                yield replay.report
                host = begin(*said.arguments)
                replay = Replay(made, is_known, questions_only=False)
            elif said is not None:
                steer(host, *said)
            else:
                replay.take(call, read.processes.get(call.process))
    replay.end()
    yield replay.report


def _is_known(function: str, difference: Difference) -> bool:
    # What is released cannot be released again, which some tools try.
    return difference.path == NOT_MADE and function in _DEALLOCATORS


def differences(report: Report) -> List[str]:
    """What differed first of each function."""
    return [
        f"{name}: {of.first[1].path}: {of.first[1].recorded} -> {of.first[1].present}"
        f" {of.first[1].note} [call {of.first[0].number}]"
        for name, of in report.functions.items()
        if of.first is not None
    ]
