"""Frames that somebody sends to groups, on a switch with one VLAN and one uplink."""

import ipaddress
import struct

from drawn_switches import MACS, STRANGER
from frames import Frame
from group_frames import mac_of

VLAN = 7
UPLINK = "nic0"
# Two of each family that may have members, and one that all get.
GROUPS = ["239.1.1.1", "239.1.1.2", "ff0e::1", "ff0e::2"]
OF_THE_LINK = ["224.0.0.5", "ff02::5"]
SOURCES = {4: ["10.0.0.1", "10.0.0.2"], 6: ["fd00::1", "fd00::2"]}
# The families to which each mode listens.
HEARS = {"snooping": {4, 6}, "igmp": {4}, "mld": {6}}


def family(address: str) -> int:
    return ipaddress.ip_address(address).version


def frame(group: str, source: str, at: str) -> Frame:
    ends = ipaddress.ip_address(source).packed + ipaddress.ip_address(group).packed
    if family(group) == 4:
        packet = b"\x08\x00" + struct.pack("!BBHHHBBH", 0x45, 0, 28, 0, 0, 8, 17, 0) + ends
    else:
        packet = b"\x86\xdd" + struct.pack("!IHBB", 6 << 28, 8, 17, 8) + ends
    tags = ((VLAN, 0),) if at == UPLINK else ()
    content = packet + struct.pack("!HHHH", 5000, 5001, 8, 0)
    return Frame(mac_of(group), MACS.get(at, STRANGER), tags, content=content.ljust(48, b"\0"))
