"""From the host to the words of documents.

A description has what is set, with the names of scenario documents, and under `observed` what
nobody sets. A setting whose property type is not the usual one is repeated under `properties` byte
for byte, where the bytes win.
"""

from __future__ import annotations

import typing
from typing import Callable, Dict, Iterable, List, Optional, Set, Tuple, TypeVar, Union

from libvswitch import checked
from libvswitch.enums import MacType
from libvswitch.errors import Disconnected, NotFound, NoUplink
from vswitch import _settings, _table
from vswitch._thing import Item, Thing
from vswitch.uplink import Uplink, find_port_of
from vswitch.values import Words
from vswitch.words import ABSENT

if typing.TYPE_CHECKING:
    from vswitch.host import Host
    from vswitch.port import Port, UplinkPort
    from vswitch.switch import Switch
    from vswitch.told import Lag

Said = Dict[str, Words]
Properties = Dict[str, Dict[str, str]]
T = TypeVar("T")
Described = TypeVar("Described", bound=Thing)

# As a text in a document it would clear the setting.
_ABSENT = ABSENT.encode() + b"\0"


def mac_words(mac: str, vlan: int, vni: int, type_: MacType, ages: bool, age: int) -> Said:
    """An address in the place where it is."""
    said = {"mac": mac, "vlan": vlan, "vni": vni}
    return {**said, "type": str(type_), "ages": ages, "age": age}


def carrier_name(number: int) -> Optional[str]:
    try:
        return checked.VSQEX_PortGetTeamUplinkHint(number)
    except NoUplink:
        return None


def property_words(data: bytes, type_: int) -> Dict[str, str]:
    """A property byte for byte."""
    return {"type": _table.word_for(_table.PROPERTY_TYPES, type_), "hex": data.hex()}


