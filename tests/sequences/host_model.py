"""What a host is to those who call it: a model in plain Python, made from its description.

A question that begins with `refusals` returns the names of all statuses with which the host may
refuse a call; with none it does what it is asked. Which of several it names is its own choice.
"""

import copy
import struct
from dataclasses import dataclass, field
from typing import Dict, List, Optional, Set, Tuple

UPLINKS = ["nic0", "nic1", "nic2", "nic3"]
AGING_SECONDS = 300
DEFAULT_PORTS, MOST_PORTS = 128, 65_535
LEAST_MTU, DEFAULT_MTU, MOST_MTU = 1280, 1500, 9190
MOST_VLAN = 4094

CONFIG, RUNTIME, VOLATILE, POLICY = "CONFIG", "RUNTIME", "VOLATILE", "POLICY"
KEPT = (CONFIG, POLICY)

Refusals = Set[str]
Address = Tuple[bytes, int]
"""A MAC address and its VLAN."""


@dataclass(frozen=True)
class Property:
    """A setting whose bytes have a meaning."""

    key: str
    form: str
    least: int
    most: int
    default: int
    outside: str = "QEX_BAD_PARAM"
    """What the host returns for a number out of its bounds."""

    def encoded(self, value: int) -> bytes:
        return struct.pack(self.form, value)

    def refusals(self, data: bytes) -> Refusals:
        if len(data) != struct.calcsize(self.form):
            return {"QEX_BAD_PARAM"}
        (value,) = struct.unpack(self.form, data)
        return set() if self.least <= value <= self.most else {self.outside}


_PREFIX = "com.quorix.vswitch."
MTU = Property(_PREFIX + "mtu", "<I", LEAST_MTU, MOST_MTU, DEFAULT_MTU)
MULTICAST = Property(_PREFIX + "multicastFilter", "<I", 0, 3, 0)
DISABLED = Property(_PREFIX + "disabled", "<B", 0, 1, 0)
OF_SWITCH = {known.key: known for known in (MTU, MULTICAST, DISABLED)}

NESTED = Property(_PREFIX + "port.vlanNestedTag", "<B", 0, 1, 0)
TX_UPLINK = Property(_PREFIX + "port.txUplink", "<B", 0, 1, 0)
PRIORITY = Property(_PREFIX + "port.priority", "<i", 0, 7, -1)
SECURITY = Property(_PREFIX + "port.security", "<I", 0, 7, 0)
_COMMON = "com.quorix.common.port."
BLOCKED = Property(_COMMON + "block", "<B", 0, 1, 0)
CONNECTION = Property(_COMMON + "connectid", "<I", 0, 2**32 - 1, 0)
CLIENT_VLAN = Property(_COMMON + "qexnicVlanID", "<H", 0, MOST_VLAN, 0, "QEX_BAD_VLANID")
PORT_TYPE = Property(_COMMON + "volatile.type", "<I", 1, 4, 1)
PERSISTENT = Property(_COMMON + "volatile.persist", "<B", 0, 1, 0)
PASSTHROUGH = Property(_COMMON + "ptAllowed", "<B", 0, 1, 0)
PASSTHROUGH_NOW = Property(_COMMON + "ptAllowedRT", "<B", 0, 1, 0)
UNTIL_READY = Property("com.quorix.port.forward.not.ready.block", "<B", 0, 1, 0)
OF_PORT = {
    known.key: known
    for known in (
        NESTED,
        TX_UPLINK,
        PRIORITY,
        SECURITY,
        BLOCKED,
        CONNECTION,
        CLIENT_VLAN,
        PORT_TYPE,
        PERSISTENT,
        PASSTHROUGH,
        PASSTHROUGH_NOW,
        UNTIL_READY,
    )
}

NOTE = "com.example.note"
"""A key without a meaning, which takes any bytes."""


def encoded(key: str, value: int) -> bytes:
    """A value in as many bytes as the key takes."""
    known = OF_SWITCH.get(key) or OF_PORT.get(key)
    size = struct.calcsize(known.form) if known else 4
    return value.to_bytes(4, "little")[:size]


