"""The program: its commands, and how it ends. Errors are words on standard error."""

import io
import signal
import sys
from types import FrameType
from typing import Callable, Dict, List, Optional

import click
import typer
import typer.main

from libvswitch.errors import HostError
from vswitch.command import (
    changing,
    completing,
    confirming,
    documents,
    drawing,
    playing,
    reading,
    recording,
    replaying,
    watching,
)
from vswitch.command.session import Command, Group, TextCommand
from vswitch.exits import CHANGED, REFUSED, exits
from vswitch.words import DocumentError, printable

__all__ = ["NAME", "STATUSES", "ends", "group", "main"]

NAME = "vswitch"
_USAGE = 2
_SIGNALS = (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)
_OPTIONS_FOR_ALL = {"help_option_names": ["-h", "--help"]}

COMMANDS: Dict[str, Callable[..., None]] = {
    "list": reading.list_,
    "show": reading.show,
    "stats": reading.stats,
    "lag": reading.lag,
    "options": reading.options,
    "find": reading.find,
    "set": changing.set_,
    "unset": changing.unset,
    "add": changing.add,
    "remove": changing.remove,
    "uplink": changing.uplink,
    "diff": documents.diff,
    "apply": documents.apply,
    "confirm": confirming.confirm,
    "backup": documents.backup,
    "restore": documents.restore,
    "snapshot": documents.snapshot,
    "watch": watching.watch,
    "mirror": watching.mirror,
    "drill": watching.drill,
    "draw": drawing.draw,
    "record": recording.record,
    "replay": replaying.replay,
    "play": playing.play,
    "completion": completing.completion,
}
_TEXTS = ("draw", "record", "play", "completion")

STATUSES = {
    0: "all is done",
    REFUSED: "it was refused, and the host is as before",
    _USAGE: "the command line is wrong, and nothing was changed",
    CHANGED: "somebody must look: something is left changed, or nobody knows",
}


def ends(statuses: Dict[int, str]) -> str:
    """The end of a help text. Lines that are not to be filled follow \\b."""
    return "\n".join(["\b", "Exit status:", *(f"  {n}  {said}" for n, said in statuses.items())])


def about() -> None:
    """Look at the virtual switches of this host, and change them.

    A switch is called by its alias, a port SWITCH/PORT. Every command takes --real to refuse a
    simulated host, and all but draw, record, play and completion take --json for programs. With
    --fabric before the command it is about the switches that many hosts share: vswitch --fabric
    SERVERS --help.
    """


def group() -> click.Group:
    """All commands."""
    app = typer.Typer(name=NAME, add_completion=False, context_settings=_OPTIONS_FOR_ALL)
    app.callback(cls=Group, no_args_is_help=True, epilog=ends(STATUSES))(about)
    for name, function in COMMANDS.items():
        app.command(name, cls=TextCommand if name in _TEXTS else Command)(function)
    made = typer.main.get_command(app)
    assert isinstance(made, click.Group)
    return made


def main(words: List[str], make: Callable[[], click.Group] = group) -> None:
    """Runs the commands that `make` makes, and ends the program."""
    for number in _SIGNALS:
        # nohup and shells have a program begin with some that it is to ignore.
        if signal.getsignal(number) is not signal.SIG_IGN:
            signal.signal(number, _end)
    with exits(NAME):
        for stream in (sys.stdout, sys.stderr):
            if isinstance(stream, io.TextIOWrapper):
                # What an encoding has no bytes for is told all the same.
                stream.reconfigure(errors="backslashreplace")
        try:
            _run(words, make())
        except (HostError, DocumentError, OSError):
            raise
        except Exception as error:
            # A mistake of this program: nobody knows what it left.
            said = printable(f"{type(error).__name__}: {error}")
            print(f"{NAME}: a mistake of this program: {said}", file=sys.stderr)
            raise SystemExit(CHANGED) from None


def _run(words: List[str], commands: click.Group) -> None:
    if completing.is_asked(commands, NAME):
        return
    try:
        with commands.make_context(commands.name, words) as context:
            context.command.invoke(context)
    except click.exceptions.Exit as end:
        raise SystemExit(end.exit_code) from None
    except click.UsageError as error:
        path = error.ctx.command_path if error.ctx is not None else commands.name
        print(f"{NAME}: {printable(error.format_message())}", file=sys.stderr)
        print(f"{NAME}: see {path} --help", file=sys.stderr)
        raise SystemExit(_USAGE) from None


def _end(number: int, _: Optional[FrameType]) -> None:
    """What a signal ends is put right on the way out, which another does not disturb."""
    for one in _SIGNALS:
        signal.signal(one, signal.SIG_IGN)
    if number == signal.SIGINT:
        raise KeyboardInterrupt
    raise SystemExit(128 + number)