class Description:
    """How a host is described: each question is one to `ask`, and what is refused is raised."""

    def ask(
        self, of: "Union[Host, Thing, Uplink]", what: str, question: Callable[[], T]
    ) -> Optional[T]:
        """What the host says of a thing, for those who go on where nobody knows it."""
        return question()

    def list(
        self, of: "Union[Host, Thing]", what: str, question: Callable[[], Iterable[T]]
    ) -> Tuple[T, ...]:
        return self.ask(of, what, lambda: tuple(question())) or ()

    def put(
        self, said: Said, of: "Union[Host, Thing]", name: str, question: Callable[[], Words]
    ) -> None:
        """A member of a description, unless nobody knows it."""
        told = self.ask(of, name, question)
        if told is not None:
            said[name] = told

    def each(
        self, things: Iterable[Described], describe: Callable[[Described], Said]
    ) -> List[Said]:
        """Things, but for those that somebody removes meanwhile."""
        found = []
        for thing in things:
            try:
                found.append(describe(thing))
            except NotFound:
                if thing.exists():
                    raise
        return found

    # The host

    def host(self, host: "Host") -> Said:
        said: Said = {"uplinks": []}
        self.put(said, host, "runtime_options", host.options.all)
        self.put(said, host, "mac_learning", lambda: host.mac_learning.words())
        switches = self.list(host, "switches", host.switches.values)
        said["switches"] = self.each(switches, self.switch)
        attached = {one["alias"]: one["uplinks"] for one in said["switches"]}
        for switch in switches:
            said["uplinks"] += self._uplinks(switch, attached.get(switch.alias, ()))
        return said

    def _uplinks(self, switch: "Switch", names: Iterable[str]) -> List[Said]:
        found = []
        for name in names:
            try:
                found.append({"name": name, **self.uplink(Uplink(switch, name))})
            except (NotFound, Disconnected):
                if switch.exists() and name in switch.uplinks:
                    raise
        return found

    def uplink(self, uplink: Uplink) -> Said:
        links = {"link": str(uplink.link), "lacp": str(uplink.lacp)}
        return {"observed": {**links, "switch": uplink.switch.alias, "port": uplink.port}}

    # Switches

    def switch(self, switch: "Switch") -> Said:
        said: Said = {"alias": switch.alias}
        self.put(said, switch, "id", lambda: switch.identifier)
        self.put(said, switch, "portset", lambda: switch.portset)
        self.put(said, switch, "max_ports", lambda: switch.max_ports)
        self.put(said, switch, "version", lambda: switch.version)
        self.put(said, switch, "running", lambda: switch.running)
        # Where nobody knows whether it runs, it is asked what only a running one tells.
        running: bool = said.get("running", True)
        said.update(self.team(switch, running))
        settings, bytes_ = self.settings(switch, self.properties(switch))
        said.update(settings)
        ports = self.list(switch, "ports", switch.ports.values)
        said["ports"] = self.each(ports, lambda one: self.port(one, running))
        if running:
            self.put(said, switch, "addresses", lambda: self.macs(switch, _team_table(switch)))
            said.update(self.counted_by(switch))
        said["properties"] = bytes_
        part = switch.host_part
        said["host_properties"] = self.settings(part, self.properties(part))[1]
        return said

    def team(self, switch: "Switch", running: bool) -> Said:
        uplinks = self.list(switch, "uplinks", lambda: switch.uplinks) if running else ()
        lags = self.list(switch, "lags", lambda: switch.lags) if running else ()
        ports = self.list(switch, "uplink_ports", switch.uplink_ports.values)
        at = self._uplinks_at(switch, uplinks) if ports else {}
        return {
            "uplink_ports": self.each(ports, lambda one: self.uplink_port(one, at)),
            "uplinks": list(uplinks),
            "lags": [self.lag(lag) for lag in lags],
        }

    def _uplinks_at(self, switch: "Switch", names: Iterable[str]) -> Dict[str, str]:
        """The uplinks of a switch by the ports that they are at."""
        found = {}
        for name in names:
            id_ = self.ask(Uplink(switch, name), "port", lambda: find_port_of(name))
            if id_ is not None:
                found[id_] = name
        return found

    def lag(self, lag: "Lag") -> Said:
        said = {"name": lag.name, "uplinks": list(lag.uplinks)}
        return {**said, "observed": {"link": str(lag.link)}}

    def counted_by(self, switch: "Switch") -> Said:
        """What is told of a switch that runs beside what is set."""
        return {}

    # Ports

    def uplink_port(self, port: "UplinkPort", at: Dict[str, str]) -> Said:
        said: Said = {"id": port.id}
        settings, bytes_ = self.settings(port, self.properties(port))
        said.update(settings)
        if port.id in at:
            said["uplink"] = at[port.id]
        said["properties"] = bytes_
        return said

    def port(self, port: "Port", running: bool) -> Said:
        held = self.properties(port)
        said: Said = {"id": port.id}
        external_id = self.ask(port, "external_id", lambda: port.external_id)
        if external_id is not None:
            said["external_id"] = external_id
        settings, bytes_ = self.settings(port, held)
        said.update(settings)
        if running:
            self.put(said, port, "addresses", lambda: self.macs(port, _port_table(port)))
        said["properties"] = bytes_
        said.update(self.seen_of(port, running, held))
        return said

    def seen_of(self, port: "Port", running: bool, held: Dict[str, Item]) -> Said:
        """What is told of a port beside what is set."""
        observed: Said = {}
        if running:
            number = port.number
            observed = {"number": number, "uplink": carrier_name(number)}
        return {"observed": observed}

    def macs(self, of: Thing, table: Iterable[checked.VSMACEntry]) -> List[Said]:
        return [
            mac_words(one.macAddress, one.vid, one.vni, one.macAddrType, one.aging, one.elapsed)
            for one in table
        ]

    # What things have set

    def properties(self, thing: Thing) -> Dict[str, Item]:
        return self.ask(thing, "properties", thing.properties) or {}

    def settings(self, thing: Thing, held: Dict[str, Item]) -> Tuple[Said, Properties]:
        """The settings that are set, by their names, and byte for byte what no name says whole."""
        said = self.named(thing, held)
        return said, self.other_properties(thing, said, held)

    def named(self, thing: Thing, held: Dict[str, Item]) -> Said:
        said: Said = {}
        for name, one in thing._settings.items():
            if any(key in held for key in one.keys):
                self.put(said, thing, name, lambda: setting_words(thing, one, held))
        return said

    def other_properties(self, thing: Thing, said: Said, held: Dict[str, Item]) -> Properties:
        named = self.said_by(thing, said, held)
        return {
            key: property_words(item.data, item.propertyType)
            for key, item in sorted(held.items())
            if key not in _table.COMPUTED and (key not in named or item.data == _ABSENT)
        }

    def said_by(self, thing: Thing, said: Said, held: Dict[str, Item]) -> Set[str]:
        """The keys of the properties that the names of settings say whole."""
        return {
            key
            for name in said
            for key in thing._settings[name].keys
            if key in held and held[key].propertyType == thing._settings[name].type
        }


def setting_words(thing: Thing, known: _table.Property, held: Dict[str, Item]) -> Words:
    return _settings.words_of(known, _settings.read(thing, known, held.get(known.key)))


def _port_table(port: "Port") -> Iterable[checked.VSMACEntry]:
    return checked.VSQEX_GetPortMACTable(*port.owner, MacType.ALL)


def _team_table(switch: "Switch") -> Iterable[checked.VSMACEntry]:
    return checked.VSQEX_GetTeamMACTable(switch.alias, MacType.ALL)


_ALL = Description()


def host_state(host: "Host") -> Said:
    return _ALL.host(host)


def switch_state(switch: "Switch") -> Said:
    return _ALL.switch(switch)


def port_state(port: "Port") -> Said:
    return _ALL.port(port, port.switch.running)
