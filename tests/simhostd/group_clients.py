"""Clients of groups: one that sends to them, and others that say what they want."""

import struct
import subprocess
import sys
from typing import Any, Callable, List, Optional, Sequence

import group_frames as frames
from frame_lab import Lab, comes_true
from simhost import Client
from simhost._namespaces import PATIENCE
from simhost._wires import Wanted

SENDER = "198.51.100.7"
SENDER_OF_IPV6 = "2001:db8::7"

JOINS = """
import socket, struct, sys
index = socket.if_nametoindex("eth0")
one = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
request = struct.pack("@4s4si", socket.inet_aton(sys.argv[1]), bytes(4), index)
one.setsockopt(socket.IPPROTO_IP, socket.IP_ADD_MEMBERSHIP, request)
other = socket.socket(socket.AF_INET6, socket.SOCK_DGRAM)
request = socket.inet_pton(socket.AF_INET6, sys.argv[2]) + struct.pack("@I", index)
other.setsockopt(socket.IPPROTO_IPV6, socket.IPV6_JOIN_GROUP, request)
sys.stdin.read()
"""


def tagged(frame: bytes, vlan: Optional[int]) -> bytes:
    return frame if vlan is None else frame[:12] + struct.pack("!HH", 0x8100, vlan) + frame[12:]


class Clients:
    """Of one switch, by their names; the first one sends to groups."""

    def __init__(self, lab: Lab, **clients: Client) -> None:
        self.lab = lab
        self._clients = clients
        self._first = next(iter(clients))
        self._macs = {name: client.mac for name, client in clients.items()}
        self._sent = 0

    def __getitem__(self, name: str) -> Client:
        return self._clients[name]

    def mode(self, mode: str, **options: Any) -> None:
        self.lab.apply(
            {"runtime_options": options, "switches": [{"alias": "lab", "multicast": mode}]}
        )

    def says(
        self, who: str, message: Callable[..., bytes], *words: Any, vlan: Optional[int] = None
    ) -> bytes:
        """Returns what is said, without a tag."""
        source = self[who].address if "." in str(words) else "fe80::1"
        said = message(self._macs[who], source, *words)
        self[who].send(tagged(said, vlan))
        return said

    def has_kernel_join(self, who: str, group: str, of_ipv6: str) -> "subprocess.Popen[str]":
        """Until the program that is returned has nothing to read any more."""
        return self[who].start(sys.executable, "-c", JOINS, group, of_ipv6, stdin=-1, stdout=-1)

    def hears(self, who: str, wanted: Wanted, patience: float = PATIENCE) -> bytes:
        return self[who].expect(wanted, patience)

    def sends(
        self, who: str, group: str, source: str = SENDER, vlan: Optional[int] = None
    ) -> bytes:
        """Sends a frame that is unlike all others. Returns it without its tag."""
        self._sent += 1
        if ":" in group:
            source = SENDER_OF_IPV6
        frame = frames.data(self._macs[who], source, group, b"data %d." % self._sent)
        self[who].send(tagged(frame, vlan))
        return frame

    def gets(
        self,
        group: str,
        source: str = SENDER,
        sender: str = "",
        vlan: Optional[int] = None,
        told: Sequence[str] = (),
        patience: float = PATIENCE,
    ) -> str:
        """Who gets a frame to a group, each as often as there are copies, and with which tag: such
        as "one other:7". Those who are told of it get what is for all of that VLAN: all others
        than the sender, unless it is said."""
        sender = sender or self._first
        frame = self.sends(sender, group, source, vlan)
        for_all = self.sends(sender, frames.ALL_SYSTEMS, vlan=vlan)
        for name in told or [name for name in self._clients if name != sender]:
            self.hears(name, lambda came: _is_like(came, for_all), patience)
        return self.have_got(frame)

    def have_got(self, frame: bytes) -> str:
        """Likewise, of a frame that was sent before."""
        return " ".join(
            _named(name, frame, copy)
            for name, client in self._clients.items()
            for copy in _copies(client, frame)
        )

    def comes_to_get(self, wanted: str, group: str, source: str = SENDER, **more: Any) -> bool:
        return comes_true(lambda: self.gets(group, source, **more) == wanted)

    def comes_to_get_again(self, wanted: str, group: str) -> bool:
        """Likewise, while a team moves to another uplink: until then frames may be lost."""

        def gets_it() -> bool:
            try:
                return self.gets(group, patience=1) == wanted
            except AssertionError:
                return False

        return comes_true(gets_it)


def _is_like(came: bytes, sent: bytes) -> bool:
    """But for tags."""
    return came[-20:] == sent[-20:]


def _copies(client: Client, frame: bytes) -> List[bytes]:
    copies: List[bytes] = []
    while True:
        try:
            copies.append(client.expect(lambda came: _is_like(came, frame), timeout=0))
        except AssertionError:
            return copies


def _named(name: str, frame: bytes, copy: bytes) -> str:
    if copy == frame:
        return name
    (vlan,) = struct.unpack_from("!H", copy, 14)
    if copy != tagged(frame, vlan):
        raise ValueError(f"{name} got {copy.hex()} of {frame.hex()}")
    return f"{name}:{vlan}"
