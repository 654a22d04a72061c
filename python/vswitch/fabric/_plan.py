"""From a document to one transaction of the fabric's database."""

from __future__ import annotations

import json
import typing
import uuid
from dataclasses import replace
from typing import Any, Dict, Iterable, List, Mapping, Sequence, Set, Tuple

from libvswitch.errors import NotFound
from vswitch import _settings, _table
from vswitch._describing import property_words
from vswitch.documents import MacWish, PortWish, PropertyWish, SwitchWish, ThingWish
from vswitch.fabric._documents import Wish, read_fabric
from vswitch.fabric._notation import (
    Operation,
    Where,
    delete,
    insert,
    map_of,
    mutate,
    set_of,
    unchanged,
    update,
    where,
)
from vswitch.fabric._view import SharedPort, SharedSwitch, View, value_of
from vswitch.told import Change
from vswitch.values import Words
from vswitch.words import ABSENT, DocumentError

if typing.TYPE_CHECKING:
    from vswitch.fabric._fabric import Fabric

__all__ = ["Difference", "Plan"]

Texts = Dict[str, str]


class Plan:
    """What would change in a fabric, and what does when it is applied: all of it, or nothing."""

    def __init__(self, fabric: "Fabric", found: "Difference") -> None:
        self._fabric = fabric
        self._revision = found.view.revision
        self._operations = found.operations
        self.changes: Tuple[Change, ...] = tuple(found.changes)
        """What would change, as the fabric was when the plan was made."""
        self.hosts: Tuple[str, ...] = tuple(sorted(found.hosts))
        """The hosts that it concerns."""

    def apply(self) -> int:
        """Changes the fabric; returns the revision that has it.

        Raises Busy if somebody else changed the same meanwhile, or no server can be reached:
        nothing is changed then; and NotRestored if nobody knows.
        """
        if not self._operations:
            return self._revision
        return self._fabric._commit(self._operations)

    def __str__(self) -> str:
        return "\n".join(map(str, self.changes)) or "no changes"


