"""From a document to changes, and back if they do not arrive."""

from __future__ import annotations

import typing
from typing import Any, Callable, Dict, Iterator, List, Optional, Set, Tuple, Union

from libvswitch import checked
from libvswitch.errors import HostError, NotFound
from vswitch import _settings, _table
from vswitch._arrangement import arrangement, vacant
from vswitch._describing import property_words
from vswitch._thing import Thing
from vswitch._whole import completed
from vswitch.documents import (
    Document,
    HostWish,
    MacWish,
    PortWish,
    PropertyWish,
    SwitchWish,
    ThingWish,
    UplinkPortWish,
    read,
)
from vswitch.port import Port, UplinkPort
from vswitch.switch import Switch
from vswitch.told import Change, MacEntry
from vswitch.uplink import find_port_of
from vswitch.values import Words
from vswitch.words import ABSENT, DocumentError

if typing.TYPE_CHECKING:
    from vswitch.host import Host

__all__ = ["Plan"]


class Action(typing.NamedTuple):
    """A change, and how it is made."""

    change: Change
    do: Callable[[], object]
    frees: Tuple[str, ...] = ()
    """Of what takes something away: the uplinks and addresses that others may have then, and the
    switch that has room for another port."""


class Plan:
    """What `Host.plan` makes of a document.

    The document is checked when the plan is made, against the host as well: what is wrong is a
    DocumentError, and nothing is changed. With `whole`, what it does not name goes.
    """

    def __init__(self, host: "Host", document: Document, whole: bool = False) -> None:
        self._host = host
        self._wish = read(document, whole)
        self._whole = whole
        self._actions()

    @property
    def changes(self) -> Tuple[Change, ...]:
        """What would change now; nothing once the host is as it is wanted."""
        return tuple(action.change for action in self._actions())

    def apply(self) -> Tuple[Change, ...]:
        """Changes the host, and reads it back.

        What fails or does not arrive is RolledBack, and NotRestored where something could not be
        put back. Applying once more changes nothing.
        """
        actions = self._actions()
        if actions:
            with self._host.transaction():
                for action in actions:
                    action.do()
                missing = [str(action.change) for action in self._actions()]
                if missing:
                    raise HostError(f"the host did not take it: {'; '.join(missing)}")
        return tuple(action.change for action in actions)

    def _actions(self) -> List[Action]:
        wish = self._wish
        if self._whole:
            wish = completed(wish, read(self._host.state()))
        return _Difference(self._host, wish).actions()

    def __str__(self) -> str:
        return "\n".join(map(str, self.changes)) or "no changes"


