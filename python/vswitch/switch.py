"""Switches of the host."""

from __future__ import annotations

import typing
from typing import Dict, Iterator, Mapping, Optional, Sequence, Tuple, Union

from libvswitch import checked
from libvswitch.enums import Multicast
from libvswitch.errors import NotFound
from vswitch import _describing, _table, _undo, words as _words
from vswitch._arrangement import Arrangement, arrange
from vswitch._mapping import Live, sought
from vswitch._settings import Setting
from vswitch._thing import Item, Thing
from vswitch.port import Port, UplinkPort
from vswitch.uplink import Uplink
from vswitch.values import MacLearning, PrivateVlan, Teaming, Words

if typing.TYPE_CHECKING:
    from vswitch.told import Lag, MacEntry, MirrorStats, SwitchStats
    from vswitch.host import Host
    from vswitch.mirroring import Mirror

_SESSION = _table.PORT["mirror_sessions"].form["element"]


class HostPart(Thing):
    """The host's part of a switch, which has properties and no settings."""

    def __init__(self, switch: "Switch") -> None:
        self.switch = switch
        self.host = switch.host

    @property
    def path(self) -> str:
        return f"{self.switch.alias}/host"

    @property
    def owner(self) -> Tuple[str, ...]:
        return self.switch.owner

    def exists(self) -> bool:
        return self.switch.exists()

    def properties(self) -> Dict[str, Item]:
        walk = checked.DVSState_HostPropForEach(self.switch._handle())
        return {one.name: one for one in walk}

    def read_property(self, key: str) -> bytes:
        return checked.DVSQEX_HostPropGet(self.switch.identifier, key)

    def write_property(self, key: str, data: bytes, type_: int) -> None:
        checked.DVSQEX_HostPropSet(self.switch.identifier, key, data, type_)

    def erase_property(self, key: str) -> None:
        checked.DVSQEX_HostPropClear(self.switch.identifier, key)


