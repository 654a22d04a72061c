"""What all commands have in common: the options --json and --real, and the host."""

import contextlib
import sys
from typing import Any, Callable, Iterator, List, Optional

import click
from typer.core import TyperCommand, TyperGroup, TyperOption

from vswitch.host import Host
from vswitch.words import DocumentError

__all__ = [
    "Command",
    "Group",
    "HostlessCommand",
    "TextCommand",
    "from_words",
    "host",
    "is_json",
    "is_real",
]


class _Session:
    """What one run of the program was told."""

    json = False
    real = False
    host: Optional[Host] = None


def _session() -> _Session:
    return click.get_current_context().ensure_object(_Session)


def is_json() -> bool:
    """Whether programs read the output."""
    return _session().json


def is_real() -> bool:
    """Whether a simulated host is refused."""
    return _session().real


def host() -> Host:
    """The host, which is said to be simulated where it is."""
    session = _session()
    if session.host is None:
        session.host = Host(simulated=False if session.real else None)
        if session.host.simulated:
            print("# simulated host", file=sys.stderr, flush=True)
    return session.host


@contextlib.contextmanager
def from_words(name: str) -> Iterator[None]:
    """What a word of the command line says wrong is a usage error; `name` says which word."""
    try:
        yield
    except DocumentError as error:
        raise click.UsageError(f"{name}: {error.expected}") from None


def _remember(name: str) -> Callable[[click.Context, click.Parameter, bool], None]:
    def callback(context: click.Context, _: click.Parameter, given: bool) -> None:
        setattr(context.ensure_object(_Session), name, given)

    return callback


class _Plain(TyperCommand):
    def format_help(self, context: click.Context, formatter: click.HelpFormatter) -> None:
        """The same text on a terminal, in a pipe and on the manual page."""
        click.Command.format_help(self, context, formatter)


class TextCommand(_Plain):
    """A command that writes what is neither for people alone nor JSON."""

    def __init__(self, *arguments: Any, **more: Any) -> None:
        super().__init__(*arguments, **more)
        self.params.append(_flag("--real", "Refuse a simulated host.", _remember("real")))


class Command(TextCommand):
    """A command whose output is for people, or for programs."""

    def __init__(self, *arguments: Any, **more: Any) -> None:
        super().__init__(*arguments, **more)
        self.params.insert(-1, _json_flag())


class HostlessCommand(_Plain):
    """Likewise, of a command that asks no host."""

    def __init__(self, *arguments: Any, **more: Any) -> None:
        super().__init__(*arguments, **more)
        self.params.append(_json_flag())


class Group(TyperGroup):
    """The commands, in the order in which they were added."""

    def list_commands(self, _: click.Context) -> List[str]:
        return list(self.commands)

    def format_help(self, context: click.Context, formatter: click.HelpFormatter) -> None:
        click.Command.format_help(self, context, formatter)


def _json_flag() -> TyperOption:
    return _flag("--json", "Write JSON, for programs.", _remember("json"))


def _flag(name: str, words: str, callback: Callable[..., Any]) -> TyperOption:
    return TyperOption(
        param_decls=[name],
        is_flag=True,
        default=False,
        help=words,
        expose_value=False,
        callback=callback,
        show_default=False,
    )
