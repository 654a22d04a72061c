"""The arguments that several of these commands have, with the names that the fabric has now."""

from typing import Callable, Dict, Iterable, List, Set

import click
import typer

from libvswitch.errors import HostError
from vswitch import _table
from vswitch.command import assignments, places
from vswitch.command.fabric.connection import connected
from vswitch.fabric import View
from vswitch.fabric._watching import KINDS

__all__ = [
    "HOST",
    "HOSTS",
    "NEW_PLACE",
    "PLACE",
    "SWITCH",
    "complete_names",
    "complete_settings",
    "kinds",
]


def _named(context: click.Context, begun: str, names: Callable[[View], Iterable[str]]) -> List[str]:
    """A shell asks: where no fabric tells, there are no names."""
    try:
        with connected(context) as fabric:
            return [one for one in names(fabric.view()) if one.startswith(begun)]
    except (HostError, OSError, click.UsageError):
        return []


def _places(view: View, begun: str) -> Iterable[str]:
    """Switches, and the ports of one that there is no doubt about."""
    aliases = [one for one in view.switches if one.startswith(begun)]
    of = (
        aliases
        if len(aliases) == 1
        else [one for one in view.switches if begun.startswith(f"{one}/")]
    )
    return [*aliases, *(f"{one}/{port}" for one in of for port in view.switches[one].ports)]


def _complete_places(context: click.Context, incomplete: str) -> List[str]:
    return _named(context, incomplete, lambda view: _places(view, incomplete))


def _complete_switches(context: click.Context, incomplete: str) -> List[str]:
    return _named(context, incomplete, lambda view: view.switches)


def _complete_hosts(context: click.Context, incomplete: str) -> List[str]:
    return _named(context, incomplete, lambda view: view.hosts)


def _known(view: View, place: str) -> Dict[str, _table.Property]:
    return _table.SWITCH if places.split_by(view.switches, place)[1] is None else _table.PORT


def _uplinks(view: View, place: str) -> Set[str]:
    """Those that the hosts of a switch tell of."""
    switch = view.switches.get(places.split_by(view.switches, place)[0])
    there = switch.hosts if switch is not None else ()
    return {uplink for host in there if host in view.hosts for uplink in view.hosts[host].links}


def complete_names(context: click.Context, incomplete: str) -> List[str]:
    """Settings of the place that stands before them."""
    place = str(context.params.get("place"))
    return _named(context, incomplete, lambda view: _known(view, place))


def complete_settings(context: click.Context, incomplete: str) -> List[str]:
    """Likewise, and what they may be set to."""
    place = str(context.params.get("place"))
    return _named(
        context,
        incomplete,
        lambda view: assignments.offered(
            _known(view, place), incomplete, lambda: sorted(_uplinks(view, place))
        ),
    )


def kinds(incomplete: str) -> List[str]:
    return [one for one in KINDS if one.startswith(incomplete)]


PLACE = typer.Argument(
    ...,
    metavar="SWITCH[/PORT]",
    help="A switch, or a port of it.",
    autocompletion=_complete_places,
)
SWITCH = typer.Argument(
    ..., metavar="SWITCH", help="The alias of a switch.", autocompletion=_complete_switches
)
NEW_PLACE = typer.Argument(
    ..., metavar="SWITCH[/PORT]", help="What is to be there.", autocompletion=_complete_switches
)
HOSTS = typer.Option(
    None,
    "--host",
    metavar="HOST",
    help="Of a switch: a host that has it; several may be given.",
    autocompletion=_complete_hosts,
)
HOST = typer.Argument(
    ..., metavar="HOST", help="The name of a host.", autocompletion=_complete_hosts
)