class Difference:
    """What keeps a fabric from being as it is wanted, and the operations that change it."""

    def __init__(self, view: View) -> None:
        self.view = view
        self.changes: List[Change] = []
        self.operations: List[Operation] = []
        self.hosts: Set[str] = set()

    def add(self, wish: Wish) -> None:
        switch = wish.switch
        there = self.view.switches.get(switch.alias)
        before = len(self.changes)
        if switch.absent:
            if there is not None:
                self._remove_switch(there)
        elif there is None:
            self._add_switch(wish)
        else:
            self._change_switch(there, wish)
        if len(self.changes) > before:
            self.hosts.update(there.hosts if there is not None else (), wish.hosts or ())

    def forget(self, name: str) -> None:
        """Has the fabric without a host."""
        host = self.view.hosts[name]
        self.tell(host.name, {"name": host.name}, None)
        self.operations.append(delete("Host", where(name=host.name)))
        for switch in self.view.switches.values():
            if name in switch.hosts:
                self._have_on(switch, [one for one in switch.hosts if one != name])

    def tell(self, path: str, before: Words, after: Words) -> None:
        self.changes.append(Change(path, before, after))

    # Switches

    def _remove_switch(self, there: SharedSwitch) -> None:
        self.tell(there.alias, {"id": there.id}, None)
        self.operations += [
            _same_switch(there),
            delete("Port", where(switch=there.id)),
            delete("Switch", where(id=there.id)),
        ]

    def _add_switch(self, wanted: Wish) -> None:
        wish, hosts = wanted.switch, wanted.hosts
        if not hosts:
            raise DocumentError(wish.path, "'hosts' is missing: the names of those that have it")
        self._check_hosts(wish, hosts)
        identifier = wish.fixed.get("id") or str(uuid.uuid4())
        self.tell(wish.alias, None, {"id": identifier, "hosts": list(hosts)})
        texts = self._texts_of_switch(wish.alias, {}, wanted)
        row = {"alias": wish.alias, "hosts": set_of(hosts), "settings": map_of(texts)}
        self.operations.append(insert("Switch", id=identifier, writers=_writers(hosts), **row))
        there = SharedSwitch(wish.alias, identifier, hosts, writers=hosts)
        for port in wish.ports:
            self._port(there, port)

    def _change_switch(self, there: SharedSwitch, wanted: Wish) -> None:
        wish, hosts = wanted.switch, wanted.hosts
        if wish.fixed.get("id", there.id) != there.id:
            raise DocumentError(f"{wish.path}.id", f"the switch has {there.id!r}, which stays")
        of_switch = where(id=there.id)
        texts = self._texts_of_switch(there.alias, there.texts, wanted)
        if texts != there.texts:
            self.operations.append(_same_switch(there))
            self.operations.append(update("Switch", of_switch, settings=map_of(texts)))
        if hosts is not None and set(hosts) != set(there.hosts):
            self._check_hosts(wish, hosts)
            there = self._have_on(there, hosts)
        for port in wish.ports:
            self._port(there, port)

    def _check_hosts(self, wish: SwitchWish, hosts: Sequence[str]) -> None:
        for at, name in enumerate(hosts):
            try:
                self.view.hosts[name]
            except NotFound as error:
                raise DocumentError(f"{wish.path}.hosts[{at}]", str(error)) from None

    def _have_on(self, there: SharedSwitch, hosts: Sequence[str]) -> SharedSwitch:
        """On other hosts; on those that it leaves its ports are connected no longer. Returns the
        switch as it is then."""
        self.tell(f"{there.alias}/hosts", list(there.hosts), sorted(hosts))
        of_switch, now = where(id=there.id), set(there.hosts)
        self.operations.append(unchanged("Switch", of_switch, hosts=set_of(there.hosts)))
        added, gone = sorted(set(hosts) - now), sorted(now - set(hosts))
        if added:
            self.operations += [
                mutate("Switch", of_switch, "hosts", "insert", set_of(added)),
                mutate("Switch", of_switch, "writers", "insert", _writers(added)),
                mutate("Port", where(switch=there.id), "writers", "insert", _writers(added)),
            ]
        for name in gone:
            self.operations += [
                mutate("Switch", of_switch, "hosts", "delete", set_of([name])),
                mutate("Switch", of_switch, "writers", "delete", set_of([name])),
                mutate("Port", where(switch=there.id), "writers", "delete", set_of([name])),
                update("Port", where(switch=there.id, host=name), host=""),
            ]
        writers = sorted({*there.writers, *added} - {*gone})
        return replace(there, hosts=tuple(hosts), writers=tuple(writers))

    # Ports

    def _port(self, switch: SharedSwitch, wish: PortWish) -> None:
        there = switch.ports.get(wish.id)
        path = f"{switch.alias}/{wish.id}"
        if wish.absent:
            if there is not None:
                self.tell(path, {"id": wish.id}, None)
                self.operations += [_same_port(there), delete("Port", _row_of(there))]
            return
        if there is None:
            self.tell(path, None, {"id": wish.id})
            texts = map_of(self._texts_of_port(path, {}, wish))
            writers = _writers(switch.writers)
            row = {"switch": switch.id, "id": wish.id, "host": "", "settings": texts}
            self.operations += [
                unchanged("Switch", where(id=switch.id), writers=writers),
                insert("Port", writers=writers, **row),
            ]
            return
        texts_now = self._texts_of_port(path, there.texts, wish)
        if texts_now != there.texts:
            self.operations += [
                _same_port(there),
                update("Port", _row_of(there), settings=map_of(texts_now)),
            ]

    # All settings as they are to be

    def _texts_of_switch(self, path: str, texts: Mapping[str, str], wanted: Wish) -> Texts:
        found = _Members(self, path, texts)
        wish = wanted.switch
        for name in ("max_ports", "version"):
            if name in wish.fixed:
                found.set(name, wish.fixed[name])
        if wanted.fabric is not None:
            found.set_fabric(wanted.fabric)
        found.add_settings(wish, _table.SWITCH)
        found.add_properties(wish.properties)
        return found.texts

    def _texts_of_port(self, path: str, texts: Mapping[str, str], wish: PortWish) -> Texts:
        found = _Members(self, path, texts)
        if wish.external_id is not None:
            found.set("external_id", wish.external_id)
        found.add_settings(wish, _table.PORT)
        found.add_properties(wish.properties)
        found.add_addresses(wish.macs)
        return found.texts


