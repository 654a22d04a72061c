"""The commands that change the host, each all or nothing.

A command is a short document: it is checked, made, read back and undone as documents are.
"""

import contextlib
import dataclasses
import enum
from typing import Any, Dict, Iterable, Iterator, List, Optional, Union

import click
import typer

from libvswitch.errors import Exists, HostError
from vswitch import _settings, _table, documents
from vswitch.command import assignments, completing, output, places
from vswitch.command.arguments import PLACE, SWITCH
from vswitch.command.session import host, is_json
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch
from vswitch.told import Change
from vswitch.values import Words
from vswitch.words import ABSENT, DocumentError

__all__ = [
    "add",
    "by_last_word",
    "cleared",
    "defaults",
    "first_members",
    "given",
    "members",
    "remove",
    "set_",
    "tell",
    "tell_made",
    "unset",
    "uplink",
]

Found = Union[Switch, Port, UplinkPort]
Members = Dict[str, Words]


def tell(changes: Iterable[Change]) -> None:
    """What was changed, or would be."""
    found = list(changes)
    if is_json():
        output.write_json([dataclasses.asdict(one) for one in found])
    elif not found:
        output.line("no changes")
    for one in () if is_json() else found:
        output.line(one)


def tell_made(changes: Iterable[Change]) -> None:
    """What was changed."""
    with output.after_change():
        tell(changes)


@contextlib.contextmanager
def by_last_word() -> Iterator[None]:
    """What is wrong in the document that a command is, is known by a word of the user's."""
    try:
        yield
    except DocumentError as error:
        raise click.UsageError(f"{error.path.rpartition('.')[2]}: {error.expected}") from None


def _change(alias: str, members: Members) -> None:
    """Changes a switch as a document says it."""
    document = {"switches": [{"alias": alias, **members}]}
    with by_last_word():
        documents.read(document)
    _carry_out(document)


def _carry_out(document: Dict[str, Any]) -> None:
    try:
        plan = host().plan(document)
    except DocumentError as error:
        raise HostError(error.expected) from None
    tell_made(plan.apply())


def _change_found(found: Found, members: Members) -> None:
    if isinstance(found, Switch):
        _change(found.alias, members)
        return
    kind = "ports" if isinstance(found, Port) else "uplink_ports"
    _change(found.switch.alias, {kind: [{"id": found.id, **members}]})


def members(known: Dict[str, _table.Property], wanted: Members) -> Members:
    """Settings as a document has them; a text that would clear its setting there, as a property."""
    said = {name: value for name, value in wanted.items() if value != ABSENT}
    properties = {
        known[name].key: {
            "type": _table.word_for(_table.PROPERTY_TYPES, known[name].type),
            "text": value,
        }
        for name, value in wanted.items()
        if value == ABSENT
    }
    return {**said, "properties": properties} if properties else said


def set_(
    place: str = PLACE,
    settings: List[str] = typer.Argument(
        ...,
        metavar="NAME=VALUE...",
        help="Settings, or members of them.",
        autocompletion=completing.new_settings,
    ),
) -> None:
    """Change settings of a switch or a port.

    As in: set lab mtu=9000; set lab/web-1 vlan=7 trunk=10-12,20 forbids=forged_transmits. A member
    of a setting leaves its other members as they are. What has members of its own takes JSON, too.
    """
    found = places.find(host(), place)

    def current(known: _table.Property) -> Words:
        return _settings.words_of(known, _settings.read(found, known))

    wanted = assignments.read(found._settings, settings, current)
    _change_found(found, members(found._settings, wanted))


def cleared(known: Dict[str, _table.Property], settings: Iterable[str]) -> Members:
    names = []
    for name in settings:
        setting = assignments.find_setting(known, name)
        if setting is None:
            raise click.UsageError(f"no setting {name!r} (there are {', '.join(sorted(known))})")
        names.append(setting.name)
    return dict.fromkeys(names, ABSENT)


