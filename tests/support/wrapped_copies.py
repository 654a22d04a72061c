"""Copies of frames as collectors get them: wrapped in GRE or ERSPAN, read by RFC 2890 and the
drafts of ERSPAN."""

import struct
from typing import NamedTuple

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


def is_wrapped(data: bytes) -> bool:
    return data[12:14] == b"\x08\x00" and data[23] == 47


def read(data: bytes) -> Packet:
    """A packet of GRE, with its Ethernet."""
    source, destination = (".".join(map(str, data[at : at + 4])) for at in (26, 30))
    flags, kind = struct.unpack_from("!HH", data, 34)
    if kind == ETHERNET:
        assert flags == GRE_KEY
        (key,) = struct.unpack_from("!I", data, 38)
        return Packet(kind, source, destination, key, False, data[42:])
    assert flags == GRE_SEQUENCE
    first, session = struct.unpack_from("!HH", data, 42)
    # The version; of VLANs, classes of service, trunks and damage nothing is told.
    assert first == {ERSPAN_2: 0x1000, ERSPAN_3: 0x2000}[kind] and session <= GREATEST_ERSPAN
    if kind == ERSPAN_2:
        assert data[46:50] == bytes(4)
        return Packet(kind, source, destination, session, False, data[50:])
    (rest,) = struct.unpack_from("!H", data, 52)
    assert rest & ~8 == 0
    return Packet(kind, source, destination, session, bool(rest & 8), data[54:])
