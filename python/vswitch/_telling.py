"""From what calls return to the values that objects tell."""

import struct
import typing
from typing import Dict, Optional, Tuple

import libvswitch as _vs
from libvswitch import checked
from libvswitch.enums import MacType, Multicast
from libvswitch.errors import NotFound
from vswitch.told import Group, Lag, MacEntry, MirrorStats, PortStats, SwitchStats

if typing.TYPE_CHECKING:
    from vswitch.port import Port
    from vswitch.switch import Switch

_SOURCE_MODES = {
    _vs.VS_MCAST_SRC_IP_FILTER_MODE_NONE: "none",
    _vs.VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE: "include",
    _vs.VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE: "exclude",
}
GROUP_FORMS = (Multicast.LEGACY, Multicast.IGMP, Multicast.MLD)
_COUNTERS = tuple(PortStats.__dataclass_fields__)[:16]


def macs_of_port(port: "Port") -> Tuple[MacEntry, ...]:
    table = checked.VSQEX_GetPortMACTable(*port.owner, MacType.ALL)
    return tuple(_mac_entry(one, port.switch.alias, port.id) for one in table)


def macs_beyond(switch: "Switch") -> Tuple[MacEntry, ...]:
    """The addresses beyond the uplinks of a switch."""
    table = checked.VSQEX_GetTeamMACTable(switch.alias, MacType.ALL)
    return tuple(_mac_entry(one, switch.alias, None) for one in table)


def _mac_entry(told: checked.VSMACEntry, switch: str, port: Optional[str]) -> MacEntry:
    where = told.vid, told.elapsed, switch, port, told.vni
    return MacEntry(told.macAddress, told.macAddrType, *where, told.aging)


def lags(switch: "Switch") -> Tuple[Lag, ...]:
    table = checked.VSQEX_GetLAGTable(switch.alias)
    return tuple(Lag(one.name, one.state, one.uplinkNames) for one in table)


def groups(port: "Port") -> Tuple[Group, ...]:
    alias, number = port.switch.alias, port.number
    return tuple(
        group
        for mode in GROUP_FORMS
        for address in checked.VSQEX_GetMcastFilters(alias, number, mode)
        for group in group_of(alias, number, mode, address)
    )


def group_of(switch: str, number: int, mode: Multicast, address: str) -> Tuple[Group, ...]:
    """The group of that address, none if the port has left it since."""
    try:
        told = checked.VSQEX_GetMcastFilterStats(switch, number, mode, address)
    except NotFound:
        return ()
    source_mode = _SOURCE_MODES.get(told.srcIPFilterMode, str(told.srcIPFilterMode))
    return (Group(address, told.version, source_mode, told.entries, told.vni),)


def port_stats(port: "Port") -> PortStats:
    learned = checked.VSQEX_GetPortMACLearningStats(*port.owner).asdict()
    counted = counted_in(port.read_property(_vs.QEX_NEBPROP_PORT_STATISTICS))
    return PortStats(**counted, **learned)


def counted_in(statistics: bytes) -> Dict[str, int]:
    """The counters that the property has."""
    return dict(zip(_COUNTERS, struct.unpack(f"={len(_COUNTERS)}Q", statistics)))


def switch_stats(switch: "Switch") -> SwitchStats:
    rarp = checked.VSQEX_GetRARPStats(switch.alias).asdict()
    team = checked.VSQEX_GetServicePortTeamingStats(switch.alias).asdict()
    return SwitchStats(**rarp, **team)


def mirror_stats(switch: str, sid: str) -> MirrorStats:
    told = checked.VSQEX_GetDVMirrorSessionStats(switch, sid).asdict()
    return MirrorStats(**{name: told[name] for name in MirrorStats.__dataclass_fields__})
