"""Frames to groups, and what hosts and routers say of them: IGMP and MLD, laid out by hand."""

import ipaddress
import struct
from typing import Sequence

IGMP = 2
UDP = 17
ICMPV6 = 58
PIM = 103
ALL_SYSTEMS = "224.0.0.1"
# Of records.
IS_INCLUDE, IS_EXCLUDE, TO_INCLUDE, TO_EXCLUDE, ALLOW, BLOCK = range(1, 7)

_IPV4_ALERT = bytes([0x94, 4, 0, 0])
_IPV6_ALERT = bytes([5, 2, 0, 0, 1, 0])


def checksum(data: bytes) -> int:
    even = data + bytes(len(data) % 2)
    total = sum(int.from_bytes(even[at : at + 2], "big") for at in range(0, len(even), 2))
    while total >> 16:
        total = (total & 0xFFFF) + (total >> 16)
    return ~total & 0xFFFF


def _with_sum(data: bytes, at: int, also: bytes = b"") -> bytes:
    return data[:at] + struct.pack("!H", checksum(also + data)) + data[at + 2 :]


def _mac(text: str) -> bytes:
    return bytes.fromhex(text.replace(":", ""))


def mac_of(group: str) -> str:
    """The address of Ethernet to which frames for a group go."""
    packed = ipaddress.ip_address(group).packed
    if len(packed) == 4:
        raw = bytes([1, 0, 0x5E, packed[1] & 0x7F, *packed[2:]])
    else:
        raw = b"\x33\x33" + packed[12:]
    return raw.hex(":")


def _ipv4(source: str, to: str, protocol: int, payload: bytes) -> bytes:
    options = _IPV4_ALERT if protocol == IGMP else b""
    size = 20 + len(options)
    ttl = 64 if protocol == UDP else 1
    header = struct.pack(
        *("!BBHHHBBH4s4s", 0x40 | size // 4, 0, size + len(payload), 0, 0x4000, ttl, protocol, 0),
        *(ipaddress.ip_address(source).packed, ipaddress.ip_address(to).packed),
    )
    return _with_sum(header + options, 10) + payload


def _ipv6(source: str, to: str, protocol: int, payload: bytes) -> bytes:
    hops = 1 if protocol == ICMPV6 else 64
    options = bytes([protocol, 0]) + _IPV6_ALERT if protocol == ICMPV6 else b""
    addresses = ipaddress.ip_address(source).packed + ipaddress.ip_address(to).packed
    if protocol == ICMPV6:
        pseudo = addresses + struct.pack("!II", len(payload), protocol)
        payload = _with_sum(payload, 2, pseudo)
    first = 0 if options else protocol
    head = struct.pack("!IHBB", 0x60000000, len(options) + len(payload), first, hops)
    return head + addresses + options + payload


def _frame(mac: str, source: str, to: str, protocol: int, payload: bytes) -> bytes:
    family = ipaddress.ip_address(to).version
    packet = (_ipv4 if family == 4 else _ipv6)(source, to, protocol, payload)
    kind = b"\x08\x00" if family == 4 else b"\x86\xdd"
    return _mac(mac_of(to)) + _mac(mac) + kind + packet


def data(mac: str, source: str, group: str, text: bytes = b"data") -> bytes:
    """What somebody sends to a group."""
    udp = struct.pack("!HHHH", 4711, 4712, 8 + len(text), 0) + text
    return _frame(mac, source, group, UDP, udp)


def igmp(mac: str, source: str, to: str, message: bytes) -> bytes:
    return _frame(mac, source, to, IGMP, _with_sum(message, 2))


def joins_as_of_old(mac: str, source: str, group: str) -> bytes:
    """A report of version 1 of IGMP, which knows no leaving."""
    return igmp(mac, source, group, b"\x12\0\0\0" + ipaddress.ip_address(group).packed)


def joins(mac: str, source: str, group: str) -> bytes:
    """A report of version 2 of IGMP, or 1 of MLD."""
    packed = ipaddress.ip_address(group).packed
    if len(packed) == 4:
        return igmp(mac, source, group, b"\x16\0\0\0" + packed)
    return _frame(mac, source, group, ICMPV6, b"\x83\0\0\0\0\0\0\0" + packed)


def leaves(mac: str, source: str, group: str) -> bytes:
    packed = ipaddress.ip_address(group).packed
    if len(packed) == 4:
        return igmp(mac, source, "224.0.0.2", b"\x17\0\0\0" + packed)
    return _frame(mac, source, "ff02::2", ICMPV6, b"\x84\0\0\0\0\0\0\0" + packed)


def reports(mac: str, source: str, kind: int, group: str, sources: Sequence[str] = ()) -> bytes:
    """A report of version 3 of IGMP, or 2 of MLD, with one record."""
    packed = ipaddress.ip_address(group).packed
    record = struct.pack("!BBH", kind, 0, len(sources)) + packed
    record += b"".join(ipaddress.ip_address(one).packed for one in sources)
    if len(packed) == 4:
        return igmp(mac, source, "224.0.0.22", b"\x22\0\0\0\0\0\0\1" + record)
    return _frame(mac, source, "ff02::16", ICMPV6, b"\x8f\0\0\0\0\0\0\1" + record)


def asks(mac: str, source: str, interval: int) -> bytes:
    """A query of all groups, of version 3 of IGMP, by a router that asks so often."""
    return igmp(mac, source, ALL_SYSTEMS, struct.pack("!BBHIBBH", 0x11, 1, 0, 0, 1, interval, 0))


def asks_for_ipv6(mac: str, source: str) -> bytes:
    """Likewise of MLD, of version 2, by a router that asks every two minutes."""
    query = struct.pack("!BBHHH16sBBH", 130, 0, 0, 1000, 0, bytes(16), 0, 125, 0)
    return _frame(mac, source, "ff02::1", ICMPV6, query)


def routes(mac: str, source: str) -> bytes:
    """An advertisement of a multicast router, as one makes it every twenty seconds."""
    return igmp(mac, source, "224.0.0.106", struct.pack("!BBHHH", 0x30, 20, 0, 125, 2))


def routes_ipv6(mac: str, source: str) -> bytes:
    return _frame(mac, source, "ff02::6a", ICMPV6, struct.pack("!BBHHH", 151, 20, 0, 125, 2))


def routes_by_pim(mac: str, source: str) -> bytes:
    """A hello of version 2, which holds for a minute."""
    hello = struct.pack("!BBHHHH", 0x20, 0, 0, 1, 2, 60)
    return _frame(mac, source, "224.0.0.13", PIM, _with_sum(hello, 2))


def is_query(frame: bytes) -> bool:
    """Whether it asks for groups of IPv4."""
    size = (frame[14] & 0xF) * 4
    return frame[12:14] == b"\x08\0" and frame[23] == IGMP and frame[14 + size] == 0x11


def is_mld_query(frame: bytes) -> bool:
    return (
        frame[12:14] == b"\x86\xdd" and frame[20] == 0 and frame[54] == ICMPV6 and frame[62] == 130
    )
