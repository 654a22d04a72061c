"""Ports of switches, for clients and for uplinks."""

from __future__ import annotations

import struct
import typing
from typing import Any, Dict, Iterable, Optional, Sequence, Tuple, Union

import libvswitch as _vs
from libvswitch import checked
from libvswitch.enums import Forbid, LinkState, MacType
from libvswitch.errors import NotFound, NoUplink
from vswitch import _describing, _settings, _table, _undo, words as _words
from vswitch._settings import Setting
from vswitch._thing import Item, Thing
from vswitch.uplink import Uplink, find_port_of
from vswitch.values import FrameFilter, PortMacLearning, Teaming, Vlan, Words

if typing.TYPE_CHECKING:
    from vswitch.told import Group, MacEntry, PortStats
    from vswitch.host import Host
    from vswitch.mirroring import Mirror, MirrorEnd, Mirroring
    from vswitch.switch import Switch


class AnyPort(Thing):
    """What ports for clients and ports for uplinks have in common."""

    def __init__(self, switch: "Switch", id: str) -> None:
        self.switch = switch
        self.id = id

    @property
    def host(self) -> "Host":  # type: ignore[override]  # of its switch
        return self.switch.host

    @property
    def path(self) -> str:
        return f"{self.switch.alias}/{self.id}"

    @property
    def owner(self) -> Tuple[str, str]:
        return self.switch.alias, self.id

    @property
    def number(self) -> int:
        """The number that the host gave it while the switch runs, unique among all ports."""
        return checked.VSDVS_DvPortIDToPortID(self.switch.alias, self.id)

    def exists(self) -> bool:
        return self.switch.exists() and checked.DVPortExist(self.switch.identifier, self.id)

    def properties(self) -> Dict[str, Item]:
        handle = checked.DVSState_PortFind(self.switch.identifier, self.id)
        if handle is None:
            # A call that looks for the port has the words for why there is none.
            checked.DVSQEX_PortFind(self.switch.identifier, self.id)
            raise NotFound(f"no port {self.id!r} of switch {self.switch.alias!r}")
        return {one.name: one for one in checked.DVSState_PortDataForEach(handle)}

    def read_property(self, key: str) -> bytes:
        return checked.DVSQEX_PortDataGet(self.switch.identifier, self.id, key)

    def write_property(self, key: str, data: bytes, type_: int) -> None:
        checked.DVSQEX_PortDataSet(self.switch.identifier, self.id, key, data, type_)

    def erase_property(self, key: str) -> None:
        checked.DVSQEX_PortDataClear(self.switch.identifier, self.id, key)

    def __str__(self) -> str:
        return self.id

    def __repr__(self) -> str:
        return f"{type(self).__name__}({self.path!r})"

    def __eq__(self, other: object) -> bool:
        return (
            isinstance(other, AnyPort) and type(other) is type(self) and other.owner == self.owner
        )

    def __hash__(self) -> int:
        return hash(self.owner)


class UplinkPort(AnyPort):
    """A port for an uplink, with or without one."""

    _settings = _table.UPLINK_PORT

    blocked: Setting[bool, bool] = Setting(_table.UPLINK_PORT, "blocked")
    vlan: Setting[Vlan, Union[Vlan, int]] = Setting(_table.UPLINK_PORT, "vlan")
    nested_tag: Setting[bool, bool] = Setting(_table.UPLINK_PORT, "nested_tag")

    @property
    def name(self) -> str:
        """What policies call it; its identifier unless it has a name of its own."""
        for name, id_ in zip(*checked.VSDVS_GetSwitchUplinkPorts(self.switch.alias)):
            if id_ == self.id:
                return name
        raise NotFound(f"no uplink port {self.id!r} of switch {self.switch.alias!r}")

    @name.setter
    def name(self, given: str) -> None:
        known = _table.UPLINK_PORT["name"]
        _settings.write(self, known, _settings.parse(known, given, "name"))

    @name.deleter
    def name(self) -> None:
        _settings.clear(self, _table.UPLINK_PORT["name"])

    @property
    def uplink(self) -> Optional[Uplink]:
        """The uplink that is attached to it."""
        for uplink in self.switch.uplinks.values():
            if find_port_of(uplink.name) == self.id:
                return uplink
        return None


