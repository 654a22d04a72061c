"""The commands that take a document, which says how the host is to be, and that make one."""

from typing import Any

import typer

from vswitch.command import files, output
from vswitch.command.changing import tell
from vswitch.command.session import host, is_json
from vswitch.plan import Plan
from vswitch.words import DocumentError

__all__ = ["apply", "backup", "diff", "restore"]

_FILE = typer.Argument(..., metavar="FILE", help="A document, YAML or JSON; - is standard input.")
_DRY_RUN = typer.Option(False, "--dry-run", help="Tell what would change, and change nothing.")


def plan(name: str, document: Any, whole: bool = False) -> Plan:
    """What the document of that file would change."""
    try:
        return host().plan(document, whole)
    except DocumentError as error:
        raise DocumentError(name, str(error)) from None


def diff(file: str = _FILE) -> None:
    """Tell what a document would change."""
    tell(plan(file, files.read(file)).changes)


def apply(file: str = _FILE, dry_run: bool = _DRY_RUN) -> None:
    """Make the host what a document says. What it does not name stays as it is.

    All of it arrives, or everything is as it was before. Applying again changes nothing.
    """
    wanted = plan(file, files.read(file))
    tell(wanted.changes if dry_run else wanted.apply())


def backup() -> None:
    """Write the whole host as a document: YAML, or JSON with --json."""
    state = host().state()
    if is_json():
        output.write_json(state)
    else:
        print(files.write(state), end="")


def restore(file: str = _FILE, dry_run: bool = _DRY_RUN) -> None:
    """Make the host what a backup says: switches, ports and settings that are not in it go.

    Links, learned addresses and counters are the host's own, and stay.
    """
    wanted = plan(file, files.read(file), whole=True)
    tell(wanted.changes if dry_run else wanted.apply())
