"""The bytes of properties that are at hand: what they say, and which bytes a value has.

What is read is believed only where it says no more than words can: a number without a word, a bit
without one, a text that does not end is a ValueError.
"""

from __future__ import annotations

import struct
import typing
from typing import Any, Callable, Dict, List, Mapping, Tuple

import libvswitch as _vs
from libvswitch import _pointers
from libvswitch.enums import Forbid
from vswitch import _records, _sessions, _settings, _table
from vswitch._properties import LONGEST_KEY
from vswitch._table import Property
from vswitch.values import MacLearning, PrivateVlan, Teaming, Vlan

__all__ = ["bytes_of", "check", "value_of"]

Held = Mapping[str, bytes]
"""Properties by their keys."""

_SIZES = _pointers.record_sizes()
_WORD = struct.Struct("=I")
_RANGE = struct.Struct("=HH")
_ENTRY = struct.Struct("=HHI")
_VLAN_FLAGS = (
    _vs.VSPORT_VLAN_GUEST_TAGGING | _vs.VSPORT_VLAN_PVLAN_ENABLED | _vs.VSPORT_VLAN_SET_PRIORITY
)


class _Form(typing.NamedTuple):
    """How a value lies in the bytes of a property."""

    read: Callable[[bytes], Any]
    write: Callable[[Any], bytes]


def _filled(record: Any, data: bytes) -> Any:
    _records._fill(record, data)
    return record


def _bytes(record: Any) -> bytes:
    return _pointers.read_memory(record, 0, _SIZES[type(record).__name__])


def _each(form: struct.Struct, data: bytes) -> List[Tuple[Any, ...]]:
    if len(data) % form.size:
        raise ValueError(f"{len(data)} bytes are no row of {form.size} each")
    return list(form.iter_unpack(data))


def _teaming(data: bytes) -> Teaming:
    policy = _filled(_vs.VSTeamPolicy(), data)
    most = _vs.QEX_TEAM_MAX_UPLINKS
    if policy.numActive + policy.numStandby > most:
        raise ValueError(f"a teaming has {most} uplinks at most")
    return _records.teaming_from(policy)


def _learning(data: bytes) -> MacLearning:
    held = _filled(_vs.VSMACLearning(), data)
    if held.reserved:
        raise ValueError("reserved bits are set")
    return _records.learning_from(held)


def _filter(data: bytes) -> Any:
    held = _filled(_vs.VSExtraEthFilter(), data)
    most = _vs.VSWITCH_ETH_MAX_EXACT_MULTICAST_ADDRS
    if held.numMulticastAddrs > most:
        raise ValueError(f"a filter has {most} addresses at most")
    return _records.filter_from(held)


def _private_vlans(data: bytes) -> Tuple[PrivateVlan, ...]:
    return tuple(_records.private_vlan_of(*entry) for entry in _each(_ENTRY, data))


def _private_vlan_bytes(vlans: Tuple[PrivateVlan, ...]) -> bytes:
    numbers = _table.choices(PrivateVlan._form, "type")
    return b"".join(_ENTRY.pack(one.primary, one.secondary, numbers[one.type]) for one in vlans)


def _vlan(data: bytes) -> Vlan:
    """Without its priority, which is another property."""
    size = _SIZES["VSPortVlanPolicy"]
    policy = _filled(_vs.VSPortVlanPolicy(), data[:size])
    ranges = _each(_RANGE, data[size:])
    if policy.flags & ~_VLAN_FLAGS or policy.numRanges != len(ranges):
        raise ValueError("no VLANs of a port")
    return _records.vlan_of(policy, ranges)


def _vlan_bytes(vlan: Vlan) -> bytes:
    ranges = [(one.minVID, one.maxVID) for one in _records.ranges_of(vlan)]
    flags = _vs.VSPORT_VLAN_GUEST_TAGGING if vlan.guest_tagging else 0
    flags |= _vs.VSPORT_VLAN_PVLAN_ENABLED if vlan.private else 0
    flags |= _vs.VSPORT_VLAN_SET_PRIORITY if vlan.priority is not None else 0
    policy = _vs.VSPortVlanPolicy(flags=flags, vlanID=vlan.id, numRanges=len(ranges))
    return _bytes(policy) + b"".join(_RANGE.pack(*one) for one in ranges)


