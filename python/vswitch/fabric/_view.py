"""What a fabric has at one time: frozen, in the words of documents."""

import json
from dataclasses import dataclass, field
from typing import Any, Dict, Mapping, Tuple

from libvswitch.errors import NotFound
from vswitch import _table
from vswitch.fabric._notation import Rows, pairs_in, values_in
from vswitch.values import Words

__all__ = ["GENERAL", "Member", "Named", "SharedPort", "SharedSwitch", "View", "value_of"]


class Named(Dict[str, Any]):
    """Things by their names; what is not there is told with what there is."""

    def __init__(self, what: str, held: Mapping[str, Any]) -> None:
        super().__init__(sorted(held.items()))
        self._what = what

    def __missing__(self, name: str) -> Any:
        there = f"there are {', '.join(self)}" if self else "there is none"
        raise NotFound(f"no {self._what.format(repr(name))} ({there})")


class _Shared:
    """What has settings."""

    texts: Mapping[str, str]
    """Settings as the database has them."""

    @property
    def settings(self) -> Dict[str, Words]:
        return {name: value_of(text) for name, text in self.texts.items()}


@dataclass(frozen=True)
class SharedPort(_Shared):
    """A port, on all hosts of its switch. `host` is where it is connected, if it is."""

    id: str
    host: str = ""
    texts: Mapping[str, str] = field(default_factory=dict)
    uuid: str = ""
    """What the database calls its row."""

    def state(self) -> Dict[str, Words]:
        """The port as a document."""
        observed = {"host": self.host or None}
        return {"id": self.id, **_ordered(self.settings, _table.PORT), "observed": observed}


@dataclass(frozen=True)
class SharedSwitch(_Shared):
    """A switch that the hosts have which it names."""

    alias: str
    id: str
    hosts: Tuple[str, ...] = ()
    texts: Mapping[str, str] = field(default_factory=dict)
    ports: Mapping[str, SharedPort] = field(default_factory=dict)
    writers: Tuple[str, ...] = ()
    """The hosts that may change it, where hosts have the role of hosts."""

    def state(self) -> Dict[str, Words]:
        """The switch as a document."""
        return {
            "alias": self.alias,
            "id": self.id,
            "hosts": list(self.hosts),
            **_ordered(self.settings, _table.SWITCH),
            "ports": [port.state() for port in self.ports.values()],
        }


GENERAL = ("frames", "state")
"""What hosts call errors that concern no switch alone: of what moves frames, and of what keeps
the state, as on a full disk."""


@dataclass(frozen=True)
class Member:
    """A host, and what it reports: the revision that its frames obey, the links of its uplinks,
    and what it cannot bear, by where that is."""

    name: str
    in_force: int = 0
    links: Mapping[str, str] = field(default_factory=dict)
    errors: Mapping[str, str] = field(default_factory=dict)

    def state(self) -> Dict[str, Words]:
        return {
            "name": self.name,
            "in_force": self.in_force,
            "links": dict(self.links),
            "errors": dict(self.errors),
        }


@dataclass(frozen=True)
class View:
    """All of a fabric; `revision` counts the changes."""

    revision: int
    switches: Mapping[str, SharedSwitch]
    hosts: Mapping[str, Member]

    def state(self) -> Dict[str, Words]:
        return {
            "revision": self.revision,
            "switches": [one.state() for one in self.switches.values()],
            "hosts": [one.state() for one in self.hosts.values()],
        }


def view_of(rows: Rows) -> View:
    ports: Dict[str, Dict[str, SharedPort]] = {}
    for uuid, row in rows["Port"].items():
        port = SharedPort(row["id"], row["host"], pairs_in(row["settings"]), uuid)
        ports.setdefault(row["switch"], {})[port.id] = port
    switches = {}
    for row in rows["Switch"].values():
        alias, hosts = row["alias"], tuple(sorted(values_in(row["hosts"])))
        of = f"port {{}} of switch {alias!r} in the fabric"
        held = Named(of, ports.setdefault(row["id"], {}))
        settings, writers = pairs_in(row["settings"]), tuple(sorted(pairs_in(row["writers"])))
        switches[alias] = SharedSwitch(alias, row["id"], hosts, settings, held, writers)
    hosts_there = {
        row["name"]: Member(
            row["name"], row["in_force"], pairs_in(row["links"]), pairs_in(row["errors"])
        )
        for row in rows["Host"].values()
    }
    return View(
        max((row["revision"] for row in rows["Fabric"].values()), default=0),
        Named("switch {} in the fabric", switches),
        Named("host {} in the fabric", hosts_there),
    )


def value_of(text: str) -> Words:
    """What a setting says, which the database has as JSON."""
    try:
        return json.loads(text)
    except ValueError:
        # What no program wrote is shown as it is.
        return text


def _ordered(settings: Mapping[str, Words], known: Mapping[str, Any]) -> Dict[str, Words]:
    """Settings in the order of their table, and what stands beside them after that."""
    first = [name for name in known if name in settings]
    return {name: settings[name] for name in (*first, *(n for n in settings if n not in known))}