class Port(AnyPort):
    """A port of a switch, for a client."""

    _settings = _table.PORT

    vlan: Setting[Vlan, Union[Vlan, int]] = Setting(_table.PORT, "vlan")
    forbids: Setting[Forbid, Union[Forbid, str, Iterable[str]]] = Setting(_table.PORT, "forbids")
    teaming: Setting[Teaming, Teaming] = Setting(_table.PORT, "teaming")
    uplink: Setting[str, str] = Setting(_table.PORT, "uplink")
    mac_learning: Setting[PortMacLearning, PortMacLearning] = Setting(_table.PORT, "mac_learning")
    ethernet_filter: Setting[FrameFilter, FrameFilter] = Setting(_table.PORT, "ethernet_filter")
    transmit_uplink: Setting[bool, bool] = Setting(_table.PORT, "transmit_uplink")
    nested_tag: Setting[bool, bool] = Setting(_table.PORT, "nested_tag")
    blocked: Setting[bool, bool] = Setting(_table.PORT, "blocked")
    connection: Setting[int, int] = Setting(_table.PORT, "connection")
    alias: Setting[str, str] = Setting(_table.PORT, "alias")
    mirrors: Setting[Tuple[Mirror, ...], Sequence[Mirror]] = Setting(_table.PORT, "mirror_sessions")

    def __init__(self, switch: "Switch", id: str, external_id: Optional[str] = None) -> None:
        super().__init__(switch, id)
        self._external_id = external_id

    @property
    def external_id(self) -> Optional[str]:
        """What another system calls it.

        The host finds a port by that name and tells no port's: it is known of a port that was
        added with it or found by it, and None of others.
        """
        if self._external_id is None:
            return None
        try:
            found = checked.DVSQEX_PortGetByExternalId(self.switch.identifier, self._external_id)
        except NotFound:
            return None
        return self._external_id if found.dvPortId == self.id else None

    @property
    def carrier(self) -> Optional[Uplink]:
        """The uplink that carries it now, None if none does."""
        try:
            return Uplink(self.switch, checked.VSQEX_PortGetTeamUplinkHint(self.number))
        except NoUplink:
            return None

    @property
    def link(self) -> LinkState:
        """Whether the side of its client is up."""
        (held,) = struct.unpack("=I", self.read_property(_vs.QEX_NEBPROP_PORT_LINK_STATUS))
        return LinkState(held)

    @property
    def macs(self) -> Tuple[MacEntry, ...]:
        """The addresses in its table."""
        from vswitch import _telling

        return _telling.macs_of_port(self)

    @property
    def groups(self) -> Tuple[Group, ...]:
        """The multicast groups that it has joined."""
        from vswitch import _telling

        return _telling.groups(self)

    @property
    def stats(self) -> PortStats:
        """What it and its MAC learning counted."""
        from vswitch import _telling

        return _telling.port_stats(self)

    def add_mac(
        self, mac: str, *, type: MacType = MacType.STATIC, vlan: int = 0, vni: int = 0
    ) -> None:
        """Puts an address into its table, static or a user's."""
        entry = checked.VSMACEntry(_words.mac(mac), type, False, vlan, vni)
        with self.host._writing(_undo.Macs, self):
            checked.VSQEX_SetPortMACTable(*self.owner, entry)

    def remove_mac(self, mac: str, *, vlan: int = 0) -> None:
        """Takes an address out of its table, whatever its type."""
        known = _words.mac(mac)
        with self.host._writing(_undo.Macs, self):
            self._take_mac(known, vlan)

    def _take_mac(self, mac: str, vlan: int) -> None:
        entry = checked.VSMACEntry(mac, MacType.ALL, False, vlan)
        checked.VSQEX_ClearPortMACTable(*self.owner, entry)

    def mirrored(self, to: "Union[Port, Uplink, MirrorEnd, str]", **settings: Any) -> Mirroring:
        """Mirrors the port for the time of a block; see Mirroring."""
        from vswitch.mirroring import Mirroring

        return Mirroring(self, to, settings)

    def remove(self) -> None:
        """Removes it from its switch."""
        with self.host._writing(_undo.RemovedPort, self):
            self._erase()

    def _erase(self) -> None:
        checked.VSDVS_RemoveDVPort(*self.owner)

    def state(self) -> Dict[str, Words]:
        """The port as documents describe it."""
        return _describing.port_state(self)
