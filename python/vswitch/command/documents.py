"""The commands that take a document, which says how the host is to be, and that make one."""

import contextlib
import sys
from pathlib import Path
from typing import Any, Optional

import click
import typer

from vswitch.command import files, keeping, output
from vswitch.command.arguments import seconds
from vswitch.command.changing import tell, tell_made
from vswitch.command.session import host, is_json
from vswitch.plan import Plan
from vswitch.words import DocumentError

__all__ = ["apply", "backup", "diff", "restore", "snapshot"]

_FILE = typer.Argument(
    ...,
    metavar="FILE",
    help="A document, YAML or JSON; - is standard input.",
)
_DRY_RUN = typer.Option(False, "--dry-run", help="Tell what would change, and change nothing.")


def _read(file: Path) -> Any:
    """The document in a file, which takes long if it is one of a large host."""
    # What somebody types in is not written over.
    is_typed = str(file) == "-"
    with contextlib.nullcontext() if is_typed else output.progress(f"reading {file}"):
        return files.read(str(file))


def plan(name: str, document: Any, whole: bool = False) -> Plan:
    """What the document of that file would change."""
    there = host()
    try:
        with output.progress(f"comparing the host with {name}"):
            return there.plan(document, whole)
    except DocumentError as error:
        raise DocumentError(name, str(error)) from None


def _carry_out(wanted: Plan, dry_run: bool) -> None:
    with output.progress("looking at what would change" if dry_run else "changing the host"):
        changes = wanted.changes if dry_run else wanted.apply()
    (tell if dry_run else tell_made)(changes)


def diff(file: Path = _FILE) -> None:
    """Tell what a document would change."""
    _carry_out(plan(str(file), _read(file)), dry_run=True)


def apply(
    file: Path = _FILE,
    dry_run: bool = _DRY_RUN,
    confirm_within: Optional[float] = seconds(
        None, least=0.1, words="Take it back unless confirmed within so many seconds."
    ),
) -> None:
    """Make the host what a document says. What it does not name stays as it is.

    All of it arrives, or everything is as it was before. Applying again changes nothing. With
    --confirm-within, the change is taken back unless the command confirm comes in time, even if
    the shell is gone by then.
    """
    document = _read(file)
    if dry_run or confirm_within is None:
        _carry_out(plan(str(file), document), dry_run)
        return
    changes = keeping.apply(host(), lambda: plan(str(file), document), confirm_within)
    tell_made(changes)
    if changes:
        said = f"# taken back in {confirm_within:g} s, unless this confirms it: vswitch confirm"
        print(said, file=sys.stderr)


def backup() -> None:
    """Write the whole host as a document: YAML, or JSON with --json."""
    from vswitch import snapshot

    there = host()
    with output.progress("reading the host"):
        document = snapshot.backup(there)
        written = "" if is_json() else files.write(document)
    if is_json():
        output.write_json(document)
    else:
        print(written, end="")


def snapshot(
    anonymize: bool = typer.Option(
        False, "--anonymize", help="Replace names and addresses, each by one other everywhere."
    ),
    key_file: Optional[Path] = typer.Option(
        None, metavar="FILE", help="Replace them alike in all snapshots with the key in that file."
    ),
) -> None:
    """Write the whole host as a scenario document, JSON, from which a clone of it starts.

    SIMHOST_SCENARIO names it to a simulated host. What a call refuses, what no document says and
    what no call tells is listed in it under observed.
    """
    if key_file is not None and not anonymize:
        raise click.UsageError("--key-file: it is for --anonymize")
    key = key_file.read_bytes() if key_file is not None else None
    there = host()
    with output.progress("reading the host"):
        document = there.snapshot(anonymize, key)
    output.write_json(document)


def restore(file: Path = _FILE, dry_run: bool = _DRY_RUN) -> None:
    """Make the host what a backup says: switches, ports and settings that are not in it go.

    Uplinks move to the switches and uplink ports where the backup has them. Links, learned
    addresses and counters are the host's own, and stay.
    """
    _carry_out(plan(str(file), _read(file), whole=True), dry_run)
