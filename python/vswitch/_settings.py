"""Settings as attributes: one descriptor for each, told by the table of settings.

How a value crosses, a row of CROSSINGS says: through typed calls, or else as the bytes of the
property.
"""

from __future__ import annotations

import typing
from typing import Any, Callable, Dict, Generic, Optional, Tuple, Type, TypeVar, Union, overload

import libvswitch as _vs
from libvswitch import checked
from libvswitch.enums import Forbid, Multicast
from libvswitch.errors import NotFound
from vswitch import _records, _table, words as _words
from vswitch._table import Property
from vswitch._thing import Item, Thing
from vswitch.values import (
    FrameFilter,
    MacLearning,
    PortMacLearning,
    PrivateVlan,
    SettingValue,
    Teaming,
    Vlan,
    Words,
    natural,
    to_words,
)

if typing.TYPE_CHECKING:
    from vswitch.mirroring import Mirror

Got = TypeVar("Got")
Given = TypeVar("Given")


class Crossing(typing.NamedTuple):
    """How a setting crosses. `get`, `set` and `clear` are typed calls, which begin with the names
    of the owner; `read` and `write` take and make the bytes of the property."""

    kind: Optional[Callable[[Any], Any]] = None
    get: Optional[Callable[..., Any]] = None
    set: Optional[Callable[..., None]] = None
    clear: Optional[Callable[..., None]] = None
    read: Optional[Callable[[bytes], Any]] = None
    write: Optional[Callable[[Any], bytes]] = None


def _set_vlan(switch: str, port: str, vlan: Vlan) -> None:
    priority = -1 if vlan.priority is None else vlan.priority
    given = vlan.id, priority, vlan.guest_tagging, vlan.private, _records.ranges_of(vlan)
    checked.VSDVS_SetPortVLANPolicy(switch, port, *given)


def _learning(switch: str) -> MacLearning:
    """Unless it has its own, a switch learns as the host says, which the typed call does not."""
    identifier = checked.DVSAliasToSwitchId(switch)
    try:
        checked.DVSState_GlobalPropLookup(identifier, _vs.VSPROP_SWITCH_MAC_LEARNING)
    except NotFound:
        return _records.learning_from(checked.VSQEX_GetGlobalMACLearningProps())
    return _records.learning_from(checked.VSDVS_GetMACLearning(switch))


def _private_vlans(switch: str) -> Tuple[PrivateVlan, ...]:
    return tuple(
        _records.private_vlan_of(one.primaryVID, one.secondaryVID, one.pvlanType)
        for one in checked.VSDVS_GetPrivateVLANMap(switch)
    )


def _set_private_vlans(switch: str, vlans: Tuple[PrivateVlan, ...]) -> None:
    choices = _table.choices(PrivateVlan._form, "type")
    entries = [
        checked.VSPvlanMapEntry(one.primary, one.secondary, choices[one.type]) for one in vlans
    ]
    checked.VSDVS_SetPrivateVLANMap(switch, entries)


def _teaming(get: Callable[..., Any], set_: Callable[..., None], clear: Any) -> Crossing:
    return Crossing(
        Teaming.from_words,
        lambda *owner: _records.teaming_from(get(*owner)),
        lambda *given: set_(*given[:-1], _records.policy_of(given[-1])),
        clear,
    )


def _mirror(held: Words) -> "Mirror":
    from vswitch.mirroring import Mirror

    return Mirror.from_words(held)


def _mirrors(data: bytes) -> "Tuple[Mirror, ...]":
    from vswitch import _sessions

    return _sessions.mirrors_from(data)


def _mirror_bytes(mirrors: "Tuple[Mirror, ...]") -> bytes:
    from vswitch import _sessions

    return _sessions.mirror_bytes(mirrors)


_MIRRORS = Crossing(_mirror, read=_mirrors, write=_mirror_bytes)

