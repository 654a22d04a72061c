"""Completion in shells: the command that sets it up, and the names that the host has now.

A shell asks in the middle of somebody's typing, so nothing is said but names; where there is no
host, there are none.
"""

import enum
import os
from typing import Dict, Iterable, Iterator, List, Optional

import click
import typer
from click.shell_completion import get_completion_class, shell_complete

from libvswitch.errors import HostError
from vswitch import _table
from vswitch.command import assignments, places, shells
from vswitch.host import Host
from vswitch.switch import Switch
from vswitch.watch import KINDS

__all__ = [
    "completion",
    "first_settings",
    "is_asked",
    "kinds",
    "new_settings",
    "settings",
    "switches",
    "things",
    "uplinks",
]


class Shell(str, enum.Enum):
    """The shells that there are scripts for."""

    bash = "bash"
    zsh = "zsh"
    fish = "fish"


def completion(
    shell: Shell = typer.Argument(
        ..., metavar="bash|zsh|fish", help="The shell.", show_choices=False
    )
) -> None:
    """Write what lets a shell complete names: eval "$(vswitch completion bash)"."""
    root = click.get_current_context().find_root()
    made = get_completion_class(shell.value)
    assert made is not None and root.info_name is not None
    print(made(root.command, {}, root.info_name, shells.VARIABLE).source(), end="")


def is_asked(group: click.Group, name: str) -> bool:
    """Whether a shell asks, which its script does through the environment; it is told then."""
    asked = os.environ.get(shells.VARIABLE)
    if asked is None:
        return False
    shell_complete(group, {}, name, shells.VARIABLE, asked)
    return True


def _matching(names: Iterable[str], incomplete: str) -> List[str]:
    try:
        return [name for name in names if name.startswith(incomplete)]
    except (HostError, OSError, click.UsageError):
        return []


def switches(incomplete: str) -> List[str]:
    return _matching(_switches(), incomplete)


def _switches() -> Iterator[str]:
    yield from Host().switches


def things(incomplete: str) -> List[str]:
    """Switches, and the ports of one that there is no doubt about."""
    return _matching(_things(incomplete), incomplete)


def _things(incomplete: str) -> Iterator[str]:
    found = Host().switches
    aliases = [one for one in found if one.startswith(incomplete)]
    yield from aliases
    of = (
        aliases if len(aliases) == 1 else [one for one in found if incomplete.startswith(one + "/")]
    )
    for alias in of:
        for id_ in (*found[alias].ports, *found[alias].uplink_ports):
            yield f"{alias}/{id_}"


def uplinks(context: click.Context, incomplete: str) -> List[str]:
    """Those that the switch has: of others no call tells."""
    return _matching(_uplinks(context.params.get("alias")), incomplete)


def _uplinks(alias: Optional[str]) -> Iterator[str]:
    if alias is not None:
        yield from Host().switches[alias].uplinks


def settings(context: click.Context, incomplete: str) -> List[str]:
    return _matching(_settings(context.params.get("place")), incomplete)


def _settings(place: Optional[str]) -> Iterator[str]:
    if place is not None:
        yield from places.find(Host(), place)._settings


def new_settings(context: click.Context, incomplete: str) -> List[str]:
    """What settings of a switch or a port may be set to."""
    return _matching(_new_settings(context.params.get("place"), incomplete), incomplete)


def _new_settings(place: Optional[str], incomplete: str) -> Iterator[str]:
    if place is not None:
        found = places.find(Host(), place)
        switch = found if isinstance(found, Switch) else found.switch
        yield from _offered(found._settings, switch, incomplete)


def first_settings(context: click.Context, incomplete: str) -> List[str]:
    """Likewise for a switch or a port that is to be added."""
    return _matching(_first_settings(context.params.get("place"), incomplete), incomplete)


def _first_settings(place: Optional[str], incomplete: str) -> Iterator[str]:
    if place is not None:
        host = Host()
        alias, id_ = places.split(host, place)
        known = _table.PORT if id_ else _table.SWITCH
        yield from _offered(known, host.switches.get(alias), incomplete)


def _offered(
    known: Dict[str, _table.Property], switch: Optional[Switch], incomplete: str
) -> Iterator[str]:
    return assignments.offered(known, incomplete, lambda: _names_of_uplinks(switch))


def _names_of_uplinks(switch: Optional[Switch]) -> Iterator[str]:
    """Its uplinks, and what stands for some."""
    if switch is None:
        return
    yield from switch.uplinks
    for port in switch.uplink_ports.values():
        yield port.name
    for lag in switch.lags:
        yield lag.name


def kinds(incomplete: str) -> List[str]:
    return _matching(KINDS, incomplete)
