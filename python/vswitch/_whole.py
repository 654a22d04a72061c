"""Documents that say all of a host: what they do not name is to go.

What a document wants is completed by what there is now, each thing of it by its name.
"""

import dataclasses
from typing import Callable, Dict, Tuple, TypeVar

from vswitch import _table
from vswitch.documents import HostWish, PortWish, SwitchWish, ThingWish, UplinkPortWish, Wish
from vswitch.words import ABSENT

__all__ = ["completed"]

W = TypeVar("W", bound=Wish)
T = TypeVar("T", bound=ThingWish)


def completed(wanted: HostWish, now: HostWish) -> HostWish:
    """The wish, with all switches and what they have. A host always has all settings of its own."""
    switches = _each(wanted.switches, now.switches, "alias", _switch)
    return dataclasses.replace(wanted, switches=switches)


def _each(
    wanted: Tuple[W, ...], now: Tuple[W, ...], key: str, complete: Callable[[W, W], W]
) -> Tuple[W, ...]:
    """Things by the name that they have in `key`."""
    there = {getattr(one, key): one for one in now}
    found = []
    for one in wanted:
        same = there.pop(getattr(one, key), None)
        found.append(one if same is None or one.absent else complete(one, same))
    found += [type(one)(one.path, True, **{key: name}) for name, one in there.items()]
    return tuple(found)


def _as_wanted(wanted: W, now: W) -> W:
    return wanted


def _switch(wanted: SwitchWish, now: SwitchWish) -> SwitchWish:
    named = {one.uplink for one in wanted.uplink_ports}
    uplinks = tuple(one for one in now.uplinks if one.name not in named)
    return dataclasses.replace(
        _thing(wanted, now, _table.SWITCH),
        host_properties=_each(wanted.host_properties, now.host_properties, "key", _as_wanted),
        uplinks=_each(wanted.uplinks, uplinks, "name", _as_wanted),
        uplink_ports=_each(wanted.uplink_ports, now.uplink_ports, "id", _uplink_port),
        ports=_each(wanted.ports, now.ports, "id", _port),
        whole=True,
    )


def _uplink_port(wanted: UplinkPortWish, now: UplinkPortWish) -> UplinkPortWish:
    return _thing(wanted, now, _table.UPLINK_PORT)


def _port(wanted: PortWish, now: PortWish) -> PortWish:
    named = {(one.mac, one.vlan) for one in wanted.macs}
    gone = [
        dataclasses.replace(one, absent=True)
        for one in now.macs
        if (one.mac, one.vlan) not in named
    ]
    return dataclasses.replace(_thing(wanted, now, _table.PORT), macs=(*wanted.macs, *gone))


def _thing(wanted: T, now: T, known: Dict[str, _table.Property]) -> T:
    """Settings and properties; one may say the bytes of the other."""
    by_bytes = {one.key for one in wanted.properties}
    by_name = {key for name in wanted.settings for key in known[name].keys}
    cleared = {
        name: ABSENT
        for name in now.settings
        if name not in wanted.settings and known[name].key not in by_bytes
    }
    properties = tuple(one for one in now.properties if one.key not in by_name)
    return dataclasses.replace(
        wanted,
        settings={**wanted.settings, **cleared},
        properties=_each(wanted.properties, properties, "key", _as_wanted),
    )