_FORMS: Dict[str, _Form] = {
    _vs.VSPROP_SWITCH_TEAMING: _Form(_teaming, lambda value: _bytes(_records.policy_of(value))),
    _vs.VSPROP_SWITCH_MAC_LEARNING: _Form(
        _learning, lambda value: _bytes(_records.learning_of(value))
    ),
    _vs.VSPROP_PVLAN_MAP: _Form(_private_vlans, _private_vlan_bytes),
    _vs.VSPROP_PORT_VLAN: _Form(_vlan, _vlan_bytes),
    _vs.VSPROP_PORT_SECURITY: _Form(
        lambda data: Forbid(*_WORD.unpack(data)), lambda value: _WORD.pack(value)
    ),
    _vs.VSPROP_PORT_MAC_MANAGEMENT: _Form(
        _records.port_learning_from, _records.port_learning_bytes
    ),
    _vs.VSPROP_PORT_EXTRA_ETH_FRP: _Form(_filter, lambda value: _bytes(_records.filter_of(value))),
    _vs.VSPROP_PORT_MIRROR_SESSIONS: _Form(_sessions.known_mirrors_from, _sessions.mirror_bytes),
}
_FORMS[_vs.VSPROP_PORT_TEAMING_POLICY] = _FORMS[_vs.VSPROP_SWITCH_TEAMING]
_FORMS[_vs.VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS] = _FORMS[_vs.VSPROP_PORT_MIRROR_SESSIONS]


def _form_of(known: Property) -> _Form:
    return _FORMS.get(known.key) or _Form(
        lambda data: _plain(known, data), lambda value: _records.plain_bytes(known, value)
    )


def _plain(known: Property, data: bytes) -> Any:
    kind = known.form["form"]
    _check_text(known.form, data)
    value = _records.plain_from(known, data)
    if kind == "boolean" and data != _records.plain_bytes(known, value):
        raise ValueError("neither true nor false")
    of = _settings.crossing(known).kind
    return of(value) if of is not None else value


def value_of(known: Property, held: Held) -> Any:
    """What the properties of a setting say; ValueError where no words can."""
    try:
        value = _form_of(known).read(held[known.key])
        for key in known.companions:
            if key in held:
                value = _with_priority(value, held[key])
    except struct.error as error:
        raise ValueError(str(error)) from None
    if _settings.parse(known, _settings.words_of(known, value), known.name) != value:
        raise ValueError(f"no words say {value!r}")
    return value


def _with_priority(vlan: Vlan, data: bytes) -> Vlan:
    """The one setting of two properties."""
    held = {name: getattr(vlan, name) for name in ("id", "trunk", "private", "guest_tagging")}
    return Vlan.known(priority=_WORD.unpack(data)[0], **held)


def bytes_of(known: Property, value: Any) -> Dict[str, bytes]:
    """The properties of a setting that has that value."""
    made = {known.key: _form_of(known).write(value)}
    for key in known.companions:
        if value.priority is not None:
            made[key] = _WORD.pack(value.priority)
    return made


def check(scope: str, key: str, held: Held) -> None:
    """ValueError for a property that no document gives a thing of that scope, a "switch", the
    "host"'s part of one or a "port"; of keys without a meaning any bytes do."""
    known = _table.BY_KEY.get(key)
    if not 0 < len(key.encode()) <= LONGEST_KEY:
        raise ValueError(f"a key has {LONGEST_KEY} bytes at most")
    if known is None:
        return
    if known.scope != scope:
        raise ValueError(f"a {known.scope} has it")
    kind = known.form["form"]
    if kind == "text":
        _check_text(known.form, held[key])
    elif kind != "none":
        value_of(known, held)


def _check_text(form: _table.Form, data: bytes) -> None:
    """Documents may give texts that UTF-8 has no characters for, byte for byte."""
    if form["form"] == "text":
        if not data or data.find(b"\0") != len(data) - 1:
            raise ValueError("a text ends with its only NUL")
        if len(data) > form["most_bytes"] + 1:
            raise ValueError(f"a text has {form['most_bytes']} bytes at most")
