"""The command that runs a tool and writes what it asks of the host into a trace."""

import contextlib
import signal
import subprocess
import sys
from pathlib import Path
from types import FrameType
from typing import Dict, Iterator, List, Optional

import typer

from vswitch.command.session import host
from vswitch.recording import recorded
from vswitch.trace import Trace, TraceError
from vswitch.words import printable

__all__ = ["record", "run"]

_NOT_FOUND, _NOT_RUN, _BY_SIGNAL = 127, 126, 128
_PASSED_ON = (signal.SIGTERM, signal.SIGHUP)


def record(
    command: List[str] = typer.Argument(..., metavar="COMMAND...", help="The tool, after --."),
    trace: Path = typer.Option(
        ..., "-o", metavar="FILE", help="The trace; what was there is replaced."
    ),
) -> None:
    """Run a tool, and write each call that it makes of the host into a trace.

    Nothing changes for the tool, nor for those that it starts itself. A trace that ends with the
    tool, however that ends, can be read. It holds names, addresses and settings of the host as they
    are. The exit status is that of the tool; 128 and the number of the signal that ended it; 126 or
    127 if it cannot be run or found.
    """
    host()
    with recorded(trace, command) as environment:
        status = run(command, environment)
    _look_at(trace)
    raise SystemExit(status)


def _look_at(trace: Path) -> None:
    """Says why nothing can be read in a trace; the status remains that of the tool."""
    try:
        with Trace(trace) as written:
            if next(iter(written), None) is None:
                print("vswitch: the tool made no call of the host", file=sys.stderr)
    except (TraceError, OSError) as error:
        print(f"vswitch: {printable(str(error))}", file=sys.stderr)


def run(command: List[str], environment: Dict[str, str]) -> int:
    """Runs a tool to its end; the status that a shell would have for it."""
    try:
        tool = subprocess.Popen(command, env=environment)
    except OSError as error:
        print(f"vswitch: {command[0]}: {error.strerror}", file=sys.stderr)
        return _NOT_FOUND if isinstance(error, FileNotFoundError) else _NOT_RUN
    with _passing_on(tool):
        status = tool.wait()
    return status if status >= 0 else _BY_SIGNAL - status


@contextlib.contextmanager
def _passing_on(tool: "subprocess.Popen[bytes]") -> Iterator[None]:
    """Signals are the tool's; what a terminal sends, it gets by itself."""

    def pass_on(number: int, _: Optional[FrameType]) -> None:
        tool.send_signal(number)

    before = {number: signal.signal(number, pass_on) for number in _PASSED_ON}
    before[signal.SIGINT] = signal.signal(signal.SIGINT, signal.SIG_IGN)
    try:
        yield
    finally:
        for number, handler in before.items():
            signal.signal(number, handler)