class _Difference:
    """What keeps a host from being as it is wanted."""

    def __init__(self, host: "Host", wish: HostWish) -> None:
        self._host = host
        self._wish = wish
        self._switches: Dict[str, Switch] = dict(host.switches.items())
        self._removals: List[Action] = []
        self._made: List[Action] = []
        self._last: List[Action] = []
        # What must be free before something is added.
        self._needed: Set[str] = set()
        # The uplinks that leave their ports.
        self._going = {name for switch in wish.switches for name in self._leaving(switch)}

    def actions(self) -> List[Action]:
        self._host_itself()
        for wish in self._wish.switches:
            if wish.absent:
                self._remove_switch(wish)
            else:
                self._switch(wish)
        self._links()
        first = [one for one in self._removals if self._needed & set(one.frees)]
        later = [one for one in self._removals if one not in first]
        # An undone removal leaves traces: what can wait until the rest is done, does.
        return [*first, *self._made, *self._last, *later]

    def _add(self, path: str, before: Words, after: Words, do: Callable[[], object]) -> None:
        self._made.append(Action(Change(path, before, after), do))

    # The host

    def _host_itself(self) -> None:
        options = self._host.options
        held = options.all() if self._wish.options else {}
        for name, value in self._wish.options.items():
            if held.get(name) != value:
                do = _setter(options.__setitem__, name, value)
                self._add(f"options/{name}", held.get(name), value, do)
        wanted = self._wish.mac_learning
        if wanted is not None and self._host.mac_learning != wanted:
            now = self._host.mac_learning.words()
            do = _setter(setattr, self._host, "mac_learning", wanted)
            self._add("mac_learning", now, wanted.words(), do)

    def _links(self) -> None:
        """Links come after the switches, which may have other uplinks by then."""
        for wish in self._wish.links:
            if wish.link is None:
                continue
            uplink = self._host.uplinks.get(wish.name)
            if uplink is None:
                if wish.name not in self._attached():
                    raise DocumentError(wish.path, f"no switch has the uplink {wish.name!r}")
                now = None
            else:
                now = uplink.link
            if now is not wish.link:
                before = None if now is None else str(now)
                change = Change(f"uplinks/{wish.name}/link", before, str(wish.link))
                do = _setter(self._set_link, wish.name, wish.link)
                self._last.append(Action(change, do))

    def _set_link(self, name: str, link: Any) -> None:
        uplink = self._host.uplinks[name]
        uplink.set_link(link)
        uplink.wait(link)

    def _attached(self) -> Set[str]:
        """The uplinks that the document attaches."""
        found = set()
        for switch in self._wish.switches:
            found |= {one.name for one in switch.uplinks if not one.absent}
            found |= {one.uplink for one in switch.uplink_ports if one.uplink is not None}
        return found

    # Switches

    def _remove_switch(self, wish: SwitchWish) -> None:
        switch = self._switches.get(wish.alias)
        if switch is not None:
            change = Change(switch.path, {"alias": wish.alias}, None)
            frees = tuple(switch.uplinks) if switch.running else ()
            self._removals.append(Action(change, switch.remove, frees))

    def _switch(self, wish: SwitchWish) -> None:
        switch = Switch(self._host, wish.alias)
        is_new = wish.alias not in self._switches
        if is_new:
            said = {"alias": wish.alias, **wish.fixed}
            self._add(switch.path, None, said, _setter(self._make_switch, wish))
        else:
            self._check_fixed(switch, wish)
        running = False if is_new else switch.running
        self._properties(None if is_new else switch, switch, wish.properties)
        part = switch.host_part
        self._properties(None if is_new else part, part, wish.host_properties)
        self._uplink_ports(switch, wish, is_new, running)
        self._lags(switch, wish, running)
        self._settings(None if is_new else switch, switch, wish)
        self._ports(switch, wish, is_new)
        if wish.running is not None and wish.running is not (is_new or running):
            do = _setter(setattr, switch, "running", wish.running)
            self._add(f"{switch.path}/running", not wish.running, wish.running, do)

    def _make_switch(self, wish: SwitchWish) -> None:
        self._host.add_switch(
            wish.alias,
            identifier=wish.fixed.get("id"),
            portset=wish.fixed.get("portset"),
            max_ports=wish.fixed.get("max_ports", 0),
            version=wish.fixed.get("version", 0),
            persistent=wish.persistent,
        )

    def _check_fixed(self, switch: Switch, wish: SwitchWish) -> None:
        names = {"id": "identifier"}
        for name, wanted in wish.fixed.items():
            now = getattr(switch, names.get(name, name))
            if now != wanted:
                expected = f"{wanted!r} cannot be while the switch exists: it is {now!r}"
                raise DocumentError(f"{wish.path}.{name}", expected)

    def _lags(self, switch: Switch, wish: SwitchWish, running: bool) -> None:
        held = {lag.name: lag.uplinks for lag in switch.lags} if running and wish.lags else {}
        for lag in wish.lags:
            if held.get(lag.name) != lag.uplinks:
                raise DocumentError(lag.path, "no call makes link-aggregation groups")

    # Uplinks

    def _leaving(self, wish: SwitchWish) -> Iterator[str]:
        """The uplinks of a switch that are to go, or to be at other ports."""
        switch = self._switches.get(wish.alias)
        if switch is None or not switch.running:
            return
        ports: Dict[Optional[str], UplinkPortWish] = {one.id: one for one in wish.uplink_ports}
        places: Dict[Optional[str], Optional[str]] = {
            one.uplink: one.id for one in wish.uplink_ports
        }
        plain = {one.name: one for one in wish.uplinks}
        for name in switch.uplinks if wish.absent or ports or plain else ():
            id_ = find_port_of(name)
            port = ports.get(id_)
            is_absent = wish.absent or (name in plain and plain[name].absent)
            loses_port = port is not None and port.absent and (name in places or name in plain)
            moves = places.get(name, id_) != id_
            makes_room = port is not None and port.uplink not in (None, name)
            if is_absent or loses_port or (wish.whole and (moves or makes_room)):
                yield name

    def _uplink_ports(self, switch: Switch, wish: SwitchWish, is_new: bool, running: bool) -> None:
        if not (wish.uplink_ports or wish.uplinks):
            return
        ids = [] if is_new else list(switch.uplink_ports)
        here = {find_port_of(name): name for name in switch.uplinks} if running else {}
        self._detach(switch, wish, ids, here)
        for one in wish.uplink_ports:
            if one.absent:
                self._remove_uplink_port(switch, one, ids)
        # An uplink goes to the first port without one, so ports that wait for theirs come first.
        self._attach_to_ports(switch, wish, ids, here)
        for one in wish.uplink_ports:
            if not one.absent and one.uplink is None:
                self._uplink_port(switch, one, ids)
        named = {one.uplink for one in wish.uplink_ports}
        for uplink in wish.uplinks:
            if not uplink.absent and uplink.name not in {*here.values(), *named}:
                self._check_free(uplink.path, uplink.name)
                do = _setter(switch.add_uplink, uplink.name)
                self._add(f"{switch.path}/{uplink.name}", None, {"name": uplink.name}, do)

    def _attach_to_ports(
        self, switch: Switch, wish: SwitchWish, ids: List[str], here: Dict[Optional[str], str]
    ) -> None:
        for one in wish.uplink_ports:
            if one.absent or one.uplink is None:
                continue
            if here.get(one.id) != one.uplink:
                if one.id in here or one.uplink in here.values():
                    expected = f"{one.id!r} and {one.uplink!r} must be without one another first"
                    raise DocumentError(one.path, expected)
                self._check_free(one.path, one.uplink)
            self._uplink_port(switch, one, ids)
            if here.get(one.id) != one.uplink:
                do = _setter(_attach, switch, one.id, one.uplink)
                said = {"name": one.uplink, "port": one.id}
                self._add(f"{switch.path}/{one.uplink}", None, said, do)

    def _uplink_port(self, switch: Switch, wish: UplinkPortWish, ids: List[str]) -> None:
        port = UplinkPort(switch, wish.id)
        is_new = wish.id not in ids
        if is_new:
            self._add(port.path, None, {"id": wish.id}, _setter(_make_uplink_port, switch, wish.id))
        self._settings(None if is_new else port, port, wish)
        self._properties(None if is_new else port, port, wish.properties)

    def _remove_uplink_port(self, switch: Switch, wish: UplinkPortWish, ids: List[str]) -> None:
        if wish.id in ids:
            change = Change(f"{switch.path}/{wish.id}", {"id": wish.id}, None)
            do = _setter(_remove_uplink_port, switch, wish.id)
            self._removals.append(Action(change, do))

    def _detach(
        self, switch: Switch, wish: SwitchWish, ids: List[str], here: Dict[Optional[str], str]
    ) -> None:
        """The host takes an uplink with its port, unless somebody sees to it."""
        kept = {one.id: one for one in wish.uplink_ports if not one.absent}
        for id_, name in list(here.items()):
            if id_ is None or name not in self._going:
                continue
            uplink = switch.uplinks[name]
            if id_ in kept:
                do = _setter(_vacate, switch, id_)
                if kept[id_].uplink is not None:
                    self._needed.add(name)
            else:
                do = uplink.remove
                ids.remove(id_)
            del here[id_]
            self._removals.append(Action(Change(uplink.path, {"name": name}, None), do, (name,)))

    def _check_free(self, path: str, name: str) -> None:
        """An uplink that is to be attached exists, and is free or becomes so."""
        try:
            port = find_port_of(name)
        except NotFound:
            raise DocumentError(path, f"the host has no uplink {name!r}") from None
        if port is None:
            return
        self._needed.add(name)
        if name in self._going:
            return
        owner = next((one for one in self._switches.values() if name in one.uplinks), None)
        where = f"switch {owner.alias!r}" if owner is not None else f"port {port!r}"
        raise DocumentError(path, f"the uplink {name!r} is at {where}")

    # Ports

    def _ports(self, switch: Switch, wish: SwitchWish, is_new: bool) -> None:
        held = {} if is_new or not wish.ports else dict(switch.ports.items())
        added = [one for one in wish.ports if not one.absent and one.id not in held]
        if added and not is_new and len(held) + len(added) > switch.max_ports:
            self._needed.add(switch.path)
        for one in wish.ports:
            if not one.absent:
                self._port(switch, one, held.get(one.id))
            elif one.id in held:
                port = held[one.id]
                change = Change(port.path, {"id": port.id}, None)
                macs = [entry.mac for entry in port.macs] if switch.running else []
                self._removals.append(Action(change, port.remove, (switch.path, *macs)))

    def _port(self, switch: Switch, wish: PortWish, found: Optional[Port]) -> None:
        port = found or Port(switch, wish.id, wish.external_id)
        if found is None:
            do = _setter(switch.add_port, wish.id, external_id=wish.external_id)
            self._add(port.path, None, {"id": wish.id}, do)
        elif wish.external_id is not None:
            self._check_external(switch, wish)
        self._settings(found, port, wish)
        self._properties(found, port, wish.properties)
        self._macs(found, port, wish.macs)

    def _check_external(self, switch: Switch, wish: PortWish) -> None:
        assert wish.external_id is not None
        try:
            is_there = switch.find_port(wish.external_id).id == wish.id
        except NotFound:
            is_there = False
        if not is_there:
            expected = f"{wish.external_id!r} cannot be given while the port exists"
            raise DocumentError(f"{wish.path}.external_id", expected)

    def _macs(self, found: Optional[Port], port: Port, wishes: Tuple[MacWish, ...]) -> None:
        entries = found.macs if found is not None and wishes else ()
        for wish in wishes:
            same = [one for one in entries if (one.mac, one.vlan) == (wish.mac, wish.vlan)]
            path = f"{port.path}/macs/{wish.mac}"
            path += f"/{wish.vlan}" if wish.vlan else ""
            before = _mac_said(same[0]) if same else None
            if wish.absent:
                if same:
                    do = _setter(port.remove_mac, wish.mac, vlan=wish.vlan)
                    self._removals.append(Action(Change(path, before, None), do, (wish.mac,)))
            elif not same or (same[0].type, same[0].vni) != (wish.type, wish.vni):
                self._needed.add(wish.mac)
                more = {"type": wish.type, "vlan": wish.vlan, "vni": wish.vni}
                do = _setter(port.add_mac, wish.mac, **more)
                self._add(path, before, _mac_said(wish), do)

    # What switches and ports have set

    def _settings(self, found: Optional[Thing], thing: Thing, wish: ThingWish) -> None:
        if not wish.settings:
            return
        held = found.properties() if found is not None else {}
        for name, wanted in wish.settings.items():
            known = thing._settings[name]
            now: Words = None
            if found is not None and any(key in held for key in known.keys):
                now = _settings.words_of(known, _settings.read(found, known, held.get(known.key)))
            after = None if _is_absent(wanted) else _settings.words_of(known, wanted)
            if now != after:
                do = _clearer(thing, known) if after is None else _writer(thing, known, wanted)
                self._add(f"{thing.path}/{name}", now, after, do)

    def _properties(
        self, found: Optional[Thing], thing: Thing, wishes: Tuple[PropertyWish, ...]
    ) -> None:
        held = found.properties() if found is not None and wishes else {}
        for wish in wishes:
            item = held.get(wish.key)
            before = None if item is None else property_words(item.data, item.propertyType)
            after = None if wish.data is None else property_words(wish.data, wish.type)
            if before != after:
                if wish.data is None:
                    do = _setter(thing.clear_property, wish.key)
                else:
                    do = _setter(thing.set_property, wish.key, wish.data, wish.type)
                self._add(f"{thing.path}/{wish.key}", before, after, do)


