"""Between the records of the calls and the values of this package, in both directions."""

from __future__ import annotations

import struct
from typing import Any, Iterable, List, Optional, Sequence, Union

import libvswitch as _vs
from libvswitch import _pointers, checked
from libvswitch.enums import Balance, Criteria, EthernetFilter, TeamFlags
from vswitch import _table
from vswitch.values import FrameFilter, MacLearning, PortMacLearning, PrivateVlan, Teaming, Vlan

_SIZES = _pointers.record_sizes()


def teaming_from(policy: _vs.VSTeamPolicy) -> Teaming:
    active, standby = policy.numActive, policy.numStandby
    names = [policy.uplinkPortName[at] for at in range(active + standby)]
    return Teaming.known(
        balance=Balance(policy.loadBalance),
        active=tuple(names[:active]),
        standby=tuple(names[active:]),
        flags=TeamFlags(policy.flags),
        criteria=Criteria(policy.linkCriteria),
        speed=policy.speed,
        full_duplex=bool(policy.fullDuplex),
        error_percent=policy.percentError,
    )


def policy_of(teaming: Teaming) -> _vs.VSTeamPolicy:
    policy = _vs.VSTeamPolicy(
        loadBalance=teaming.balance,
        linkCriteria=teaming.criteria,
        percentError=teaming.error_percent,
        fullDuplex=int(teaming.full_duplex),
        speed=teaming.speed,
        flags=teaming.flags,
        numActive=len(teaming.active),
        numStandby=len(teaming.standby),
    )
    for at, name in enumerate(teaming.active + teaming.standby):
        policy.uplinkPortName[at] = name
    return policy


def vlan_from(told: checked.VSDVS_GetPortVLANPolicyResult) -> Vlan:
    policy, priority = told
    ranges = [(one.minVID, one.maxVID) for one in policy.vidRanges]
    return vlan_of(policy, ranges, None if priority < 0 else priority)


def vlan_of(
    policy: Union[_vs.VSPortVlanPolicy, checked.VSPortVlanPolicy],
    ranges: Iterable[Sequence[int]],
    priority: Optional[int] = None,
) -> Vlan:
    trunk = ",".join(str(first) if first == last else f"{first}-{last}" for first, last in ranges)
    return Vlan.known(
        id=policy.vlanID,
        trunk=trunk or None,
        priority=priority,
        private=bool(policy.flags & _vs.VSPORT_VLAN_PVLAN_ENABLED),
        guest_tagging=bool(policy.flags & _vs.VSPORT_VLAN_GUEST_TAGGING),
    )


def ranges_of(vlan: Vlan) -> List[checked.qex_NEBPortVIDRange]:
    found = []
    for part in (vlan.trunk or "").split(","):
        if part:
            first, _, last = part.partition("-")
            found.append(checked.qex_NEBPortVIDRange(int(first), int(last or first)))
    return found


def private_vlan_of(primary: int, secondary: int, kind: int) -> PrivateVlan:
    word = _table.word_for(_table.choices(PrivateVlan._form, "type"), kind)
    return PrivateVlan.known(primary=primary, secondary=secondary, type=word)


def learning_from(told: Any) -> MacLearning:
    """From what a switch or the host tells of its learning."""
    return MacLearning.known(
        aging_time=told.agingTime, limit=told.macLimit, learn_static=bool(told.learnStatic)
    )


def learning_of(learning: MacLearning) -> _vs.VSMACLearning:
    return _vs.VSMACLearning(
        agingTime=learning.aging_time,
        learnStatic=int(learning.learn_static),
        macLimit=learning.limit,
    )


def port_learning_from(data: bytes) -> PortMacLearning:
    held = _vs.VSPMACManagement()
    _fill(held, data)
    inner = held.portMACLearning
    policies = _table.choices(PortMacLearning._form, "limit_policy")
    return PortMacLearning.known(
        learning=inner.learning,
        flooding=inner.flooding,
        limit=inner.macLimit,
        limit_policy=_table.word_for(policies, inner.macLimitPolicy),
        mac_change=held.macChangeAllowed,
    )


def port_learning_bytes(learning: PortMacLearning) -> bytes:
    choices = _table.choices(PortMacLearning._form, "limit_policy")
    held = _vs.VSPMACManagement(macChangeAllowed=learning.mac_change)
    held.portMACLearning.learning = learning.learning
    held.portMACLearning.flooding = learning.flooding
    held.portMACLearning.macLimit = learning.limit
    held.portMACLearning.macLimitPolicy = choices[learning.limit_policy]
    return _pointers.read_memory(held, 0, _SIZES["VSPMACManagement"])


def _fill(record: Any, data: bytes) -> None:
    size = _SIZES[type(record).__name__]
    if len(data) != size:
        raise ValueError(f"{type(record).__name__} has {size} bytes, not {len(data)}")
    _pointers.write_memory(record, 0, data)


def filter_from(told: _vs.VSExtraEthFilter) -> FrameFilter:
    addresses = [told.multicastAddrs[at] for at in range(told.numMulticastAddrs)]
    return FrameFilter.known(
        frames=EthernetFilter(told.flags), addresses=tuple(one.hex(":") for one in addresses)
    )


def filter_of(frames: FrameFilter) -> _vs.VSExtraEthFilter:
    made = _vs.VSExtraEthFilter(flags=frames.frames, numMulticastAddrs=len(frames.addresses))
    for at, address in enumerate(frames.addresses):
        made.multicastAddrs[at] = bytes.fromhex(address.replace(":", ""))
    return made


# Numbers and texts, as they lie in a property

_NUMBERS = {"1 byte": "=B", "2 bytes": "=H", "4 bytes": "=I"}


def plain_from(known: _table.Property, data: bytes) -> Any:
    if known.form["form"] == "text":
        return data.split(b"\0", 1)[0].decode("utf-8", "surrogateescape")
    (number,) = struct.unpack(_NUMBERS[known.bytes], data)
    return bool(number) if known.form["form"] == "boolean" else number


def plain_bytes(known: _table.Property, value: Any) -> bytes:
    if known.form["form"] == "text":
        return str(value).encode("utf-8", "surrogateescape") + b"\0"
    return struct.pack(_NUMBERS[known.bytes], int(value))
