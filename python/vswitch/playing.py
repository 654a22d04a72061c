"""Playing a trace: a tool's calls get what they got when it was recorded, and no host is there.

    with played(Path("trace.jsonl")) as recording:
        subprocess.run(["./tool.py"], env=recording.environment)
        print(recording.ledger.said_of("recorded calls"))

Nothing here loads a host, nor needs one.
"""

import contextlib
import re
import tempfile
from pathlib import Path
from typing import Dict, Iterator, List, NamedTuple

from vswitch import _front
from vswitch.trace import Trace, TraceError

__all__ = ["BY", "Ledger", "Played", "Recorded", "played"]

BY = ("order", "arguments")
_TRACE, _LEDGER, _BY = "VSWITCH_PLAY_TRACE", "VSWITCH_PLAY_LEDGER", "VSWITCH_PLAY_BY"


class Recorded(NamedTuple):
    """A call of a trace: the line in which it begins, and its function."""

    line: int
    function: str


class Ledger:
    """Which calls of a trace were made, in a file that the processes of a tool share.

    What is wrong with the trace is a TraceError, before anything is played.
    """

    def __init__(self, trace: Path, file: Path) -> None:
        self.trace = trace.absolute()
        self.file = file
        with Trace(trace) as read:
            calls = [Recorded(call.line, call.function) for call in read]
        self.calls: List[Recorded] = sorted(calls)
        """All of them, in the order in which they began."""
        try:
            self._processes, counted = _front.Runtime().check(self.trace)
        except OSError as error:
            raise _with_line(trace, str(error)) from None
        assert counted == len(self.calls)
        file.write_bytes(bytes(1 + self._processes + counted))

    @property
    def left(self) -> List[Recorded]:
        """The calls that nobody made."""
        made = self.file.read_bytes()[1 + self._processes :]
        return [call for call, is_made in zip(self.calls, made) if not is_made]

    def said_of(self, calls: str) -> str:
        """How many of the calls were made, and which is the first that was not."""
        left = self.left
        words = f"{len(self.calls) - len(left)} of {len(self.calls)} {calls} were made"
        if left:
            words += f"; the first that was not is {left[0].function} in line {left[0].line}"
        return words

    @property
    def has_failed(self) -> bool:
        """Whether a call could not be played."""
        return self.file.read_bytes()[:1] != b"\0"


def _with_line(trace: Path, said: str) -> TraceError:
    found = re.match(r"line (\d+): (.*)", said, re.DOTALL)
    return TraceError(trace, int(found[1]), found[2]) if found else TraceError(trace, 1, said)


class Played(NamedTuple):
    """A trace that is being played, and the environment for the tool."""

    environment: Dict[str, str]
    ledger: Ledger


@contextlib.contextmanager
def played(trace: Path, by: str = "order") -> Iterator[Played]:
    """Has a trace played to the programs that are run in an environment.

    `by` says which recorded call a call is: the next one in the "order" of its thread, or the next
    one with the same "arguments".
    """
    if by not in BY:
        raise ValueError(f"by is one of {', '.join(BY)}")
    with tempfile.TemporaryDirectory(prefix="vswitch-play-") as made:
        ledger = Ledger(trace, Path(made, "ledger"))
        _front.place(Path(made), {})
        environment = {
            **_front.environment(Path(made)),
            _TRACE: str(ledger.trace),
            _LEDGER: str(ledger.file),
            _BY: by,
        }
        yield Played(environment, ledger)
