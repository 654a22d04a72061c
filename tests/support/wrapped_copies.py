"""Copies of frames as collectors get them: wrapped in GRE or ERSPAN, read by RFC 2890 and the
drafts of ERSPAN."""

import struct
from ipaddress import ip_address
from typing import NamedTuple, Optional

GRE_KEY, GRE_SEQUENCE = 0x2000, 0x1000
# What GRE says that it has in it.
ETHERNET, ERSPAN_2, ERSPAN_3 = 0x6558, 0x88BE, 0x22EB
GREATEST_ERSPAN = 1023


class Packet(NamedTuple):
    """What a collector got."""

    kind: int
    source: str
    destination: str
    key: int
    leaves: bool
    copy: bytes


_GRE = 47
# Of Ethernet.
_HEADER = 14


def _payload(data: bytes) -> Optional[int]:
    """Where that of a packet begins in which there is GRE."""
    if data[12:14] == b"\x08\x00" and data[23] == _GRE:
        return _HEADER + 20
    if data[12:14] == b"\x86\xdd" and data[20] == _GRE:
        return _HEADER + 40
    return None


def is_wrapped(data: bytes) -> bool:
    return _payload(data) is not None


def read(data: bytes) -> Packet:
    """A packet of GRE, with its Ethernet."""
    begin = _payload(data)
    assert begin is not None
    # The addresses are the last of what comes before.
    size = 4 if begin == _HEADER + 20 else 16
    source, destination = (
        str(ip_address(data[at : at + size])) for at in (begin - 2 * size, begin - size)
    )
    gre = data[begin:]
    flags, kind = struct.unpack_from("!HH", gre)
    if kind == ETHERNET:
        assert flags == GRE_KEY
        (key,) = struct.unpack_from("!I", gre, 4)
        return Packet(kind, source, destination, key, False, gre[8:])
    assert flags == GRE_SEQUENCE
    first, session = struct.unpack_from("!HH", gre, 8)
    # The version; of VLANs, classes of service, trunks and damage nothing is told.
    assert first == {ERSPAN_2: 0x1000, ERSPAN_3: 0x2000}[kind] and session <= GREATEST_ERSPAN
    if kind == ERSPAN_2:
        assert gre[12:16] == bytes(4)
        return Packet(kind, source, destination, session, False, gre[16:])
    (rest,) = struct.unpack_from("!H", gre, 18)
    assert rest & ~8 == 0
    return Packet(kind, source, destination, session, bool(rest & 8), gre[20:])
