"""What a transaction notes before each write, and how it puts that back.

A step reads what it needs when it is made, before the write. `undo` brings back what was there and
nothing else; `left` says in words what is not as it was.
"""

from __future__ import annotations

import abc
import contextlib
import typing
from functools import partial
from typing import Callable, Dict, Iterable, List, Optional, Tuple

from libvswitch import checked
from libvswitch.enums import LinkState, MacType
from libvswitch.errors import HostError
from vswitch import _settings
from vswitch._arrangement import arrange, arrangement
from vswitch._thing import Before, Item, Thing, own_properties, restore, restore_all
from vswitch.values import MacLearning

if typing.TYPE_CHECKING:
    from vswitch.host import Host
    from vswitch.port import AnyPort, Port
    from vswitch.switch import Switch
    from vswitch.uplink import Uplink

_WAIT = 5


class Step(abc.ABC):
    """A write, and what was before it."""

    place: Tuple[str, ...] = ()
    """The switch and the port that it is about, those that there are."""

    @abc.abstractmethod
    def undo(self) -> None:
        ...

    @abc.abstractmethod
    def left(self) -> List[str]:
        ...

    @abc.abstractmethod
    def what(self) -> str:
        """What it is about, for when nobody can tell what is left."""

    def is_whole(self) -> bool:
        """Whether it undoes all that became of a switch or a port."""
        return False

    def has(self, other: Step) -> bool:
        """Whether the other is about its switch or port, or a part of it."""
        return other.place[: len(self.place)] == self.place


# Properties


def noted(thing: Thing, keys: Iterable[str]) -> Before:
    held = thing.properties()
    return {key: held.get(key) for key in keys}


def differences(thing: Thing, before: Before) -> List[str]:
    held = thing.properties()
    return [
        f"{thing.path}: {_name_of(thing, key)}"
        for key, item in before.items()
        if held.get(key) != item
    ]


def _name_of(thing: Thing, key: str) -> str:
    for name, known in thing._settings.items():
        if key in known.keys:
            return name if key == known.key else f"{name} ({key})"
    return key


class Properties(Step):
    """Properties of a thing that are set or cleared."""

    def __init__(self, thing: Thing, keys: Tuple[str, ...]) -> None:
        self.place = thing.owner
        self._thing = thing
        self._before = noted(thing, keys)
        self._whole = self._setting(keys) if len(keys) > 1 else None

    def _setting(self, keys: Tuple[str, ...]) -> Callable[[], None]:
        """How a setting of several properties comes back in one call, so that nobody sees one
        without the others."""
        thing = self._thing
        known = next(one for one in thing._settings.values() if one.keys == keys)
        how = _settings.crossing(known)
        if any(self._before.values()):
            value = _settings.read(thing, known)
            return lambda: how.set(*thing.owner, value) if how.set else None
        return lambda: how.clear(*thing.owner) if how.clear else None

    def undo(self) -> None:
        if self._whole is not None and differences(self._thing, self._before):
            # What no typed call says of it, the bytes say afterwards.
            with contextlib.suppress(HostError):
                self._whole()
        restore(self._thing, self._before)

    def left(self) -> List[str]:
        return differences(self._thing, self._before)

    def what(self) -> str:
        names = ", ".join(_name_of(self._thing, key) for key in self._before)
        return f"{self._thing.path}: {names}"


# Of the host


class Options(Step):
    """Runtime options of the host."""

    def __init__(self, types: Tuple[int, ...]) -> None:
        self._before = checked.VSQEX_GetRuntimeOptions(types)

    def undo(self) -> None:
        checked.VSQEX_SetRuntimeOptions(self._before)

    def left(self) -> List[str]:
        now = checked.VSQEX_GetRuntimeOptions([one.type for one in self._before])
        return [
            f"options: {was.name}" for was, is_ in zip(self._before, now) if was.value != is_.value
        ]

    def what(self) -> str:
        return "options: " + ", ".join(one.name for one in self._before)


