"""From the host to the words of documents.

A description has what is set, with the names of scenario documents, and under `observed` what
nobody sets. A setting whose property type is not the usual one is repeated under `properties` byte
for byte, where the bytes win.
"""

from __future__ import annotations

import typing
from typing import Callable, Dict, Iterable, List, Optional, Tuple, TypeVar

from libvswitch import checked
from libvswitch.enums import MacType
from libvswitch.errors import Disconnected, NotFound, NoUplink
from vswitch import _settings, _table
from vswitch._thing import Item, Thing
from vswitch.values import Words
from vswitch.words import ABSENT

if typing.TYPE_CHECKING:
    from vswitch.host import Host
    from vswitch.port import Port, UplinkPort
    from vswitch.switch import Switch
    from vswitch.uplink import Uplink

_TYPES = {number: word for word, number in _table.PROPERTY_TYPES.items()}
# As a text in a document it would clear the setting.
_ABSENT = ABSENT.encode() + b"\0"


def mac_words(
    mac: str, vlan: int, vni: int, type_: MacType, ages: bool, age: int
) -> Dict[str, Words]:
    """An address in the place where it is."""
    said = {"mac": mac, "vlan": vlan, "vni": vni}
    return {**said, "type": str(type_), "ages": ages, "age": age}


def macs_words(table: Iterable[checked.VSMACEntry]) -> List[Dict[str, Words]]:
    return [
        mac_words(one.macAddress, one.vid, one.vni, one.macAddrType, one.aging, one.elapsed)
        for one in table
    ]


Described = TypeVar("Described", bound=Thing)


def each_state(
    things: Iterable[Described], state: Callable[[Described], Dict[str, Words]]
) -> List[Dict[str, Words]]:
    """The states of things, but of those that somebody removes meanwhile."""
    found = []
    for thing in things:
        try:
            found.append(state(thing))
        except NotFound:
            if thing.exists():
                raise
    return found


def host_state(host: "Host") -> Dict[str, Words]:
    switches = each_state(host.switches.values(), switch_state)
    return {
        "uplinks": uplinks_state(host),
        "runtime_options": host.options.all(),
        "mac_learning": host.mac_learning.words(),
        "switches": switches,
    }


def uplinks_state(host: "Host") -> List[Dict[str, Words]]:
    found = []
    for uplink in host.uplinks.values():
        try:
            found.append({"name": uplink.name, "observed": _observed(uplink)})
        except (NotFound, Disconnected):
            if uplink.name in host.uplinks:
                raise
    return found


def _observed(uplink: "Uplink") -> Dict[str, Words]:
    links = {"link": str(uplink.link), "lacp": str(uplink.lacp)}
    return {**links, "switch": uplink.switch.alias, "port": uplink.port}


def switch_state(switch: "Switch") -> Dict[str, Words]:
    handle = switch._handle()
    held = switch.properties()
    running = switch.running
    uplinks = tuple(switch.uplinks) if running else ()
    said: Dict[str, Words] = {
        "alias": switch.alias,
        "id": switch.identifier,
        "portset": switch.portset,
        "max_ports": checked.DVS_GetMaxPorts(handle),
        "version": checked.DVS_Version(handle),
        "running": running,
        "uplink_ports": each_state(
            switch.uplink_ports.values(), lambda one: uplink_port_state(one, uplinks)
        ),
        "uplinks": list(uplinks),
        "lags": [
            {"name": lag.name, "uplinks": list(lag.uplinks), "observed": {"link": str(lag.link)}}
            for lag in (switch.lags if running else ())
        ],
    }
    said.update(settings_state(switch, switch._settings, held))
    said["ports"] = each_state(switch.ports.values(), lambda one: port_state(one, running))
    if running:
        table = checked.VSQEX_GetTeamMACTable(switch.alias, MacType.ALL)
        said["addresses"] = macs_words(table)
    said["properties"] = other_properties(switch._settings, held)
    said["host_properties"] = other_properties({}, switch.host_part.properties())
    return said


def uplink_port_state(port: "UplinkPort", uplinks: Tuple[str, ...]) -> Dict[str, Words]:
    held = port.properties()
    said: Dict[str, Words] = {"id": port.id}
    said.update(settings_state(port, port._settings, held))
    for name in uplinks:
        if checked.VSQEX_GetUplinkDVPortID(name) == port.id:
            said["uplink"] = name
    said["properties"] = other_properties(port._settings, held)
    return said


def port_state(port: "Port", running: Optional[bool] = None) -> Dict[str, Words]:
    held = port.properties()
    said: Dict[str, Words] = {"id": port.id}
    if port.external_id is not None:
        said["external_id"] = port.external_id
    said.update(settings_state(port, port._settings, held))
    observed: Dict[str, Words] = {}
    if port.switch.running if running is None else running:
        table = checked.VSQEX_GetPortMACTable(*port.owner, MacType.ALL)
        said["addresses"] = macs_words(table)
        number = port.number
        observed = {"number": number, "uplink": carrier_name(number)}
    said["properties"] = other_properties(port._settings, held)
    said["observed"] = observed
    return said


def carrier_name(number: int) -> Optional[str]:
    try:
        return checked.VSQEX_PortGetTeamUplinkHint(number)
    except NoUplink:
        return None


def settings_state(
    thing: Thing, known: Dict[str, _table.Property], held: Dict[str, Item]
) -> Dict[str, Words]:
    """The settings that are set, by their names."""
    said = {}
    for name, one in known.items():
        if any(key in held for key in one.keys):
            said[name] = _settings.words_of(one, _settings.read(thing, one, held.get(one.key)))
    return said


def other_properties(
    known: Dict[str, _table.Property], held: Dict[str, Item]
) -> Dict[str, Dict[str, str]]:
    """What no name says whole, byte for byte."""
    usual: Dict[str, int] = {}
    for one in known.values():
        usual.update(dict.fromkeys(one.keys, one.type))
    return {
        key: {"type": _TYPES.get(item.propertyType, str(item.propertyType)), "hex": item.data.hex()}
        for key, item in sorted(held.items())
        if key not in _table.COMPUTED
        and (usual.get(key) != item.propertyType or item.data == _ABSENT)
    }
