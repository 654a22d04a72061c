"""The commands that are a short document each: what they change, they change on all hosts."""

from typing import Any, Dict, List, Mapping, Optional, Tuple

import click
import typer

from libvswitch.errors import Exists, HostError
from vswitch import _table
from vswitch.command import assignments, places
from vswitch.command.changing import (
    Members,
    by_last_word,
    cleared,
    defaults,
    first_members,
    given,
    members,
    tell_made,
)
from vswitch.command.fabric.arguments import (
    HOSTS,
    NEW_PLACE,
    PLACE,
    complete_names,
    complete_settings,
)
from vswitch.command.fabric.connection import connected
from vswitch.fabric import Fabric, View, _documents
from vswitch.values import Words
from vswitch.words import ABSENT, DocumentError

__all__ = ["add", "remove", "set_", "unset"]

Known = Mapping[str, _table.Property]


def _found(view: View, place: str) -> Tuple[str, Optional[str], Dict[str, Words]]:
    """A switch, and a port of it if that is meant, with what is set of it."""
    alias, id_ = places.split_by(view.switches, place)
    switch = view.switches[alias]
    return (
        (alias, None, switch.settings) if id_ is None else (alias, id_, switch.ports[id_].settings)
    )


def _known(id_: Optional[str]) -> Dict[str, _table.Property]:
    return _table.SWITCH if id_ is None else _table.PORT


def _change(fabric: Fabric, view: View, alias: str, id_: Optional[str], wanted: Members) -> None:
    said = wanted if id_ is None else {"ports": [{"id": id_, **wanted}]}
    document: Dict[str, Any] = {"switches": [{"alias": alias, **said}]}
    with by_last_word():
        _documents.read(document)
    try:
        plan = fabric.plan(document, view)
    except DocumentError as error:
        raise HostError(error.expected) from None
    plan.apply()
    tell_made(plan.changes)


def _refuse_bytes(place: str, setting: _table.Property, there: Mapping[str, Words]) -> None:
    """What the members are that are not said: nobody knows of a setting that is held as bytes."""
    held = there.get("properties")
    keys = [key for key in setting.keys if isinstance(held, dict) and key in held]
    if keys:
        raise HostError(
            f"{setting.name} of {place} is set byte by byte, as {', '.join(keys)}: "
            "set it as a whole, or unset it first"
        )


def set_(
    place: str = PLACE,
    settings: List[str] = typer.Argument(
        ...,
        metavar="NAME=VALUE...",
        help="Settings, or members of them.",
        autocompletion=complete_settings,
    ),
) -> None:
    """Change settings of a switch or a port.

    As in: set lab mtu=9000; set lab/web-1 vlan=7 trunk=10-12,20. A member of a setting leaves its
    other members as they are, and if somebody else changes these meanwhile, nothing is changed.
    """
    with connected() as fabric:
        view = fabric.view()
        alias, id_, there = _found(view, place)
        known = _known(id_)

        def current(setting: _table.Property) -> Words:
            _refuse_bytes(place, setting, there)
            return there[setting.name] if setting.name in there else defaults(setting)

        wanted = assignments.read(known, settings, current)
        _change(fabric, view, alias, id_, members(known, wanted))


def unset(
    place: str = PLACE,
    settings: List[str] = typer.Argument(
        ..., metavar="NAME...", help="Settings.", autocompletion=complete_names
    ),
) -> None:
    """Clear settings of a switch or a port, so that they are what is the default."""
    with connected() as fabric:
        view = fabric.view()
        alias, id_, _ = _found(view, place)
        _change(fabric, view, alias, id_, cleared(_known(id_), settings))


def add(
    place: str = NEW_PLACE,
    settings: Optional[List[str]] = typer.Argument(
        None,
        metavar="[NAME=VALUE...]",
        help="Settings, as of set.",
        show_default=False,
        autocompletion=complete_settings,
    ),
    host: Optional[List[str]] = HOSTS,
    identifier: Optional[str] = typer.Option(
        None, metavar="ID", help="Of a switch: its identifier."
    ),
    max_ports: Optional[int] = typer.Option(None, metavar="N", help="Of a switch: its ports."),
    external_id: Optional[str] = typer.Option(
        None, metavar="ID", help="Of a port: what another system calls it."
    ),
) -> None:
    """Add a switch to hosts, or a port to a switch. Ports are connected by their hosts."""
    of_switch: Dict[str, Any] = {
        "hosts": list(host) if host else None,
        "id": identifier,
        "max_ports": max_ports,
    }
    of_port: Dict[str, Any] = {"external_id": external_id}
    with connected() as fabric:
        view = fabric.view()
        alias, id_ = places.split_by(view.switches, place)
        wrong, kind = (of_port, "a port") if id_ is None else (of_switch, "a switch")
        for name in given(wrong):
            option = {"hosts": "host", "id": "identifier"}.get(name, name.replace("_", "-"))
            raise click.UsageError(f"--{option} is for {kind}")
        if id_ is None and alias in view.switches:
            raise Exists(f"the switch {alias!r} is there already")
        if id_ is None and not host:
            raise click.UsageError("--host is missing: which hosts have it")
        if id_ is not None and id_ in view.switches[alias].ports:
            raise Exists(f"the port {id_!r} of switch {alias!r} is there already")
        wanted = {**given({**of_switch, **of_port}), **first_members(_known(id_), settings)}
        _change(fabric, view, alias, id_, wanted)


def remove(place: str = PLACE) -> None:
    """Remove a switch with its ports, or a port, from all hosts."""
    with connected() as fabric:
        view = fabric.view()
        alias, id_, _ = _found(view, place)
        _change(fabric, view, alias, id_, {"state": ABSENT})
