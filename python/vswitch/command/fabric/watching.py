"""The command that goes on for a time: it tells what changes on all hosts."""

import contextlib
import dataclasses
import datetime
import sys
from typing import List, Optional

import typer

from vswitch.command import output
from vswitch.command.arguments import seconds as seconds_of
from vswitch.command.fabric.arguments import kinds as kinds_begun
from vswitch.command.fabric.connection import connected
from vswitch.command.session import from_words, is_json
from vswitch.fabric._watching import KINDS
from vswitch.words import choice, printable

__all__ = ["watch"]


def _say_lost(why: Optional[str]) -> None:
    said = "the fabric can be reached again" if why is None else f"the fabric is lost: {why}"
    print(f"vswitch: {printable(said)}", file=sys.stderr, flush=True)


def watch(
    seconds: Optional[float] = seconds_of(
        None, "--for", least=0, words="End after so many seconds."
    ),
    kind: Optional[List[str]] = typer.Option(
        None,
        metavar="KIND",
        help=f"Only such: {', '.join(KINDS)}. Several may be given.",
        autocompletion=kinds_begun,
    ),
) -> None:
    """Tell what changes from now on, on any host, until interrupted.

    Programs get a line of JSON for each change. While no server can be reached, which standard
    error says, nothing is told; what changed meanwhile is told after that.
    """
    with from_words("--kind"):
        wanted = [choice(one, "", KINDS) for one in kind or KINDS]
    with contextlib.suppress(KeyboardInterrupt), connected() as fabric:
        for event in fabric.watch(seconds, _say_lost):
            if event.kind not in wanted:
                continue
            if is_json():
                output.write_json_line(dataclasses.asdict(event))
            else:
                at = datetime.datetime.fromtimestamp(event.at).strftime("%H:%M:%S")
                output.line(f"{at} {event.kind} {event}")
