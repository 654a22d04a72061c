"""The command that makes the calls of a trace again, and tells how like the recording they go."""

from __future__ import annotations

import dataclasses
import json
from pathlib import Path
from typing import TYPE_CHECKING, Any, Dict, Optional

import click
import typer

from libvswitch.errors import NotRestored
from vswitch.command import files, output
from vswitch.command.session import host, is_json
from vswitch.exits import REFUSED
from vswitch.trace import Call, TraceError
from vswitch.words import DocumentError

# Most runs of the program replay nothing, and need not wait for it.
if TYPE_CHECKING:
    from vswitch.allowing import Allowances
    from vswitch.likeness import Difference
    from vswitch.replay import OfFunction, Report

__all__ = ["replay", "replayed"]

_EVERY = 256  # calls after which the progress is told
_LONGEST = 60  # characters that are shown of a value
_HEADS = ("function", "calls", "alike", "allowed", "different", "not made", "left out")


def replay(
    trace: Path = typer.Argument(..., metavar="TRACE", help="What vswitch record has written."),
    allow: Optional[str] = typer.Option(
        None, metavar="FILE", help="Differences that are known, each with its reason."
    ),
    questions_only: bool = typer.Option(
        False, "--questions-only", help="Leave out the calls that may change the host."
    ),
    change_host: bool = typer.Option(
        False, "--change-host", help="Make those on a real host, too."
    ),
) -> None:
    """Make the calls of a trace on this host, and compare what comes of them.

    What is each host's own is not compared: addresses, numbers of ports, identifiers that a host
    chose, times, counts. The status is 0 when every call went as it was recorded or as --allow has
    it, and 1 when one did not, or could not be made.
    """
    _ask_for_consent(questions_only, change_host)
    allowed = _read_allowances(allow)
    report = replayed(trace, allowed, questions_only)
    if is_json():
        output.write_json(_as_json(report, allowed))
    else:
        _show(report, allowed)
    if not report.is_alike:
        raise SystemExit(REFUSED)


def _ask_for_consent(questions_only: bool, change_host: bool) -> None:
    if questions_only and change_host:
        raise click.UsageError("--questions-only and --change-host exclude each other")
    if not host().simulated and not questions_only and not change_host:
        raise click.UsageError(
            "this is a real host: --questions-only leaves out what may change it, "
            "--change-host does not"
        )


def _read_allowances(name: Optional[str]) -> Allowances:
    from vswitch import allowing

    if name is None:
        return allowing.Allowances([])
    document = files.read(name)
    try:
        return allowing.read(document)
    except DocumentError as error:
        raise DocumentError(name, str(error)) from None


def replayed(trace: Path, allowed: Allowances, questions_only: bool) -> Report:
    """Reads all of a trace, and then replays it."""
    from vswitch import replay as replaying
    from vswitch._replayer import PresentHost

    present = PresentHost()
    with output.progress(f"reading {trace}"):
        try:
            count = replaying.check(trace, present)
        except TraceError as error:
            raise DocumentError(str(trace), f"line {error.line}: {error.what}") from None
    with output.progress(f"replaying {trace}") as progress:

        def tell(at: int) -> None:
            if at % _EVERY == 0:
                progress(f"{at} of {count} calls")

        try:
            return replaying.replay(trace, present, allowed.allows, questions_only, tell)
        except (TraceError, OSError) as error:
            words = f"the trace has changed meanwhile, and calls of it are made: {error}"
            raise NotRestored(words, left=()) from None


def _show(report: Report, allowed: Allowances) -> None:
    rows = [
        (name, of.calls, of.alike, of.allowed, of.different, of.not_made, of.left_out)
        for name, of in sorted(report.functions.items())
    ]
    output.table(_HEADS, rows)
    for name, of in sorted(report.functions.items()):
        if of.first is not None:
            output.line(f"{name}: {_told(*of.first)}")
            others = _others(of, of.first[1])
            if others:
                output.line(f"{name}: {others}")
    for one in allowed.unused:
        output.line(f"allowed, but not found: {one} ({one.reason})")


def _told(call: Call, found: Difference) -> str:
    note = f" ({found.note})" if found.note else ""
    values = f"{_shown(found.recorded)} -> {_shown(found.present)}"
    return f"{found.path}: {values}{note} [call {call.number} of process {call.process}]"


def _others(of: OfFunction, first: Difference) -> str:
    """In how many calls something else differed than did first, or was the reason."""
    known = first.pattern, first.present
    told = [f"{path} in {count}" for path, count in of.paths.items() if path not in known]
    told += [f"{why}: {count}" for why, count in of.reasons.items() if why not in known]
    return ", ".join(told)


def _shown(value: Any) -> str:
    text = value if isinstance(value, str) else json.dumps(value)
    return text if len(text) <= _LONGEST else f"{text[: _LONGEST - 3]}..."


def _as_json(report: Report, allowed: Allowances) -> Dict[str, Any]:
    return {
        "alike": report.is_alike,
        "functions": {name: _function(of) for name, of in sorted(report.functions.items())},
        "unused": [str(one) for one in allowed.unused],
    }


def _function(of: OfFunction) -> Dict[str, Any]:
    return {
        "calls": of.calls,
        "alike": of.alike,
        "allowed": of.allowed,
        "different": of.different,
        "not_made": of.not_made,
        "left_out": of.left_out,
        "paths": dict(of.paths),
        "reasons": dict(of.reasons),
        "first": _first(*of.first) if of.first is not None else None,
    }


def _first(call: Call, found: Difference) -> Dict[str, Any]:
    return {"process": call.process, "call": call.number, **dataclasses.asdict(found)}