class HostLearning(Step):
    """The MAC learning of the host."""

    def __init__(self, host: "Host") -> None:
        self._host = host
        self._before: MacLearning = host.mac_learning

    def undo(self) -> None:
        if self._host.mac_learning != self._before:
            self._host._set_mac_learning(self._before)

    def left(self) -> List[str]:
        return [] if self._host.mac_learning == self._before else [self.what()]

    def what(self) -> str:
        return "mac_learning"


class Link(Step):
    """Whether an uplink is up. While its cable is out, no call tells what was set."""

    def __init__(self, uplink: "Uplink") -> None:
        self.place = uplink.switch.owner
        self._uplink = uplink
        self._before = uplink.link

    def undo(self) -> None:
        if self._before is LinkState.UP or self._uplink.link is LinkState.UP:
            self._uplink._set(self._before)
            self._uplink.wait(self._before, _WAIT)

    def left(self) -> List[str]:
        return [] if self._uplink.link is self._before else [self.what()]

    def what(self) -> str:
        return f"{self._uplink.path}: link"


class Running(Step):
    """Whether a switch runs on this host."""

    def __init__(self, switch: "Switch") -> None:
        self.place = switch.owner
        self._switch = switch
        self._before = switch.running

    def undo(self) -> None:
        self._switch._run(self._before)

    def left(self) -> List[str]:
        return [] if self._switch.running is self._before else [self.what()]

    def what(self) -> str:
        return f"{self._switch.path}: running"


# Switches, ports and uplinks that come and go


class Added(Step):
    """A switch or a port that is added, unless it was there."""

    def __init__(self, thing: "typing.Union[Switch, Port]") -> None:
        self.place = thing.owner
        self._thing = thing
        self._was_there = thing.exists()

    def undo(self) -> None:
        if not self._was_there and self._thing.exists():
            self._thing._erase()

    def left(self) -> List[str]:
        return [] if self._thing.exists() == self._was_there else [self.what()]

    def is_whole(self) -> bool:
        return not self._was_there

    def what(self) -> str:
        return self._thing.path


class UplinkPorts(Step):
    """The uplink ports of a switch, with what they are called, what is at them and what they have
    set."""

    def __init__(self, switch: "Switch") -> None:
        self.place = switch.owner
        self._switch = switch
        self._before = arrangement(switch)
        self._numbers = {id_: _number(switch.uplink_ports[id_]) for id_ in self._before}
        self._added_again: List[str] = []

    def undo(self) -> None:
        now = arrangement(self._switch)
        self._added_again = [id_ for id_ in self._before if id_ not in now]
        arrange(self._switch, self._before)

    def left(self) -> List[str]:
        now = arrangement(self._switch)
        left = [f"{self._switch.path}/{id_}" for id_ in now if now[id_] != self._before.get(id_)]
        left += [f"{self._switch.path}/{id_}" for id_ in self._before if id_ not in now]
        for id_, number in self._numbers.items():
            again = _number(self._switch.uplink_ports[id_]) if id_ in now else number
            if again != number:
                left.append(f"{self._switch.path}/{id_}: its number was {number} and is {again}")
            elif number is None and id_ in self._added_again:
                left.append(f"{self._switch.path}/{id_}: the uplink that it has when it runs")
        return left

    def what(self) -> str:
        return f"{self._switch.path}: uplink ports"


def _number(port: "AnyPort") -> Optional[int]:
    """What the host calls it, which it does while the switch runs."""
    return port.number if port.switch.running else None


class Macs(Step):
    """The addresses in the table of a port that somebody put there."""

    def __init__(self, port: "Port") -> None:
        self.place = port.owner
        self._port = port
        self._before = kept_macs(port)

    def undo(self) -> None:
        now = kept_macs(self._port)
        for (mac, vlan), entry in now.items():
            if self._before.get((mac, vlan)) != entry:
                self._port._take_mac(mac, vlan)
        for key, kept in self._before.items():
            if now.get(key) != kept:
                put_mac(self._port, key, kept)

    def left(self) -> List[str]:
        return [] if kept_macs(self._port) == self._before else [self.what()]

    def what(self) -> str:
        return f"{self._port.path}: macs"


_Key = Tuple[str, int]
_Kept = Tuple[MacType, int]


