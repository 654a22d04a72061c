"""The program when a fabric is meant: its commands, and the options before them."""

from typing import Callable, Dict, List, Optional, Tuple

import click
import typer
import typer.main

from vswitch.command import program
from vswitch.command.fabric import assigning, changing, drilling, reading, watching
from vswitch.command.session import Group, HostlessCommand
from vswitch.exits import REFUSED

__all__ = ["COMMANDS", "group", "main"]

COMMANDS: Dict[str, Callable[..., None]] = {
    "list": reading.list_,
    "show": reading.show,
    "hosts": reading.hosts,
    "set": assigning.set_,
    "unset": assigning.unset,
    "add": assigning.add,
    "remove": assigning.remove,
    "diff": changing.diff,
    "apply": changing.apply,
    "backup": reading.backup,
    "outcome": changing.outcome,
    "forget": changing.forget,
    "watch": watching.watch,
    "drill": drilling.drill,
}

STATUSES = {**program.STATUSES, REFUSED: "it was refused, and the fabric is as before"}


# What takes a change back is a process at the host.
_OPTIONS_OF_HOSTS = ("--confirm-within", "--real")


class _Group(Group):
    def resolve_command(
        self, context: click.Context, words: List[str]
    ) -> Tuple[Optional[str], Optional[click.Command], List[str]]:
        options = [word for word in words if word.partition("=")[0] in _OPTIONS_OF_HOSTS]
        for one in [*words[:1], *options]:
            if one not in COMMANDS and one in (*program.COMMANDS, *options):
                raise click.UsageError(f"{one!r} is for one host: it goes there, without --fabric")
        return super().resolve_command(context, words)


def about(
    fabric: str = typer.Option(
        ...,
        metavar="SERVERS",
        help="The servers: ssl:ADDRESS:PORT or tcp:ADDRESS:PORT, with commas between.",
    ),
    private_key: Optional[str] = typer.Option(
        None, "-p", "--private-key", metavar="FILE", help="For ssl: the private key, PEM."
    ),
    certificate: Optional[str] = typer.Option(
        None, "-c", "--certificate", metavar="FILE", help="For ssl: its certificate, PEM."
    ),
    ca_cert: Optional[str] = typer.Option(
        None,
        "-C",
        "--ca-cert",
        metavar="FILE",
        help="For ssl: the certificate of who signed those of the servers, PEM.",
    ),
) -> None:
    """Look at the virtual switches that many hosts share, and change them on all.

    No host is needed here: the fabric's database is asked, over whichever of its servers has the
    majority with it. A switch is called by its alias, a port SWITCH/PORT. Every command takes
    --json for programs.
    """


def group() -> click.Group:
    """All commands."""
    app = typer.Typer(
        name=f"{program.NAME} --fabric SERVERS",
        add_completion=False,
        context_settings={"help_option_names": ["-h", "--help"]},
    )
    app.callback(cls=_Group, no_args_is_help=True, epilog=program.ends(STATUSES))(about)
    for name, function in COMMANDS.items():
        app.command(name, cls=HostlessCommand)(function)
    made = typer.main.get_command(app)
    assert isinstance(made, click.Group)
    return made


def main(words: List[str]) -> None:
    """Runs the program, and ends it."""
    program.main(words, group)
