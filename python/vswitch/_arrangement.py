"""The uplink ports of a switch: as they are, and arranged anew, each with its name, its uplink and
its properties.

The host attaches an uplink to the first port without one, and takes an uplink with its port.
"""

from __future__ import annotations

import typing
from typing import Dict, List, Optional

from libvswitch import checked
from vswitch._thing import Item, own_properties, restore_all

if typing.TYPE_CHECKING:
    from vswitch.switch import Switch


class Arranged(typing.NamedTuple):
    """What there is of an uplink port."""

    name: str
    uplink: Optional[str]
    properties: Dict[str, Item]


Arrangement = Dict[str, Arranged]
"""Uplink ports by their identifiers."""


def arrangement(switch: "Switch") -> Arrangement:
    told = checked.VSDVS_GetSwitchUplinkPorts(switch.alias)
    uplinks = switch.uplinks if switch.running else ()
    at = {checked.VSQEX_GetUplinkDVPortID(name): name for name in uplinks}
    return {
        id_: Arranged(name, at.get(id_), own_properties(switch.uplink_ports[id_]))
        for name, id_ in zip(told.names, told.ids)
    }


def vacant(arranged: Arrangement) -> List[str]:
    """Those without an uplink, the next to get one first."""
    return [id_ for id_, one in arranged.items() if one.uplink is None]


def arrange(switch: "Switch", wanted: Arrangement) -> None:
    """Makes the uplink ports of a switch those, and nothing of what is as wanted is touched."""
    if arrangement(switch) == wanted:
        return
    _detach(switch, wanted)
    _attach(switch, wanted)
    names = [one.name for one in wanted.values()]
    checked.VSDVS_SetSwitchUplinkPorts(switch.alias, names, list(wanted))
    for id_, one in wanted.items():
        restore_all(switch.uplink_ports[id_], one.properties)


def _detach(switch: "Switch", wanted: Arrangement) -> None:
    """What is not to be there, or elsewhere."""
    places = {one.uplink: id_ for id_, one in wanted.items()}
    for id_, one in arrangement(switch).items():
        if one.uplink is not None and places.get(one.uplink) != id_:
            checked.VSDVS_RemoveSwitchUplinkPort(switch.alias, one.uplink)


def _attach(switch: "Switch", wanted: Arrangement) -> None:
    """No port without an uplink is there meanwhile, but the right one."""
    here = [id_ for id_, one in arrangement(switch).items() if one.uplink is not None]
    for id_, one in wanted.items():
        if one.uplink is not None and id_ not in here:
            here.append(id_)
            # Names may be those of other ports meanwhile: identifiers cannot.
            checked.VSDVS_SetSwitchUplinkPorts(switch.alias, here, here)
            checked.VSDVS_AddSwitchUplinkPort(switch.alias, one.uplink)
