"""Clients that move to another uplink, or come to a port, are announced to the network."""

import os
import signal
import sqlite3
import time
from typing import List, Tuple

import pytest

from frame_lab import Lab, comes_true
from simhost import Client, Network, frame

# Source and sender, a reverse request, and nothing of IP.
BEFORE, BETWEEN = bytes.fromhex("80350001080006040003"), bytes(4)


def reverse_arp(mac: str) -> bytes:
    address = bytes.fromhex(mac.replace(":", ""))
    packet = b"\xff" * 6 + address + BEFORE + address + BETWEEN + address + BETWEEN
    return packet.ljust(60, b"\0")


SENT = """
from libvswitch import checked
sent = checked.VSQEX_GetRARPStats("lab")
print(sent.rarpPktsSent, sent.rarpTime, sent.maxRARPTime)
"""


def counted(lab: Lab) -> List[int]:
    """How many were sent, when the last one was, and the time that nobody counts."""
    return [int(said) for said in lab.python(SENT).split()]


def sent(lab: Lab) -> int:
    return counted(lab)[0]


def now() -> int:
    """As the clock of a host says it."""
    return int(time.time() * 1000)


Around = Tuple[Network, Client]


@pytest.fixture
def around(lab: Lab) -> Around:
    """What is beyond the uplinks."""
    network = lab.network("nic0", "nic1")
    return network, network.client()


def test_a_client_that_is_moved_is_announced(lab: Lab, around: Around) -> None:
    network, far = around
    near, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic0"
    network.pull("nic0")
    far.expect(reverse_arp(near.mac))
    assert network.came_over(near.mac) == "nic1"
    # Nobody here is told, and the silent other one, of whom nothing is known, is not announced.
    near.expect_none(reverse_arp(near.mac))
    other.expect_none(reverse_arp(near.mac), timeout=0.0)
    far.expect_none(reverse_arp(other.mac), timeout=0.0)
    assert comes_true(lambda: sent(lab) == 1)
    network.plug("nic0")
    far.expect(reverse_arp(near.mac))
    assert comes_true(lambda: network.came_over(near.mac) == "nic0")
    # What comes back over the other uplink has taught this switch nothing.
    hello = frame(near.mac, far.mac, payload=b"hello")
    far.send(hello)
    near.expect(hello)
    far.expect_none(reverse_arp(near.mac))
    assert comes_true(lambda: sent(lab) == 2)


LINK = """
from libvswitch import checked
print(checked.VSQEX_GetUplinkLinkState("lab", "nic0").name)
"""


def test_an_announcement_goes_over_a_link_that_open_vswitch_sees_late(
    lab: Lab, around: Around
) -> None:
    network, far = around
    near = lab.client("lab", "a")
    assert near.comes_to_reach(far)
    switch = lab.processes()["ovs-vswitchd"]
    # It chooses by chance what to look at first: links, or what it is told.
    for _ in range(2):
        network.pull("nic0")
        far.expect(reverse_arp(near.mac))
        assert comes_true(lambda: network.came_over(near.mac) == "nic1")
        os.kill(switch, signal.SIGSTOP)
        network.plug("nic0")
        assert comes_true(lambda: "UP" in lab.python(LINK))
        os.kill(switch, signal.SIGCONT)
        far.expect(reverse_arp(near.mac))
        assert comes_true(lambda: network.came_over(near.mac) == "nic0")


def test_a_client_is_announced_when_its_device_is_connected(lab: Lab, around: Around) -> None:
    network, far = around
    lab.set_port("lab", "a", vlan=7)
    mac = "02:00:00:00:00:77"
    begun = now()
    lab.frames.client("lab", "a", mac=mac)
    packet = tagged(reverse_arp(mac), 7)
    far.expect(packet)
    assert network.came_over(mac) == "nic0"
    assert comes_true(lambda: sent(lab) == 1)
    _, when, longest = counted(lab)
    assert begun <= when <= now() and longest == 0
    # A daemon that comes later has no news.
    lab.stop()
    lab.start()
    far.expect_none(packet)


