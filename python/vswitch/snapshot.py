"""The state of a host, as a scenario document from which a simulated host starts as its clone.

It is read through the calls of the host alone. Each question is one by itself: what a call refuses
is listed under `observed`, and the rest is whole. So is what no document says, and what no call
tells.
"""

from __future__ import annotations

import re
import typing
from functools import partial
from typing import Any, Callable, Dict, Iterable, List, Optional, Set, TypeVar

import libvswitch as _vs
from libvswitch import checked
from libvswitch.enums import LinkState
from libvswitch.errors import HostError, Trapped
from vswitch import _describing, _property_bytes, _settings, _table, _telling, documents
from vswitch._describing import Description, Properties, Said
from vswitch._of_snapshot import NOT_TOLD, VERSION
from vswitch._properties import DEFAULTS
from vswitch._thing import Item, Thing
from vswitch.port import Port
from vswitch.switch import HostPart, Switch
from vswitch.uplink import Uplink
from vswitch.values import Words
from vswitch.words import DocumentError

if typing.TYPE_CHECKING:
    from vswitch.host import Host
    from vswitch.told import Group, Lag

__all__ = ["backup", "snapshot"]

T = TypeVar("T")
Described = TypeVar("Described", bound=Thing)


def backup(host: "Host") -> Said:
    """The host as `Host.state` has it, with each byte of its settings."""
    return _Exact().host(host)


def snapshot(host: "Host") -> Said:
    """The host as a clone has to be."""
    return _Snapshot().document(host)


class _Exact(Description):
    """A description in which the bytes of a property are where words do not make the same."""

    def named(self, thing: Thing, held: Dict[str, Item]) -> Said:
        said: Said = {}
        for name, known in thing._settings.items():
            if known.key in held:
                words = self.ask(thing, name, lambda: _words(thing, known, held))
                if _made(known, words):
                    said[name] = words
        return said

    def said_by(self, thing: Thing, said: Said, held: Dict[str, Item]) -> Set[str]:
        return {
            key
            for name in said
            for key, data in _made(thing._settings[name], said[name]).items()
            if key in held and held[key] == Item(key, data, thing._settings[name].type)
        }


def _words(thing: Thing, known: _table.Property, held: Dict[str, Item]) -> Optional[Words]:
    try:
        return _describing.setting_words(thing, known, held)
    except HostError:
        raise
    except ValueError:
        # Bytes that are no value: they are all that there is to say.
        return None


def _made(known: _table.Property, words: Words) -> Dict[str, bytes]:
    """The properties that a reader makes of words, none of words that it does not read."""
    try:
        return _property_bytes.bytes_of(known, _settings.parse(known, words, known.name))
    except DocumentError:
        return {}