class _Members:
    """The settings of one thing, and what becomes of them."""

    def __init__(self, told: Difference, path: str, texts: Mapping[str, str]) -> None:
        self._told = told
        self._path = path
        self.texts: Texts = dict(texts)

    def _now(self, name: str) -> Words:
        return value_of(self.texts[name]) if name in self.texts else None

    def _put(self, name: str, value: Words) -> None:
        """None and what is empty is not there."""
        if value is None or (name in ("properties", "addresses") and not value):
            self.texts.pop(name, None)
        else:
            self.texts[name] = json.dumps(value)

    def set(self, name: str, after: Words, before: Any = ...) -> None:
        before = self._now(name) if before is ... else before
        if before != after:
            self._told.tell(f"{self._path}/{name}", before, after)
            self._put(name, after)

    def set_fabric(self, wanted: Dict[str, Any]) -> None:
        held = self._now("fabric")
        try:
            before = read_fabric({} if held is None else held, "fabric")
        except DocumentError:
            # Nor can any host read it.
            self.set("fabric", wanted or None, held)
        else:
            self.set("fabric", wanted or None, before or None)

    def add_settings(self, wish: ThingWish, known: Mapping[str, _table.Property]) -> None:
        given = {named.key for named in wish.properties}
        for name, value in wish.settings.items():
            one = known[name]
            is_cleared = isinstance(value, str) and value == ABSENT
            after = None if is_cleared else _settings.words_of(one, value)
            self.set(name, after, _in_one_spelling(one, self._now(name)))
            # Where there are both, the bytes win.
            self.add_properties(
                tuple(PropertyWish(wish.path, True, key) for key in one.keys if key not in given)
            )

    def add_properties(self, wishes: Tuple[PropertyWish, ...]) -> None:
        for wish in wishes:
            there = self._now("properties")
            held = there if isinstance(there, dict) else {}
            before = held.get(wish.key)
            after = property_words(wish.data or b"", wish.type) if not wish.absent else None
            if before != after:
                self._told.tell(f"{self._path}/{wish.key}", before, after)
                held.pop(wish.key, None)
                self._put("properties", held if after is None else {**held, wish.key: after})

    def add_addresses(self, wishes: Tuple[MacWish, ...]) -> None:
        for wish in wishes:
            there = self._now("addresses")
            held: List[Dict[str, Any]] = there if isinstance(there, list) else []
            same = [one for one in held if (one["mac"], one["vlan"]) == (wish.mac, wish.vlan)]
            before = same[0] if same else None
            after = _mac_words(wish) if not wish.absent else None
            if before != after:
                path = f"{self._path}/macs/{wish.mac}" + (f"/{wish.vlan}" if wish.vlan else "")
                self._told.tell(path, before, after)
                others = [one for one in held if one is not before]
                self._put("addresses", [*others, after] if after else others)


def _mac_words(wish: MacWish) -> Dict[str, Words]:
    return {"mac": wish.mac, "vlan": wish.vlan, "vni": wish.vni, "type": str(wish.type)}


def _in_one_spelling(known: _table.Property, held: Words) -> Words:
    """As a document would have it that says the same."""
    if held is None:
        return None
    try:
        return _settings.words_of(known, _settings.parse(known, held, known.name))
    except DocumentError:
        # No host can bear it, and it says what it says.
        return held


def _writers(hosts: Iterable[str]) -> List[Any]:
    return map_of({name: name for name in hosts})


def _same_switch(there: SharedSwitch) -> Operation:
    row = {"alias": there.alias, "settings": map_of(there.texts)}
    return unchanged("Switch", where(id=there.id), **row)


def _row_of(there: SharedPort) -> Where:
    """A server would look at every row for a condition of other columns."""
    return where(_uuid=["uuid", there.uuid])


def _same_port(there: SharedPort) -> Operation:
    return unchanged("Port", _row_of(there), settings=map_of(there.texts))
