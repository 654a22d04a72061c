"""Frames that are out of the ordinary, over real wires: as short and as large as can be, cut off,
with many tags, and for the link only. Each comes where it may, once and as it should be, and
nowhere else."""

from typing import Callable, Mapping, NamedTuple, Optional, Sequence

import pytest

from counted_frames import BROADCAST
from frame_lab import Lab
from simhost import Client

# What a device of the lab carries, and a packet of its switch may have.
CARRIED, MTU = 9000, 1500
HEADER, SHORTEST = 14, 16

# The heads of ordinary ones.
PLAIN = "88b5", "8100000788b5", "8100000888b5"


class Odd(NamedTuple):
    """A frame: where it goes to, what is after its addresses, and how long it is. Where it may
    come, what is there in the place of its head: at clients of VLAN 7, on the wire, at one of 8."""

    to: str
    head: str
    length: int = 60
    at_clients: Optional[str] = None
    on_wire: Optional[str] = None
    at_stranger: Optional[str] = None
    source: str = ""

    def sent(self, source: str) -> bytes:
        addresses = (self.to + (self.source or source)).replace(":", "")
        return bytes.fromhex(addresses + self.head).ljust(self.length, b".")

    def received(self, source: str, head: str) -> bytes:
        """With another head instead."""
        whole = self.sent(source)
        return whole[:12] + bytes.fromhex(head) + whole[12 + len(self.head) // 2 :]


Heads = Callable[[Odd], Optional[str]]


def passing(head: str, length: int = 60, to: str = BROADCAST) -> Odd:
    """Of VLAN 7, and without a tag, or with one that has only a priority."""
    tagged = head.startswith("8100")
    priority, inside = (head[4], head[8:]) if tagged else ("0", head)
    return Odd(to, head, length, inside, f"8100{priority}007{inside}")


FROM_A_CLIENT = [
    passing("88b5"),
    # As much as goes into a packet, and next to nothing.
    passing("88b5", MTU + HEADER),
    passing("88b5", SHORTEST),
    # Tagged it is one of those that the kernel at the other end of a wire does not take.
    Odd(BROADCAST, "88b5", HEADER, at_clients="88b5"),
    passing("8100a00088b5"),
    passing("8100a00088b5", MTU + HEADER + 4),
    # Of a length instead of a type, and cut off.
    passing("0026aaaa030000001234"),
    passing("080045", 17),
    passing("08060001", 18),
    passing("86dd60", 20),
    # A tag of none of the kinds that are told apart.
    passing("9100000788b5"),
    passing("88080001ffff"),
    passing("88f5", to="01:80:c2:00:00:21"),
    # For the link.
    Odd("01:80:c2:00:00:0e", "88cc0207"),
    Odd("01:80:c2:00:00:0e", "8100e00088cc0207"),
    Odd("01:80:c2:00:00:01", "88080001ffff"),
    Odd("01:80:c2:00:00:00", "0026424203"),
    Odd("01:80:c2:00:00:02", "88090101"),
    Odd("01:80:c2:00:00:0f", "88b5"),
    # Nobody may tag here; cut off after a tag.
    Odd(BROADCAST, "8100000788b5"),
    Odd(BROADCAST, "8100000888b5"),
    Odd(BROADCAST, "88a8000788b5"),
    Odd(BROADCAST, "810000008100000788b5"),
    Odd(BROADCAST, "81000000" * 4 + "88b5"),
    Odd(BROADCAST, "88a80000" + "81000007" * 3 + "88b5"),
    Odd(BROADCAST, "81000fff88b5"),
    Odd(BROADCAST, "8100", HEADER),
    Odd(BROADCAST, "81000000", 16),
    # Too large for a packet, be it by one byte.
    Odd(BROADCAST, "88b5", MTU + HEADER + 1),
    Odd(BROADCAST, "88b5", CARRIED + HEADER),
    # From nobody, and from a group.
    Odd(BROADCAST, "88b5", source="00:00:00:00:00:00"),
    Odd(BROADCAST, "88b5", source="03:00:00:00:00:01"),
]
FROM_THE_WIRE = [
    Odd(BROADCAST, "8100000788b5", at_clients="88b5"),
    Odd(BROADCAST, "8100000788b5", SHORTEST + 4, at_clients="88b5"),
    Odd(BROADCAST, "8100000788b5", HEADER + 4),
    Odd(BROADCAST, "8100000888b5", at_stranger="88b5"),
    Odd(BROADCAST, "88a8000788b5", MTU + HEADER + 4, at_clients="88b5"),
    Odd("01:80:c2:00:00:0e", "8100000788cc0207"),
    Odd("01:80:c2:00:00:01", "8100000788080001ffff"),
    Odd(BROADCAST, "88b5"),
    Odd(BROADCAST, "810000078100000788b5"),
    Odd(BROADCAST, "81000007" * 4 + "88b5"),
    Odd(BROADCAST, "88a80007" + "81000007" * 3 + "88b5"),
    Odd(BROADCAST, "81000007", 16),
    Odd(BROADCAST, "8100000788b5", MTU + HEADER + 5),
    Odd(BROADCAST, "8100000788b5", CARRIED + HEADER),
]


@pytest.fixture
def far(lab: Lab) -> Client:
    """The other end of the wire at nic0."""
    namespace = lab.frames.new_namespace()
    wire = lab.frames.cabling.to_network(namespace, "eth0")
    lab.ctl("uplink", "nic0", "--device", wire.near)
    return lab.frames.new_client(namespace)


def deliver(sender: Client, frames: Sequence[Odd], heads: Mapping[Client, Heads]) -> None:
    """Sends them, and looks that each client has those of which there is a head for it, once."""
    source = sender.mac

    def come(frames: Sequence[Odd]) -> None:
        for odd in frames:
            sender.send(odd.sent(source))
        for client, head_of in heads.items():
            for odd in frames:
                head = head_of(odd)
                if head is not None:
                    client.expect(odd.received(source, head))

    # Open vSwitch decides at first, and remembers then.
    for _ in range(2):
        come(frames)
    # One that Open vSwitch knows may overtake others that came with it, but not the next one.
    for _ in range(2):
        come([odd for odd in frames if odd.head in PLAIN])
    # Clients that get something odd may say something themselves.
    sources = [source, *(odd.source for odd in frames)]
    for client in heads:
        client.expect_none(lambda came: came[6:12].hex(":") in sources, timeout=0)


def test_odd_frames_come_where_they_may_and_nowhere_else(lab: Lab, far: Client) -> None:
    for port, vlan in ("a", 7), ("b", 7), ("c", 8):
        lab.set_port("lab", port, vlan=vlan)
    one, other, stranger = clients = [lab.client("lab", port) for port in "abc"]
    for client in *clients, far:
        client.run("ip", "link", "set", "eth0", "mtu", str(CARRIED))
    for device in "c1", "c2", "c3", "u0":
        lab.host.run("ip", "link", "set", device, "mtu", str(CARRIED))

    def at_clients(odd: Odd) -> Optional[str]:
        return odd.at_clients

    def on_wire(odd: Odd) -> Optional[str]:
        return odd.on_wire

    def at_stranger(odd: Odd) -> Optional[str]:
        return odd.at_stranger

    deliver(one, FROM_A_CLIENT, {other: at_clients, far: on_wire, stranger: at_stranger})
    deliver(far, FROM_THE_WIRE, {one: at_clients, other: at_clients, stranger: at_stranger})
