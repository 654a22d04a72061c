"""The command that runs a tool over a trace in place of a host."""

import subprocess
import sys
from enum import Enum
from pathlib import Path
from typing import List

import typer

from vswitch.command.recording import run
from vswitch.command.session import is_real
from vswitch.exits import REFUSED
from vswitch.playing import played
from vswitch.recording import anew
from vswitch.trace import Trace, TraceError, has_calls
from vswitch.words import printable

__all__ = ["play"]

NOT_PLAYED = 125


class _Word(str, Enum):
    """A choice, which help shows as it is written."""

    def __str__(self) -> str:
        return str(self.value)


class By(_Word):
    """Which recorded call a call is."""

    order = "order"
    arguments = "arguments"


class Mode(_Word):
    """When a tool is recorded instead."""

    none = "none"
    once = "once"
    all = "all"


def play(
    trace: Path = typer.Argument(..., metavar="FILE", help="The trace."),
    command: List[str] = typer.Argument(..., metavar="COMMAND...", help="The tool, after --."),
    by: By = typer.Option(
        By.order,
        help="Which recorded call a call is: the next, or the next with its arguments.",
    ),
    mode: Mode = typer.Option(
        Mode.none,
        help="Record the tool instead: never, if there is no trace, or always.",
    ),
    all_used: bool = typer.Option(
        False, "--all-used", help="End with 1 if a recorded call was not made."
    ),
) -> None:
    """Run a tool over a trace: each call gets what it got when it was recorded. No host is needed.

    A call that was not recorded traps, and is told on standard error with the nearest one that was.
    The exit status is 125 if there was such a call, and otherwise that of the tool, as for record.
    """
    if mode is Mode.all or (mode is Mode.once and not trace.exists()):
        raise SystemExit(_record(trace, command))
    try:
        with played(trace, by.value) as recording:
            status = run(command, recording.environment)
            ledger = recording.ledger
            print(f"vswitch: {ledger.said_of('recorded calls')}", file=sys.stderr)
            if ledger.has_failed:
                status = NOT_PLAYED
            elif not status and all_used and ledger.left:
                status = REFUSED
    except TraceError as error:
        print(f"vswitch: {printable(str(error))}", file=sys.stderr)
        raise SystemExit(REFUSED) from None
    raise SystemExit(status)


def _record(trace: Path, command: List[str]) -> int:
    """Records the tool; what there was is replaced by a trace that is whole, and by no other."""
    with anew(trace) as made:
        # A program of its own: this one has no host.
        words = [sys.executable, "-m", "vswitch", "record", "-o", str(made)]
        status = subprocess.call([*words, *(["--real"] if is_real() else []), "--", *command])
        # Without a host there is no line, and what is wrong has been told.
        if not made.stat().st_size:
            return status
        why = _unfinished(made)
        if why:
            print(f"vswitch: {trace} is left as it was: {printable(why)}", file=sys.stderr)
            return status or REFUSED
        # A tool that could not be started, say, has made none, which has been told.
        if has_calls(made):
            made.replace(trace)
        return status


def _unfinished(trace: Path) -> str:
    """Why a trace cannot be played to its end; nothing if it can."""
    try:
        with Trace(trace) as read:
            for call in read:
                if not call.has_ended:
                    return f"the tool ended during the call {call.function}"
    except TraceError as error:
        return f"the recording is wrong in line {error.line}: {error.what}"
    return ""