class Properties:
    """Bytes and a type under each key."""

    def __init__(self, known: Dict[str, Property]) -> None:
        self._known = known
        self.all: Dict[str, Tuple[bytes, str]] = {}

    def refusals_to_set(self, key: str, data: bytes) -> Refusals:
        known = self._known.get(key)
        if key == NOTE:
            return set()
        return {"QEX_BAD_PARAM"} if known is None else known.refusals(data)

    def refusals_to_find(self, key: str) -> Refusals:
        """To read it or to clear it: what cannot be set is not set."""
        return set() if key in self.all else {"QEX_NOT_FOUND"}

    def value(self, known: Property) -> int:
        """What a typed call reads."""
        if known.key not in self.all:
            return known.default
        (value,) = struct.unpack(known.form, self.all[known.key][0])
        return int(value)

    def keep(self, types: Tuple[str, ...]) -> None:
        self.all = {key: held for key, held in self.all.items() if held[1] in types}


@dataclass
class Port:
    """A port of a client."""

    external: str = ""
    properties: Properties = field(default_factory=lambda: Properties(OF_PORT))


@dataclass
class Seen:
    """An address of a table. Times are milliseconds of the clock."""

    place: Optional[str]
    """A port, or None beyond the uplinks."""
    type: str
    since: int

    @property
    def gone(self) -> Optional[int]:
        """When one that was learned goes."""
        return self.since + AGING_SECONDS * 1000 if self.type == "LEARNED" else None


@dataclass
class Switch:
    """A switch; the uplinks are in the order in which they were attached."""

    identifier: str
    portset: str
    max_ports: int
    persistent: bool
    running: bool
    uplinks: List[str]
    ports: Dict[str, Port] = field(default_factory=dict)
    properties: Properties = field(default_factory=lambda: Properties(OF_SWITCH))
    addresses: Dict[Address, Seen] = field(default_factory=dict)


def refusals_of_name(name: str, longest: int, *, optional: bool = False) -> Refusals:
    if not name and not optional:
        return {"QEX_BAD_PARAM"}
    return {"QEX_NAME_TOO_LONG"} if len(name.encode()) > longest else set()