class _Snapshot(_Exact):
    """A description that goes on where a call refuses, with what goes on beside what is set."""

    def __init__(self) -> None:
        self._refused: List[Said] = []
        self._left_out: List[Said] = []
        self._grouped: Set[str] = set()

    def document(self, host: "Host") -> Said:
        said = self.host(host)
        self._keep_what_documents_say(said)
        for switch in said["switches"]:
            self._keep_what_fits(switch)
        said["observed"] = {
            "snapshot": VERSION,
            "refused": self._refused,
            "left_out": self._left_out,
            "not_told": NOT_TOLD,
        }
        return said

    # What is refused

    def ask(self, of: Any, what: str, question: Callable[[], T]) -> Optional[T]:
        try:
            return question()
        except (HostError, ValueError) as error:
            self._refused.append({**_place(of), "what": what, **_why(error)})
        return None

    def each(
        self, things: Iterable[Described], describe: Callable[[Described], Said]
    ) -> List[Said]:
        found = []
        for thing in things:
            refused, left_out = len(self._refused), len(self._left_out)
            said = describe(thing)
            if len(self._refused) > refused and _is_gone(thing):
                del self._refused[refused:], self._left_out[left_out:]
            else:
                found.append(said)
        return found

    def _leave_out(self, of: Any, what: str, why: object, **more: Words) -> None:
        self._left_out.append({**_place(of), "what": what, "why": str(why), **more})

    # What documents say beside settings

    def uplink(self, uplink: Uplink) -> Said:
        said: Said = {}
        link = self.ask(uplink, "link", lambda: uplink.link)
        if link in (LinkState.UP, LinkState.DOWN):
            said["link"] = str(link)
        # The other end is seen only by a group, and over a link that is up.
        if uplink.name in self._grouped and link is LinkState.UP:
            if self.ask(uplink, "lacp", lambda: uplink.lacp) is LinkState.DOWN:
                said["lacp"] = "down"
        return said

    def team(self, switch: Switch, running: bool) -> Said:
        said = super().team(switch, running)
        # What is in a group is an uplink of the switch, if nobody else says so.
        grouped = (name for lag in said["lags"] for name in lag["uplinks"])
        said["uplinks"] += [name for name in grouped if name not in said["uplinks"]]
        return said

    def lag(self, lag: "Lag") -> Said:
        self._grouped.update(lag.uplinks)
        return {"name": lag.name, "uplinks": list(lag.uplinks)}

    def counted_by(self, switch: Switch) -> Said:
        alias = switch.alias
        counters: Dict[str, int] = {}
        for call in (checked.VSQEX_GetRARPStats, checked.VSQEX_GetServicePortTeamingStats):
            counters.update(self.ask(switch, "counters", lambda: call(alias).asdict()) or {})
        sessions = {}
        for sid in self.list(switch, "mirror_counters", lambda: switch.mirrors):
            told = self.ask(switch, "mirror_counters", lambda: _telling.mirror_stats(alias, sid))
            if told is not None:
                sessions[sid] = _counted(vars(told))
        return {
            "counters": _counted(counters),
            "mirror_counters": {sid: counted for sid, counted in sessions.items() if counted},
        }

    def seen_of(self, port: Port, running: bool, held: Dict[str, Item]) -> Said:
        counters: Dict[str, int] = {}
        if _vs.QEX_NEBPROP_PORT_STATISTICS in held:
            statistics = held[_vs.QEX_NEBPROP_PORT_STATISTICS].data
            counters.update(
                self.ask(port, "counters", lambda: _telling.counted_in(statistics)) or {}
            )
        groups: List[Said] = []
        if running:
            counters.update(self.ask(port, "counters", lambda: _learned(port)) or {})
            number = self.ask(port, "number", lambda: port.number)
            groups = self._groups(port, number) if number is not None else []
        # It follows from the addresses.
        counters.pop("numMACsLearned", None)
        return {"groups": groups, "counters": _counted(counters)}

    def _groups(self, port: Port, number: int) -> List[Said]:
        found: List[Said] = []
        alias = port.switch.alias
        for mode in _telling.GROUP_FORMS:
            table = partial(checked.VSQEX_GetMcastFilters, alias, number, mode)
            for address in self.list(port, "groups", table):
                told = partial(_telling.group_of, alias, number, mode, address)
                found += map(_group_words, self.list(port, "groups", told))
        return found

    def macs(self, of: Thing, table: Iterable[checked.VSMACEntry]) -> List[Said]:
        found = []
        for entry in super().macs(of, table):
            try:
                documents.read_mac(entry, "addresses")
            except DocumentError as error:
                self._leave_out(of, "addresses", error, value=entry)
            else:
                found.append(entry)
        return found

    # Properties

    def other_properties(self, thing: Thing, said: Said, held: Dict[str, Item]) -> Properties:
        found = super().other_properties(thing, said, held)
        for key in tuple(found):
            try:
                if found[key]["type"] not in _table.PROPERTY_TYPES:
                    raise ValueError(f"no property type has the number {found[key]['type']}")
                _property_bytes.check(_scope(thing), key, {key: held[key].data})
            except ValueError as error:
                self._leave_out(thing, "properties", error, key=key, **found.pop(key))
        return {**found, **_side_of_client(thing, held)}

    # What a document takes

    def _keep_what_documents_say(self, said: Said) -> None:
        """Numbers out of bounds, options that nobody knows: with one of them no clone starts."""
        while True:
            try:
                documents.read({**said, "observed": {"snapshot": VERSION}})
            except DocumentError as error:
                self._left_out.append({"path": error.path, "why": error.expected})
                _remove(said, error.path)
            else:
                return

    def _keep_what_fits(self, switch: Said) -> None:
        """What a clone refuses where a part of its switch is not known."""
        if "max_ports" not in switch and len(switch["ports"]) > DEFAULTS["switches"]["max_ports"]:
            switch["max_ports"] = len(switch["ports"])
        if "private_vlans" in switch or _vs.VSPROP_PVLAN_MAP in switch["properties"]:
            return
        for port in (*switch["ports"], *switch["uplink_ports"]):
            vlan = port.get("vlan")
            if isinstance(vlan, dict) and vlan.get("private"):
                del port["vlan"]
                port["properties"].pop(_vs.VSPROP_PORT_VLAN, None)
                about = {"switch": switch["alias"], "port": port["id"], "what": "vlan"}
                why = "nobody knows the private VLANs of the switch"
                self._left_out.append({**about, "why": why, "value": vlan})