CROSSINGS: Dict[str, Crossing] = {
    _vs.VSPROP_MTU: Crossing(None, checked.VSDVS_GetMTU, checked.VSDVS_SetMTU),
    _vs.VSPROP_SWITCH_TEAMING: _teaming(
        checked.VSDVS_GetTeamingPolicy,
        checked.VSDVS_SetTeamingPolicy,
        checked.VSDVS_ClearTeamingPolicy,
    ),
    _vs.VSPROP_SWITCH_MAC_LEARNING: Crossing(
        MacLearning.from_words,
        _learning,
        lambda switch, value: checked.VSDVS_SetMACLearning(switch, _records.learning_of(value)),
        checked.VSDVS_ClearMACLearning,
    ),
    _vs.VSPROP_MULTICAST_FILTER: Crossing(
        Multicast, checked.VSDVS_GetMcastFilterMode, checked.VSDVS_SetMcastFilterMode
    ),
    _vs.VSPROP_PVLAN_MAP: Crossing(PrivateVlan.from_words, _private_vlans, _set_private_vlans),
    _vs.VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS: _MIRRORS,
    _vs.VSPROP_PORT_VLAN: Crossing(
        Vlan.from_words,
        lambda *owner: _records.vlan_from(checked.VSDVS_GetPortVLANPolicy(*owner)),
        _set_vlan,
        checked.VSDVS_ClearPortVLANPolicy,
    ),
    _vs.VSPROP_PORT_TEAMING_POLICY: _teaming(
        checked.VSDVS_GetPortTeamingPolicy,
        checked.VSDVS_SetPortTeamingPolicy,
        checked.VSDVS_ClearPortTeamingPolicy,
    ),
    _vs.VSPROP_PORT_TEAMING_OVERRIDE: Crossing(
        None,
        checked.VSDVS_GetPortTeamingOverride,
        checked.VSDVS_SetPortTeamingOverride,
        checked.VSDVS_ClearPortTeamingOverride,
    ),
    _vs.VSPROP_PORT_SECURITY: Crossing(
        Forbid,
        lambda *owner: Forbid(checked.VSDVS_GetPortSecurity(*owner).flags),
        lambda switch, port, value: checked.VSDVS_SetPortSecurity(
            switch, port, _vs.VSPropSecurity(flags=value)
        ),
    ),
    _vs.VSPROP_PORT_MAC_MANAGEMENT: Crossing(
        PortMacLearning.from_words,
        read=_records.port_learning_from,
        write=_records.port_learning_bytes,
    ),
    _vs.VSPROP_PORT_EXTRA_ETH_FRP: Crossing(
        FrameFilter.from_words,
        lambda *owner: _records.filter_from(checked.VSDVS_GetExtraEthFilter(*owner)),
        lambda switch, port, value: checked.VSDVS_SetExtraEthFilter(
            switch, port, _records.filter_of(value)
        ),
        checked.VSDVS_ClearExtraEthFilter,
    ),
    _vs.VSPROP_PORT_TX_UPLINK: Crossing(
        None, checked.VSDVS_GetTxUplinkAlways, checked.VSDVS_SetTxUplinkAlways
    ),
    _vs.VSPROP_PORT_VLAN_NESTEDTAG: Crossing(
        None, checked.VSDVS_GetPortNestedVLANTagging, checked.VSDVS_SetPortNestedVLANTagging
    ),
    _vs.VSPROP_PORT_MIRROR_SESSIONS: _MIRRORS,
}

_PLAIN = Crossing()


def crossing(known: Property) -> Crossing:
    return CROSSINGS.get(known.key, _PLAIN)


def value_of(known: Property, held: Words) -> Any:
    """The value that checked words say."""
    kind = crossing(known).kind
    if known.form["form"] == "record" and kind:
        # A value may be said by one of its members alone.
        return kind(_words.read(known.form, held, known.name))
    return natural(known.form, held, kind)


def parse(known: Property, given: object, path: str) -> Any:
    """The value that words or values say; DocumentError if they say none."""
    held = to_words(known.form, given, crossing(known).kind)
    return value_of(known, _words.read(known.form, held, path))


def words_of(known: Property, value: Any) -> Words:
    """A value in the words of documents."""
    return to_words(known.form, value, crossing(known).kind)


def read(thing: Thing, known: Property, item: Optional[Item] = None) -> Any:
    """The value of a setting, its own or the default; of the item, where that is at hand."""
    how = crossing(known)
    if how.get is not None:
        return how.get(*thing.owner)
    try:
        data = item.data if item is not None else thing.read_property(known.key)
    except NotFound:
        if not thing.exists():
            raise
        return value_of(known, _words.read(known.form, known.default, known.name))
    return how.read(data) if how.read is not None else _records.plain_from(known, data)


def write(thing: Thing, known: Property, value: Any) -> None:
    """Sets a setting in one call, so that nobody sees half of it."""
    how = crossing(known)
    with thing.host._writing_properties(thing, known.keys):
        if how.set is not None:
            how.set(*thing.owner, value)
            return
        data = how.write(value) if how.write is not None else _records.plain_bytes(known, value)
        thing.write_property(known.key, data, known.type)


def clear(thing: Thing, known: Property) -> None:
    """Clears a setting, with all that is said as a part of it, in one call."""
    held = thing.properties()
    if not any(key in held for key in known.keys):
        return
    how = crossing(known)
    with thing.host._writing_properties(thing, known.keys):
        if how.clear is not None:
            how.clear(*thing.owner)
        else:
            thing.erase_property(known.key)


class Setting(Generic[Got, Given]):
    """A setting as an attribute: its value, set by assignment, cleared by `del`."""

    def __init__(self, of: Dict[str, Property], name: str) -> None:
        self.known = of[name]
        self.__doc__ = self.known.words

    @overload
    def __get__(self, thing: None, owner: Type[Thing]) -> "Setting[Got, Given]":
        ...

    @overload
    def __get__(self, thing: Thing, owner: Type[Thing]) -> Got:
        ...

    def __get__(
        self, thing: Optional[Thing], owner: Type[Thing]
    ) -> "Union[Got, Setting[Got, Given]]":
        if thing is None:
            return self
        value: Got = read(thing, self.known)
        return value

    def __set__(self, thing: Thing, given: Given) -> None:
        write(thing, self.known, parse(self.known, given, self.known.name))

    def __delete__(self, thing: Thing) -> None:
        clear(thing, self.known)


__all__ = ["CROSSINGS", "Setting", "SettingValue", "clear", "parse", "read", "words_of", "write"]