class Switch(Thing):
    """A switch of the host, by its alias."""

    _settings = _table.SWITCH

    mtu: Setting[int, int] = Setting(_table.SWITCH, "mtu")
    teaming: Setting[Teaming, Teaming] = Setting(_table.SWITCH, "teaming")
    mac_learning: Setting[MacLearning, MacLearning] = Setting(_table.SWITCH, "mac_learning")
    multicast: Setting[Multicast, Union[Multicast, str]] = Setting(_table.SWITCH, "multicast")
    private_vlans: Setting[Tuple[PrivateVlan, ...], Sequence[PrivateVlan]] = Setting(
        _table.SWITCH, "private_vlans"
    )
    disabled: Setting[bool, bool] = Setting(_table.SWITCH, "disabled")
    uplink_mirror_sessions: Setting[Tuple[Mirror, ...], Sequence[Mirror]] = Setting(
        _table.SWITCH, "uplink_mirror_sessions"
    )

    def __init__(self, host: "Host", alias: str) -> None:
        self.host = host
        self.alias = alias

    @property
    def path(self) -> str:
        return self.alias

    @property
    def owner(self) -> Tuple[str, ...]:
        return (self.alias,)

    @property
    def identifier(self) -> str:
        """The identifier of the distributed switch."""
        return checked.DVSAliasToSwitchId(self.alias)

    @property
    def portset(self) -> str:
        """The name of its set of ports on this host."""
        return checked.DVSAliasToPortsetName(self.alias)

    @property
    def version(self) -> int:
        """The version of the distributed switch, fixed once it exists."""
        return checked.DVS_Version(self._handle())

    @property
    def max_ports(self) -> int:
        """How many ports for clients it has room for."""
        return checked.DVS_GetMaxPorts(self._handle())

    @property
    def running(self) -> bool:
        """Whether it runs on this host. What does not run has no uplinks, addresses or counters."""
        try:
            checked.VSQEX_GetVSInfo(self.alias)
        except NotFound:
            self._handle()
            return False
        return True

    @running.setter
    def running(self, runs: bool) -> None:
        _words.flag(runs, "running")
        if runs is not self.running:
            with self.host._writing(_undo.Running, self):
                self._run(runs)

    def _run(self, runs: bool) -> None:
        call = checked.DVSQEX_SwitchAssociate if runs else checked.DVSQEX_SwitchDissociate
        call(self.identifier)

    @property
    def host_part(self) -> HostPart:
        """The host's part of it, for properties without a name."""
        return HostPart(self)

    # What it has

    @property
    def ports(self) -> "Mapping[str, Port]":
        """Its ports for clients, by their identifiers."""
        shown = f"ports of {self.alias}"
        return Live(self._port_ids, self._get_port, shown, lambda id_: Port(self, id_))

    def _port_ids(self) -> Iterator[str]:
        for_uplinks = set(self._uplink_port_ids())
        for handle in checked.DVSState_PortForEach(self._handle()):
            id_ = checked.DVS_PortId(handle)
            if id_ not in for_uplinks:
                yield id_

    def _get_port(self, id_: str) -> Port:
        checked.DVSQEX_PortFind(self.identifier, id_)
        if id_ in self._uplink_port_ids():
            raise NotFound(f"{id_!r} of switch {self.alias!r} is an uplink port")
        return Port(self, id_)

    def find_port(self, external_id: str) -> Port:
        """The port that another system calls so."""
        name = sought(external_id, f"ports of {self.alias} that another system knows")
        found = checked.DVSQEX_PortGetByExternalId(self.identifier, name)
        return Port(self, found.dvPortId, external_id)

    @property
    def uplink_ports(self) -> "Mapping[str, UplinkPort]":
        """Its ports for uplinks, by their identifiers."""
        shown = f"uplink ports of {self.alias}"
        known = self._uplink_port_ids
        return Live(known, self._get_uplink_port, shown, lambda id_: UplinkPort(self, id_))

    def _uplink_port_ids(self) -> Tuple[str, ...]:
        return checked.VSDVS_GetSwitchUplinkPorts(self.alias).ids

    def _get_uplink_port(self, id_: str) -> UplinkPort:
        known = self._uplink_port_ids()
        if id_ not in known:
            there = f"it has {', '.join(known)}" if known else "it has none"
            raise NotFound(f"no uplink port {id_!r} of switch {self.alias!r} ({there})")
        return UplinkPort(self, id_)

    @property
    def uplinks(self) -> "Mapping[str, Uplink]":
        """Its uplinks, by their names."""
        shown = f"uplinks of {self.alias}"
        return Live(self._uplink_names, self._get_uplink, shown, lambda name: Uplink(self, name))

    def _uplink_names(self) -> Iterator[str]:
        return (one.name for one in checked.VSQEX_GetUplinks(self.alias))

    def _get_uplink(self, name: str) -> Uplink:
        checked.VSQEX_GetUplinkLinkState(self.alias, name)
        return Uplink(self, name)

    @property
    def lags(self) -> Tuple[Lag, ...]:
        """Its link-aggregation groups."""
        from vswitch import _telling

        return _telling.lags(self)

    @property
    def macs(self) -> Tuple[MacEntry, ...]:
        """The addresses that it knows: beyond its uplinks, and of its ports."""
        from vswitch import _telling

        ports = self.ports.values()
        return _telling.macs_beyond(self) + tuple(entry for port in ports for entry in port.macs)

    @property
    def mirrors(self) -> "Mapping[str, MirrorStats]":
        """What its running mirror sessions counted, by their identifiers."""
        from vswitch import _telling

        return Live(
            lambda: checked.VSQEX_GetDVMirrorSessionIDs(self.alias),
            lambda sid: _telling.mirror_stats(self.alias, sid),
            f"running mirror sessions of {self.alias}",
            most_bytes=_table.get_member(_SESSION, "sid")["most_bytes"],
        )

    @property
    def stats(self) -> SwitchStats:
        """What its team counted."""
        from vswitch import _telling

        return _telling.switch_stats(self)

    def carriers(self) -> Dict[str, Optional[Uplink]]:
        """The uplink that carries each port now, None where none does."""
        return {id_: port.carrier for id_, port in self.ports.items()}

    # What can be done with it

    def add_port(
        self,
        id: str,
        *,
        external_id: Optional[str] = None,
        connection: Optional[int] = None,
    ) -> Port:
        """Adds a port for a client."""
        port = Port(self, id, external_id)
        if external_id is not None and connection is not None:
            with self.host._whole():
                self.add_port(id, external_id=external_id)
                port.connection = connection
            return port
        with self.host._writing(_undo.Added, port):
            if external_id is not None:
                checked.VSDVS_AddOpaqueDVPort(self.alias, id, external_id)
            elif connection is not None:
                checked.VSDVS_AddDVPort(self.alias, id, connection)
            else:
                checked.DVSQEX_PortAdd(self.identifier, id)
        return port

    def add_uplink(self, name: str) -> Uplink:
        """Attaches an uplink of the host, to the first uplink port without one or to a new one."""
        with self.host._writing(_undo.UplinkPorts, self):
            checked.VSDVS_AddSwitchUplinkPort(self.alias, name)
        return Uplink(self, name)

    def set_uplink_ports(self, names: "Mapping[str, str]") -> None:
        """Makes its ports for uplinks those with these identifiers, each with its name.

        A port that it has keeps its uplink, a new one has none, and what is left out goes.
        """
        with self.host._writing(_undo.UplinkPorts, self):
            checked.VSDVS_SetSwitchUplinkPorts(self.alias, list(names.values()), list(names))

    def _arrange_uplink_ports(self, wanted: Arrangement) -> None:
        """Makes them those, each with its name, its uplink and its properties."""
        with self.host._writing(_undo.UplinkPorts, self):
            arrange(self, wanted)

    def remove(self) -> None:
        """Removes it from the host, with its ports."""
        with self.host._writing(_undo.RemovedSwitch, self):
            self._erase()

    def _erase(self) -> None:
        checked.VSDVS_DestroyVSwitch(self.alias)

    def state(self) -> Dict[str, Words]:
        """The switch as documents describe it."""
        return _describing.switch_state(self)

    # Its properties

    def _handle(self) -> checked.DVSwitchHandle:
        handle = checked.DVSState_SwitchFindByAlias(self.alias)
        if handle is None:
            # A call that looks for the switch has the words for why there is none.
            checked.DVSAliasToSwitchId(self.alias)
            raise NotFound(f"no switch {self.alias!r}")
        return handle

    def exists(self) -> bool:
        return checked.DVSState_SwitchFindByAlias(self.alias) is not None

    def properties(self) -> Dict[str, Item]:
        return {one.name: one for one in checked.DVSState_GlobalPropForEach(self._handle())}

    def read_property(self, key: str) -> bytes:
        return checked.DVSQEX_GlobalPropGet(self.identifier, key)

    def write_property(self, key: str, data: bytes, type_: int) -> None:
        checked.DVSQEX_GlobalPropSet(self.identifier, key, data, type_)

    def erase_property(self, key: str) -> None:
        checked.DVSQEX_GlobalPropClear(self.identifier, key)

    def __str__(self) -> str:
        return self.alias

    def __repr__(self) -> str:
        return f"Switch({self.alias!r})"

    def __eq__(self, other: object) -> bool:
        return isinstance(other, Switch) and other.alias == self.alias

    def __hash__(self) -> int:
        return hash(self.alias)