def kept_macs(port: "Port") -> Dict[_Key, _Kept]:
    """Static addresses and those of users, with their types and networks."""
    if not port.switch.running:
        return {}
    kept = [one for one in port.macs if one.type in (MacType.STATIC, MacType.USER)]
    return {(one.mac, one.vlan): (one.type, one.vni) for one in kept}


def put_mac(port: "Port", key: _Key, kept: _Kept) -> None:
    (mac, vlan), (type_, vni) = key, kept
    checked.VSQEX_SetPortMACTable(*port.owner, checked.VSMACEntry(mac, type_, False, vlan, vni))


class RemovedPort(Step):
    """A port that is removed. Added again it is a new one, which has all that was set."""

    def __init__(self, port: "Port") -> None:
        self.place = port.owner
        self._port = port
        self._properties = own_properties(port)
        self._number = _number(port)
        self._external_id = port.external_id
        self._macs = kept_macs(port)
        self._was_added = False

    def undo(self) -> None:
        if not self._port.exists():
            self._add()
            self._was_added = True
        restore(self._port, dict(self._properties))
        now = kept_macs(self._port)
        for key, kept in self._macs.items():
            if now.get(key) != kept:
                put_mac(self._port, key, kept)

    def _add(self) -> None:
        if self._external_id is not None:
            checked.VSDVS_AddOpaqueDVPort(*self._port.owner, self._external_id)
        else:
            checked.DVSQEX_PortAdd(self._port.switch.identifier, self._port.id)

    def left(self) -> List[str]:
        path = self._port.path
        if not self._port.exists():
            return [path]
        left = differences(self._port, dict(self._properties))
        if kept_macs(self._port) != self._macs:
            left.append(f"{path}: macs")
        number = _number(self._port)
        if self._was_added or number != self._number:
            left.insert(0, f"{path}: it was removed and added again{self._lost(number)}")
        return left

    def _lost(self, number: Optional[int]) -> str:
        lost = "what it learned and counted is gone"
        if self._external_id is None:
            lost += ", and so is what another system called it"
        if number is None:
            return f": {lost}"
        return f": its number was {self._number} and is {number}; {lost}"

    def is_whole(self) -> bool:
        return True

    def what(self) -> str:
        return self._port.path


class RemovedSwitch(Step):
    """A switch that is removed. Added again it is a new one, which has all that was set."""

    def __init__(self, switch: "Switch") -> None:
        self.place = switch.owner
        self._switch = switch
        self._made = switch.identifier, switch.portset, switch.max_ports
        self._was_made = False
        self._version = switch.version
        self._things: List[Tuple[Thing, Dict[str, Item]]] = [
            (switch, own_properties(switch)),
            (switch.host_part, own_properties(switch.host_part)),
        ]
        self._running = switch.running
        self._uplinks = UplinkPorts(switch)
        self._lags = switch.lags if self._running else ()
        self._ports = [RemovedPort(port) for port in switch.ports.values()]

    def undo(self) -> None:
        switch = self._switch
        if switch.exists() and switch.identifier == self._made[0]:
            return
        self._was_made = True
        identifier, portset, max_ports = self._made
        checked.VSDVS_CreateVSwitch(
            switch.alias, identifier, portset, max_ports, True, self._version, 0, 0
        )
        undos: List[Callable[[], object]] = [self._uplinks.undo]
        undos += [partial(restore_all, thing, before) for thing, before in self._things]
        undos += [port.undo for port in self._ports]
        undos.append(partial(switch._run, self._running))
        for undo in undos:
            # One that fails must not keep the others from their work.
            with contextlib.suppress(Exception):
                undo()

    def left(self) -> List[str]:
        switch = self._switch
        if not switch.exists():
            return [switch.path]
        again = f"{switch.path}: it was removed and added again, and outlasts a restart now"
        left = [again] if self._was_made else []
        left += [
            line for thing, before in self._things for line in differences(thing, dict(before))
        ]
        left += [line for port in self._ports for line in port.left()]
        left += self._uplinks.left()
        if switch.running is not self._running:
            left.append(f"{switch.path}: running")
        elif self._running and switch.lags != self._lags:
            left.append(f"{switch.path}: lags")
        return left

    def is_whole(self) -> bool:
        return True

    def what(self) -> str:
        return self._switch.path