def _is_absent(wanted: object) -> bool:
    return isinstance(wanted, str) and wanted == ABSENT


def _mac_said(entry: Union[MacEntry, MacWish]) -> Dict[str, Words]:
    said = {"mac": entry.mac, "vlan": entry.vlan, "vni": entry.vni}
    return {**said, "type": str(entry.type)}


def _setter(call: Callable[..., object], *arguments: Any, **more: Any) -> Callable[[], object]:
    return lambda: call(*arguments, **more)


def _writer(thing: Thing, known: _table.Property, value: Any) -> Callable[[], object]:
    return lambda: _settings.write(thing, known, value)


def _clearer(thing: Thing, known: _table.Property) -> Callable[[], object]:
    return lambda: _settings.clear(thing, known)


def _names(switch: Switch) -> Dict[str, str]:
    told = checked.VSDVS_GetSwitchUplinkPorts(switch.alias)
    return dict(zip(told.ids, told.names))


def _make_uplink_port(switch: Switch, id_: str) -> None:
    switch.set_uplink_ports({**_names(switch), id_: id_})


def _remove_uplink_port(switch: Switch, id_: str) -> None:
    left = {one: name for one, name in _names(switch).items() if one != id_}
    switch.set_uplink_ports(left)


def _vacate(switch: Switch, id_: str) -> None:
    """Takes the uplink from a port, which stays."""
    now = arrangement(switch)
    switch._arrange_uplink_ports({**now, id_: now[id_]._replace(uplink=None)})


def _attach(switch: Switch, id_: str, name: str) -> None:
    """Attaches an uplink to a port, even if it is not the next to get one."""
    now = arrangement(switch)
    if vacant(now)[:1] == [id_]:
        switch.add_uplink(name)
    else:
        switch._arrange_uplink_ports({**now, id_: now[id_]._replace(uplink=name)})
    went_to = switch.uplinks[name].port
    if went_to != id_:
        raise HostError(f"the host attached {name!r} to the uplink port {went_to!r}, not {id_!r}")
