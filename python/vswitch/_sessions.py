"""Between tables of mirror sessions and values; apart from other records, which need less.

A table is the header, the sessions, and the entities of all of them.
"""

import contextlib
from typing import Any, Dict, Tuple

import libvswitch as _vs
from libvswitch import _packed_values, _pointers
from libvswitch.values import DVMirrorEntity, DVMirrorSession
from vswitch import _table
from vswitch.mirroring import Encapsulation, Mirror, MirrorEnd

_SIZES = _pointers.record_sizes()

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
    return _table.word_for(_table.choices(form, name), number)


def _number(name: str, word: str, form: Any = Mirror._form) -> int:
    return _table.choices(form, name)[word]


def _bits_words(name: str, bits: int) -> Tuple[str, ...]:
    choices = _table.choices(Mirror._form, name)
    return tuple(word for word, bit in choices.items() if bits & bit)


def _bits(name: str, held: Tuple[str, ...]) -> int:
    return sum(_number(name, word) for word in held)


def _ends_from(entities: Tuple[DVMirrorEntity, ...]) -> Tuple[MirrorEnd, ...]:
    found = []
    for one in entities:
        kind = _ENDS.get(one.type)
        if kind is None:
            raise ValueError(f"a mirror session has an entity of the unknown kind {one.type}")
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
    """From the bytes of a table."""
    return tuple(map(mirror_from, _sessions_from(data)))


def known_mirrors_from(data: bytes) -> Tuple[Mirror, ...]:
    """Likewise, of a table of which words say all."""
    sessions = _sessions_from(data)
    mirrors = tuple(map(mirror_from, sessions))
    with contextlib.suppress(KeyError):
        if tuple(map(session_of, mirrors)) == sessions:
            return mirrors
    raise ValueError("a mirror session has what no word says")


def _sessions_from(data: bytes) -> Tuple[DVMirrorSession, ...]:
    """The sessions of a table, whose counts are not believed past its end."""
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
        return _packed_values.read_DVMirrorSessionTable(table)
    finally:
        _vs.free_dvmirror_session_table(table)