def test_addresses_that_a_port_learned_are_announced(lab: Lab, around: Around) -> None:
    network, far = around
    lab.set_port("lab", "a", mac_learning={"learning": True, "flooding": True})
    near = lab.client("lab", "a")
    beyond_it = [f"02:00:00:00:01:0{number}" for number in range(3)]
    for mac in beyond_it:
        hello = frame(far.mac, mac, payload=b"hello")
        near.send(hello)
        far.expect(hello)
    network.pull("nic0")
    for mac in beyond_it:
        far.expect(reverse_arp(mac))
        far.expect_none(reverse_arp(mac), timeout=0.0)


def tagged(packet: bytes, vlan: int) -> bytes:
    return packet[:12] + b"\x81\x00" + vlan.to_bytes(2, "big") + packet[12:] if vlan else packet


def test_a_client_of_a_trunk_is_announced_in_each_of_its_vlans(lab: Lab, around: Around) -> None:
    network, far = around
    lab.set_port("lab", "a", vlan={"trunk": [0, "10-11", 4094]})
    near = lab.client("lab", "a")
    hello = frame(far.mac, near.mac, payload=b"hello")
    near.send(tagged(hello, 10))
    far.expect(tagged(hello, 10))
    network.pull("nic0")
    for vlan in (0, 10, 11, 4094):
        far.expect(tagged(reverse_arp(near.mac), vlan), timeout=30)
    far.expect_none(lambda came: reverse_arp(near.mac)[12:] in came, timeout=0.2)
    assert comes_true(lambda: sent(lab) == 4)
    # Where there is no room for all, each client is announced before any is in another VLAN.
    lab.apply({"runtime_options": {"MaxRARPsPerInterval": 2, "RARPAdvertisementDuration": 0}})
    other = lab.client("lab", "b")
    assert other.comes_to_reach(far)
    before = sent(lab)
    network.plug("nic0")
    for mac in (near.mac, other.mac):
        far.expect(reverse_arp(mac))
    assert comes_true(lambda: sent(lab) == before + 2)


def test_who_does_not_want_it_is_not_announced(lab: Lab, around: Around) -> None:
    network, far = around
    quiet = {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"], "flags": []}
    lab.set_port("lab", "b", teaming=quiet)
    loud, silent = lab.client("lab", "a"), lab.client("lab", "b")
    assert loud.comes_to_reach(far) and silent.comes_to_reach(far)
    network.pull("nic0")
    far.expect(reverse_arp(loud.mac))
    far.expect_none(reverse_arp(silent.mac))


def test_no_more_than_so_many_are_announced_at_once(lab: Lab, around: Around) -> None:
    network, far = around
    lab.apply({"runtime_options": {"MaxRARPsPerInterval": 1}})
    assert sent(lab) == 0
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(far) and other.comes_to_reach(far)
    network.pull("nic0")
    for client in (one, other):
        far.expect(reverse_arp(client.mac))
    assert comes_true(lambda: sent(lab) == 2)
    # Who has to wait longer than that is not announced.
    lab.apply({"runtime_options": {"RARPAdvertisementDuration": 0}})
    network.plug("nic0")
    far.expect(reverse_arp(one.mac))
    assert comes_true(lambda: sent(lab) == 3)
    lab.apply({"runtime_options": {"MaxRARPsPerInterval": 0}})
    network.pull("nic0")
    assert comes_true(lambda: "sends over nic0" not in lab.ctl("show"))
    far.expect_none(lambda frame: frame[12:14] == b"\x80\x35")
    assert sent(lab) == 3


def test_frames_do_not_wait_for_who_writes_to_the_state(lab: Lab, around: Around) -> None:
    network, far = around
    lab.apply({"runtime_options": {"MaxRARPsPerInterval": 1}})
    one, *others = (lab.client("lab", port) for port in "abc")
    assert all(client.comes_to_reach(far) for client in (one, *others))
    network.pull("nic0")
    far.expect(reverse_arp(one.mac))
    writer = sqlite3.connect(lab.state, isolation_level=None, timeout=30)
    writer.execute("BEGIN IMMEDIATE")
    counted = sent(lab)
    # Their packets wait for their seconds, and what they are counted by for the writer.
    for client in others:
        far.expect(reverse_arp(client.mac))
    plane = lab.plane()
    assert plane["in_force"] == plane["change"] and sent(lab) == counted
    writer.execute("ROLLBACK")
    writer.close()
    assert comes_true(lambda: sent(lab) == 3)
