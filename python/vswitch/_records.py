"""Between the records of the calls and the values of this package, in both directions."""

import struct
from typing import Any, Dict, List, Tuple

import libvswitch as _vs
from libvswitch import _packed_values, _pointers, checked
from libvswitch.enums import Balance, Criteria, EthernetFilter, TeamFlags
from libvswitch.values import DVMirrorEntity, DVMirrorSession
from vswitch import _table
from vswitch.values import (
    Encapsulation,
    FrameFilter,
    MacLearning,
    Mirror,
    MirrorEnd,
    PortMacLearning,
    Teaming,
    Vlan,
)

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
    trunk = ",".join(str(first) if first == last else f"{first}-{last}" for first, last in ranges)
    return Vlan.known(
        id=policy.vlanID,
        trunk=trunk or None,
        priority=None if priority < 0 else priority,
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
    form = _table.member(PortMacLearning._form, "limit_policy")
    assert form is not None
    policies = {number: word for word, number in form["choices"].items()}
    return PortMacLearning.known(
        learning=inner.learning,
        flooding=inner.flooding,
        limit=inner.macLimit,
        limit_policy=policies.get(inner.macLimitPolicy, str(inner.macLimitPolicy)),
        mac_change=held.macChangeAllowed,
    )


def port_learning_bytes(learning: PortMacLearning) -> bytes:
    form = _table.member(PortMacLearning._form, "limit_policy")
    assert form is not None
    held = _vs.VSPMACManagement(macChangeAllowed=learning.mac_change)
    held.portMACLearning.learning = learning.learning
    held.portMACLearning.flooding = learning.flooding
    held.portMACLearning.macLimit = learning.limit
    held.portMACLearning.macLimitPolicy = form["choices"][learning.limit_policy]
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


# Mirror sessions. A table is the header, the sessions, and the entities of all of them.

_FLAGS: Dict[str, int] = {
    "no_output": _vs.VS_DVMIRROR_FLAG_DST_NO_OUTPUT,
    "no_input": _vs.VS_DVMIRROR_FLAG_DST_NO_INPUT,
    "keeps_vlan": _vs.VS_DVMIRROR_FLAG_DST_ORIG_VLAN,
    "encapsulates": _vs.VS_DVMIRROR_FLAG_DST_ENCAP,
    "promiscuous": _vs.VS_DVMIRROR_FLAG_LEGACY,
    "disabled": _vs.VS_DVMIRROR_FLAG_DISABLED,
    "mirrors_uplinks": _vs.VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR,
}
_ENDS: Dict[int, str] = {
    _vs.MIRROR_ENTTYPE_DVPORT: "port",
    _vs.MIRROR_ENTTYPE_UPLINK: "uplink",
    _vs.MIRROR_ENTTYPE_VLAN: "vlan",
    _vs.MIRROR_ENTTYPE_IP: "ip",
    _vs.MIRROR_ENTTYPE_PORT: "number",
}


def _word(name: str, number: int, form: Any = Mirror._form) -> str:
    choices = (_table.member(form, name) or {})["choices"]
    return next((word for word, one in choices.items() if one == number), str(number))


def _number(name: str, word: str, form: Any = Mirror._form) -> int:
    found: int = (_table.member(form, name) or {})["choices"][word]
    return found


def _bits_words(name: str, bits: int) -> Tuple[str, ...]:
    choices = (_table.member(Mirror._form, name) or {})["choices"]
    return tuple(word for word, bit in choices.items() if bits & bit)


def _bits(name: str, held: Tuple[str, ...]) -> int:
    return sum(_number(name, word) for word in held)


def _ends_from(entities: Tuple[DVMirrorEntity, ...]) -> Tuple[MirrorEnd, ...]:
    found = []
    for one in entities:
        kind = _ENDS[one.type]
        value = int(one.entity) if kind in ("vlan", "number") else one.entity
        found.append(MirrorEnd.known(**{kind: value}))
    return tuple(found)


def _entities_of(ends: Tuple[MirrorEnd, ...]) -> Tuple[DVMirrorEntity, ...]:
    found = []
    for one in ends:
        for number, kind in _ENDS.items():
            if getattr(one, kind) is not None:
                found.append(DVMirrorEntity(number, str(getattr(one, kind))))
    return tuple(found)


def mirror_from(session: DVMirrorSession) -> Mirror:
    return Mirror.known(
        sid=session.sid,
        name=session.dname,
        type=_word("type", session.type),
        snap_length=session.snapLen,
        sampling_rate=session.samplingRate,
        to=_ends_from(session.dstEntities),
        received_by=_ends_from(session.srcInEntities),
        sent_by=_ends_from(session.srcOutEntities),
        encapsulation=Encapsulation.known(
            type=_word("type", session.encapType, Encapsulation._form),
            key=session.greKey,
            vlan=session.encapVlan,
            id=session.erspanID,
            cos=session.erspanCOS,
            granularity=session.erspanGra,
        ),
        uplink_filter=_word("uplink_filter", session.uplinkFilter),
        received_from=_bits_words("received_from", session.wildIn),
        sent_from=_bits_words("sent_from", session.wildOut),
        stack=session.stack,
        **{name: bool(session.flags & bit) for name, bit in _FLAGS.items()},
    )


def session_of(mirror: Mirror) -> DVMirrorSession:
    wrapped = mirror.encapsulation
    return DVMirrorSession(
        sid=mirror.sid,
        dname=mirror.name,
        type=_number("type", mirror.type),
        snapLen=mirror.snap_length,
        flags=sum(bit for name, bit in _FLAGS.items() if getattr(mirror, name)),
        encapVlan=wrapped.vlan,
        wildIn=_bits("received_from", mirror.received_from),
        wildOut=_bits("sent_from", mirror.sent_from),
        samplingRate=mirror.sampling_rate,
        greKey=wrapped.key,
        uplinkFilter=_number("uplink_filter", mirror.uplink_filter),
        stack=mirror.stack,
        encapType=_number("type", wrapped.type, Encapsulation._form),
        erspanID=wrapped.id,
        erspanCOS=wrapped.cos,
        erspanGra=wrapped.granularity,
        dstEntities=_entities_of(mirror.to),
        srcInEntities=_entities_of(mirror.received_by),
        srcOutEntities=_entities_of(mirror.sent_by),
    )


def mirror_bytes(mirrors: Tuple[Mirror, ...]) -> bytes:
    sessions = [session_of(one) for one in mirrors]
    count = sum(
        len(one.dstEntities) + len(one.srcInEntities) + len(one.srcOutEntities) for one in sessions
    )
    size = _SIZES["DVMirrorSessionTable"] + len(sessions) * _SIZES["DVMirrorSession"]
    table = _packed_values.packed_sessions("mirror_sessions", sessions)
    try:
        return _pointers.read_memory(table, 0, size + count * _SIZES["DVMirrorEntity"])
    finally:
        _vs.free_dvmirror_session_table(table)


def mirrors_from(data: bytes) -> Tuple[Mirror, ...]:
    """From the bytes of a table, whose counts are not believed past its end."""
    header = _SIZES["DVMirrorSessionTable"]
    if len(data) < header:
        raise ValueError(f"a table of mirror sessions has {header} bytes, not {len(data)}")
    room = (len(data) - header) // _SIZES["DVMirrorEntity"] + 1
    table = _vs.alloc_dvmirror_session_table(0, room)
    try:
        _pointers.write_memory(table, 0, data)
        ends = table.numSessions * _SIZES["DVMirrorSession"]
        ends += table.numEntities * _SIZES["DVMirrorEntity"]
        if header + ends != len(data):
            raise ValueError(f"a table of mirror sessions says {header + ends} bytes of itself")
        return tuple(map(mirror_from, _packed_values.read_DVMirrorSessionTable(table)))
    finally:
        _vs.free_dvmirror_session_table(table)