def unset(
    place: str = PLACE,
    settings: List[str] = typer.Argument(
        ..., metavar="NAME...", help="Settings.", autocompletion=completing.settings
    ),
) -> None:
    """Clear settings of a switch or a port, so that they are what is the default."""
    found = places.find(host(), place)
    _change_found(found, cleared(found._settings, settings))


def add(
    place: str = typer.Argument(
        ..., metavar="SWITCH[/PORT]", help="What is to be there.", autocompletion=completing.things
    ),
    settings: Optional[List[str]] = typer.Argument(
        None,
        metavar="[NAME=VALUE...]",
        help="Settings, as of set.",
        show_default=False,
        autocompletion=completing.first_settings,
    ),
    identifier: Optional[str] = typer.Option(
        None, metavar="ID", help="Of a switch: its identifier."
    ),
    portset: Optional[str] = typer.Option(None, metavar="NAME", help="Of a switch: its port set."),
    max_ports: Optional[int] = typer.Option(None, metavar="N", help="Of a switch: its ports."),
    uplink: Optional[List[str]] = typer.Option(
        None, metavar="NAME", help="Of a switch: an uplink of it; several may be given."
    ),
    external_id: Optional[str] = typer.Option(
        None, metavar="ID", help="Of a port: what another system calls it."
    ),
) -> None:
    """Add a switch, or a port to a switch. The host chooses what is not given."""
    alias, id_ = places.split(host(), place)
    of_switch: Dict[str, Any] = {
        "identifier": identifier,
        "portset": portset,
        "max_ports": max_ports,
        "uplinks": list(uplink) if uplink else None,
    }
    of_port = {"external_id": external_id}
    if id_ is None:
        _refuse(of_port, "a port")
        if alias in host().switches:
            raise Exists(f"the switch {alias!r} is there already")
        _change(alias, {**given(of_switch), **first_members(_table.SWITCH, settings)})
        return
    _refuse(of_switch, "a switch")
    switch = host().switches[alias]
    if id_ in switch.ports or id_ in switch.uplink_ports:
        raise Exists(f"the port {id_!r} of switch {alias!r} is there already")
    _change(
        alias, {"ports": [{"id": id_, **given(of_port), **first_members(_table.PORT, settings)}]}
    )


def given(members: Dict[str, Any]) -> Members:
    return {name: value for name, value in members.items() if value is not None}


def _refuse(members: Dict[str, Any], kind: str) -> None:
    for name in given(members):
        option = f"--{'uplink' if name == 'uplinks' else name.replace('_', '-')}"
        raise click.UsageError(f"{option} is for {kind}")


def defaults(setting: _table.Property) -> Words:
    return _settings.words_of(setting, _settings.parse(setting, setting.default, setting.name))


def first_members(known: Dict[str, _table.Property], settings: Optional[List[str]]) -> Members:
    """The settings of what is made: members that are not said are the defaults."""
    return members(known, assignments.read(known, settings or (), defaults))


def remove(place: str = PLACE) -> None:
    """Remove a switch with its ports, or a port."""
    _change_found(places.find(host(), place), {"state": ABSENT})


class Action(str, enum.Enum):
    """What can be done with an uplink."""

    add = "add"
    remove = "remove"
    up = "up"
    down = "down"


def uplink(
    alias: str = SWITCH,
    action: Action = typer.Argument(
        ..., metavar="add|remove|up|down", help="What is to be done.", show_choices=False
    ),
    name: str = typer.Argument(
        ...,
        metavar="UPLINK",
        help="An uplink of the host, as nic4.",
        autocompletion=completing.uplinks,
    ),
) -> None:
    """Add an uplink to a switch, remove it, or take it up or down."""
    switch = host().switches[alias]
    if action is Action.add:
        if name in switch.uplinks:
            raise Exists(f"the uplink {name!r} is at switch {alias!r} already")
        _change(alias, {"uplinks": [name]})
        return
    found = switch.uplinks[name]
    if action is Action.remove:
        _change(alias, {"uplinks": [{"name": found.name, "state": ABSENT}]})
    else:
        _carry_out({"uplinks": [{"name": found.name, "link": action.value}]})