def _place(of: Any) -> Said:
    """Where something is, by the names of documents."""
    if isinstance(of, Uplink):
        return {"switch": of.switch.alias, "uplink": of.name}
    return dict(zip(("switch", "port"), of.owner)) if isinstance(of, Thing) else {}


def _why(error: Exception) -> Said:
    if isinstance(error, Trapped):
        cause = error.__cause__
        words = f"{type(cause).__name__}: {cause}"
        return {"call": error.call, "status": "trap", "words": words}
    if isinstance(error, HostError) and error.status is not None:
        words = checked.QEX_ReturnStatusToString(int(error.status)) or ""
        return {"call": error.call, "status": str(error.status), "words": words}
    return {"words": str(error)}


def _is_gone(thing: Thing) -> bool:
    try:
        return not thing.exists()
    except HostError:
        return False


def _counted(counters: Dict[str, int]) -> Dict[str, int]:
    return {name: count for name, count in counters.items() if count}


def _learned(port: Port) -> Dict[str, int]:
    counted: Dict[str, int] = checked.VSQEX_GetPortMACLearningStats(*port.owner).asdict()
    return counted


def _group_words(group: "Group") -> Said:
    return {**vars(group), "sources": list(group.sources)}


def _scope(thing: Thing) -> str:
    if isinstance(thing, HostPart):
        return "host"
    return "switch" if isinstance(thing, Switch) else "port"


def _side_of_client(thing: Thing, held: Dict[str, Item]) -> Properties:
    """The link of a port with a client is down when the client's side is, which can be set."""
    key = _vs.QEX_NEBPROP_PORT_LINK_STATUS
    if isinstance(thing, Port) and _vs.QEX_NEBPROP_PORT_VNIC_CONNECTEE in held and key in held:
        if not any(held[key].data):
            return {key: _describing.property_words(held[key].data, held[key].propertyType)}
    return {}


_THINGS = ("switches", "uplink_ports", "ports", "uplinks", "lags")
_NAMES = ("alias", "id", "name")


def _remove(said: Said, path: str) -> None:
    """Takes out what a path is about: a member of a thing, or the thing if that is its name."""
    steps = [int(one) if one.isdigit() else one for one in re.findall(r"[^.\[\]]+", path)]
    things = [at for at, step in enumerate(steps) if step in _THINGS and at + 1 < len(steps)]
    end = things[-1] + 2 if things else 1
    if end < len(steps) and steps[end] not in _NAMES:
        end += 1
    found: Any = said
    for step in steps[: end - 1]:
        found = found[step]
    del found[steps[end - 1]]
