"""The commands that change what hosts share, each all or nothing."""

import sys
from pathlib import Path
from typing import Any, List, Optional, Tuple

import typer

from libvswitch.errors import HostError, NotRestored
from vswitch.command import files, output
from vswitch.command.arguments import seconds
from vswitch.command.changing import tell, tell_made
from vswitch.command.fabric.arguments import HOST
from vswitch.command.fabric.connection import connected
from vswitch.command.session import is_json
from vswitch.fabric import Fabric, Plan, View
from vswitch.fabric._view import GENERAL
from vswitch.words import DocumentError

__all__ = ["apply", "diff", "forget", "outcome", "unborne"]

_FILE = typer.Argument(..., metavar="FILE", help="A document, YAML or JSON; - is standard input.")


def _plan(fabric: Fabric, name: str, document: Any) -> Plan:
    try:
        return fabric.plan(document)
    except DocumentError as error:
        raise DocumentError(name, str(error)) from None


def diff(file: Path = _FILE) -> None:
    """Tell what a document would change."""
    document = files.read(str(file))
    with connected() as fabric:
        tell(_plan(fabric, str(file), document).changes)


def apply(
    file: Path = _FILE,
    dry_run: bool = typer.Option(
        False, "--dry-run", help="Tell what would change, and change nothing."
    ),
    wait: Optional[float] = seconds(
        None, least=0, words="Wait so long until all hosts that it concerns have it in force."
    ),
) -> None:
    """Make the fabric what a document says. What it does not name stays as it is.

    All of it arrives, or nothing; if somebody else changed the same meanwhile, nothing does. A
    switch has `hosts`, which have it; uplinks, and what else each host has of its own, no such
    document names. With --wait the status is 3 if a host does not come to have it in force.
    """
    document = files.read(str(file))
    with connected() as fabric:
        plan = _plan(fabric, str(file), document)
        if dry_run:
            tell(plan.changes)
            return
        revision = plan.apply()
        tell_made(plan.changes)
        if wait is not None and plan.hosts:
            with output.progress(f"waiting for {', '.join(plan.hosts)}"):
                view = fabric.wait(revision, plan.hosts, wait)
            _tell_in_force(view, plan)


def _tell_in_force(view: View, plan: Plan) -> None:
    refused = [f"{name}: {where}: {why}" for name, where, why in unborne(view, plan)]
    if refused:
        raise NotRestored(f"the change is made, and not all can bear it: {'; '.join(refused)}")
    print(f"# in force on {', '.join(plan.hosts)}", file=sys.stderr)


def unborne(view: View, plan: Plan) -> List[Tuple[str, str, str]]:
    """What hosts cannot bear of what was changed."""
    changed = [f"{one.path}/" for one in plan.changes]
    # A host that comes to have a switch comes to have all of it.
    whole = tuple(path[: -len("hosts/")] for path in changed if path.endswith("/hosts/"))
    return [
        (host.name, where, why)
        for host in view.hosts.values()
        if host.name in plan.hosts
        for where, why in host.errors.items()
        if where in GENERAL
        or f"{where}/".startswith(whole)
        or any(path.startswith(f"{where}/") for path in changed)
    ]


def outcome(
    change: str = typer.Argument(..., metavar="CHANGE", help="What an error called the change.")
) -> None:
    """Tell whether a change was made of which nobody knew; one that was not never will be.

    The status is 1 when it was not. Ask within an hour: what is known of changes is removed after
    that, and one that was made is told as one that was not.
    """
    with connected() as fabric:
        made = fabric.outcome(change)
    if is_json():
        output.write_json({"change": change, "made": made})
    elif made:
        output.line("made")
    if not made:
        raise HostError(f"the change {change} is not made, and never will be")


def forget(host: str = HOST) -> None:
    """Remove a host that is gone for good: from the switches, the ports, and the hosts.

    Its name is free then. A host that is there comes back by itself, without switches.
    """
    with connected() as fabric:
        plan = fabric.plan_to_forget(host)
        plan.apply()
        tell_made(plan.changes)