class Model:
    """The switches of a host by their aliases, and its clock in milliseconds."""

    def __init__(self) -> None:
        self.switches: Dict[str, Switch] = {}
        self.now = 1_000_000

    def free_uplinks(self) -> List[str]:
        taken = {uplink for switch in self.switches.values() for uplink in switch.uplinks}
        return [uplink for uplink in UPLINKS if uplink not in taken]

    def refusals_to_create(
        self, alias: str, identifier: str, portset: str, max_ports: int, mtu: int, uplinks: int
    ) -> Refusals:
        found = refusals_of_name(alias, 127)
        found |= refusals_of_name(identifier, 63, optional=True)
        found |= refusals_of_name(portset, 127, optional=True)
        others = self.switches.values()
        if (
            alias in self.switches
            or (identifier and identifier in {other.identifier for other in others})
            or (portset and portset in {other.portset for other in others})
        ):
            found.add("QEX_EXISTS")
        if max_ports > MOST_PORTS or not (mtu == 0 or LEAST_MTU <= mtu <= MOST_MTU):
            found.add("QEX_BAD_PARAM")
        if uplinks > len(self.free_uplinks()):
            found.add("QEX_NO_RESOURCES")
        return found

    def refusals_of_switch(self, alias: str) -> Refusals:
        return set() if alias in self.switches else {"QEX_NOT_FOUND"}

    def refusals_of_running(self, alias: str) -> Refusals:
        running = alias in self.switches and self.switches[alias].running
        return set() if running else {"QEX_NOT_FOUND"}

    def refusals_of_port(self, alias: str, port: str) -> Refusals:
        there = alias in self.switches and port in self.switches[alias].ports
        return set() if there else {"QEX_NOT_FOUND"}

    def refusals_to_add_port(self, alias: str, port: str, external: Optional[str]) -> Refusals:
        found = self.refusals_of_switch(alias) | refusals_of_name(port, 47)
        if external is not None:
            found |= refusals_of_name(external, 47)
        if alias in self.switches:
            switch = self.switches[alias]
            externals = {other.external for other in switch.ports.values() if other.external}
            if port in switch.ports or external in externals:
                found.add("QEX_EXISTS")
            if len(switch.ports) >= switch.max_ports:
                found.add("QEX_LIMIT_EXCEEDED")
        return found

    def refusals_to_attach(self, alias: str, uplink: str) -> Refusals:
        found = self.refusals_of_switch(alias)
        if uplink not in UPLINKS:
            found.add("QEX_NOT_FOUND")
        for other, switch in self.switches.items():
            if uplink in switch.uplinks:
                found.add("QEX_EXISTS" if other == alias else "QEX_BUSY")
        return found

    def refusals_to_detach(self, alias: str, uplink: str) -> Refusals:
        attached = alias in self.switches and uplink in self.switches[alias].uplinks
        return set() if attached else {"QEX_NOT_FOUND"}

    def addresses(self, alias: str, place: Optional[str]) -> Dict[Address, Seen]:
        """What a table of a switch shows now."""
        return {
            address: seen
            for address, seen in self.switches[alias].addresses.items()
            if seen.place == place and not self.is_gone(seen)
        }

    def is_gone(self, seen: Seen) -> bool:
        return seen.gone is not None and seen.gone <= self.now

    def fixed_elsewhere(self, alias: str, place: Optional[str], address: Address) -> bool:
        seen = self.switches[alias].addresses.get(address)
        return seen is not None and seen.place != place and seen.gone is None

    def refusals_to_fix(self, alias: str, port: str, address: Address, kind: str) -> Refusals:
        mac, vlan = address
        found = self.refusals_of_running(alias) | self.refusals_of_port(alias, port)
        if kind not in ("STATIC", "USER"):
            found.add("QEX_BAD_PARAM")
        if mac[0] & 1 or not any(mac):
            found.add("QEX_INVALID_ADDRESS")
        if vlan > MOST_VLAN:
            found.add("QEX_BAD_VLANID")
        if alias in self.switches and self.fixed_elsewhere(alias, port, address):
            found.add("QEX_EXISTS")
        return found

    def refusals_to_clear(self, alias: str, port: str, address: Address, kind: str) -> Refusals:
        found = self.refusals_of_running(alias) | self.refusals_of_port(alias, port)
        if not found:
            seen = self.addresses(alias, port).get(address)
            if seen is None or kind not in ("ALL", seen.type):
                found = {"QEX_NOT_FOUND"}
        return found

    def learn(self, alias: str, place: Optional[str], address: Address) -> None:
        addresses = self.switches[alias].addresses
        seen = addresses.get(address)
        if seen is None or seen.gone is not None:
            addresses[address] = Seen(place, "LEARNED", self.now)

    def remove_port(self, alias: str, port: str) -> None:
        switch = self.switches[alias]
        del switch.ports[port]
        switch.addresses = {a: seen for a, seen in switch.addresses.items() if seen.place != port}

    def restart(self) -> None:
        """What is volatile or learned goes, and switches that are not persistent."""
        self.switches = {a: switch for a, switch in self.switches.items() if switch.persistent}
        for switch in self.switches.values():
            switch.properties.keep(KEPT)
            for port in switch.ports.values():
                port.properties.keep(KEPT)
            switch.addresses = {a: s for a, s in switch.addresses.items() if s.gone is None}

    def image(self, persistent: bool) -> Dict[str, Switch]:
        """What an image holds: what callers set, and not the runtime state."""
        image = Model()
        image.switches = copy.deepcopy(self.switches)
        if persistent:
            image.restart()
        for switch in image.switches.values():
            switch.addresses = {}
        return image.switches
