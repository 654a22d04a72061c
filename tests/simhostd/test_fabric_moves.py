"""Ports of a shared switch that are connected now on one host, now on another, and what goes with
them."""

import json
import os
import signal
from pathlib import Path
from typing import Dict, Iterator

import pytest

from counted_frames import BROADCAST, LENGTH, come_to, counters, send
from fabric_lab import FabricLab, Host, are_reported, kept, restored, started
from frame_lab import comes_true
from simhost import Client, frame

CLIENT = "02:00:00:00:00:0a"
# Of the port, and not of its client.
STATIC = "02:00:00:00:00:bb"
STRANGER = "02:00:00:00:00:cc"
UPLINKS = [{"name": "nic0"}]
LAB = {
    "uplinks": UPLINKS,
    "switches": [
        {
            "alias": "lab",
            "uplinks": ["nic0"],
            "ports": [
                {
                    "id": "a",
                    "vlan": {"id": 7},
                    "teaming": {"active": ["nic0"], "flags": ["notify"]},
                    "addresses": [{"mac": STATIC, "vlan": 7, "type": "static"}],
                },
                {"id": "b", "vlan": {"id": 7}},
            ],
        }
    ],
}
TWO_PORTS = {"switches": [{"alias": "lab", "ports": [{"id": "a"}, {"id": "b"}]}]}
# Who is alone counts nobody else's frames.
ALONE = {"switches": [{"alias": "lab", "ports": [{"id": "a"}]}]}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        yield lab


def is_announcement(frame: bytes) -> bool:
    """A reverse-ARP packet of the client, in the VLAN of its port."""
    source = bytes.fromhex(CLIENT.replace(":", ""))
    return frame[6:12] == source and frame[12:18] == bytes.fromhex("810000078035")


def device_of(host: Host, port: str) -> object:
    return host.ports("lab")[port].get("device")


def test_a_port_is_where_it_was_connected_last(lab: FabricLab) -> None:
    one, other = started(lab.host("one", LAB)), started(lab.host("two", {"uplinks": UPLINKS}))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    other.apply({"switches": [{"alias": "lab", "uplinks": ["nic0"]}]})
    wires = [host.network("nic0") for host in (one, other)]
    here, there = (network.client() for network in wires)
    at_b = other.client("lab", "b")
    left = one.frames.client("lab", "a", mac=CLIENT)
    assert lab.databases.rows("Port", id="a")[0]["host"] == "one"
    assert lab.databases.rows("Port", id="b")[0]["host"] == "two"
    here.expect(is_announcement)
    there.expect_none(is_announcement)
    left.send(frame(BROADCAST, CLIENT, payload=b"left first"))
    here.expect(frame(BROADCAST, CLIENT, vlan=7, payload=b"left first"))
    to_static = frame(STATIC, STRANGER, vlan=7), frame(STATIC, STRANGER)
    here.send(to_static[0])
    left.expect(to_static[1])

    moved = other.frames.client("lab", "a", mac=CLIENT)
    assert lab.databases.rows("Port", id="a")[0]["host"] == "two"
    there.expect(is_announcement)
    assert comes_true(lambda: device_of(one, "a") is None and one.is_in_force())
    here.expect_none(is_announcement)
    for client in here, there:
        client.send(to_static[0])
    moved.expect(to_static[1])
    left.expect_none(lambda came: came == to_static[1])
    at_b.expect_none(lambda came: came == to_static[1])
    # Who was left is heard no more.
    left.send(frame(BROADCAST, CLIENT, payload=b"left now"))
    for client in here, there, moved, at_b:
        client.expect_none(lambda came: b"left now" in came)
    assert device_of(other, "b") is not None
    # Nobody has it when it is disconnected where it is.
    other.ctl("disconnect", "lab", "a")
    assert lab.databases.rows("Port", id="a")[0]["host"] == ""


def test_a_port_that_its_host_knows_not_to_be_connected_is_nowhere(lab: FabricLab) -> None:
    one, other = started(lab.host("one", TWO_PORTS)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    kept(one, "before")
    one.client("lab", "a")
    other.client("lab", "b")
    one.stop()
    restored(one, "before")
    started(one)
    assert comes_true(lambda: lab.databases.rows("Port", id="a")[0]["host"] == "")
    assert lab.databases.rows("Port", id="b")[0]["host"] == "two"
    assert device_of(one, "a") is None and device_of(other, "b") is not None
    # It may be connected again like any other.
    connect(other)
    assert lab.databases.rows("Port", id="a")[0]["host"] == "two"


def counted(frames: int) -> Dict[str, int]:
    return {"pktsInBroadcast": frames, "bytesInBroadcast": frames * LENGTH}


def connect(host: Host) -> Client:
    return host.frames.client("lab", "a", mac=CLIENT)


def test_a_port_takes_its_counters_with_it(lab: FabricLab) -> None:
    one, other = started(lab.host("one", ALONE)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    send(connect(one), 5, BROADCAST)
    come_to(lambda: counters(one, "a"), counted(5))
    at_other = connect(other)
    come_to(lambda: counters(other, "a"), counted(5))
    send(at_other, 3, BROADCAST)
    come_to(lambda: counters(other, "a"), counted(8))
    # Back, by way of nobody.
    other.ctl("disconnect", "lab", "a")
    send(connect(one), 4, BROADCAST)
    come_to(lambda: counters(one, "a"), counted(12))
    # Of a host that is gone there is what it told last, and the rest when it is back.
    one.stop()
    connect(other)
    assert comes_true(lambda: counters(other, "a")["pktsInBroadcast"] >= 8)
    started(one)
    come_to(lambda: counters(other, "a"), counted(12))


def told(lab: FabricLab, host: str, port: str) -> Dict[str, int]:
    """What a host has told of what it counted of a port."""
    (row,) = lab.databases.rows("Port", id=port)
    found: Dict[str, int] = json.loads(dict(row["counters"][1]).get(host, "{}"))
    return found


def test_what_was_counted_is_told_by_when_a_move_is_in_force(lab: FabricLab) -> None:
    one, other = started(lab.host("one", TWO_PORTS)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    one.ctl("counter", "lab", "pktsInUnicast", "1", "--port", "a")
    known = counters(one, "a")
    here, beside = connect(one), one.client("lab", "b")
    send(here, 5, BROADCAST)
    come_to(lambda: counters(one, "a"), {**counted(5), **known})
    send(here, 4, BROADCAST)
    for _ in range(9):
        beside.expect(lambda frame: frame.startswith(b"\xff" * 6))
    one.have_counted()
    switch = one.processes()["ovs-vswitchd"]
    os.kill(switch, signal.SIGSTOP)
    connect(other)
    # The port has left by then in the state of the one, and not yet for its frames.
    assert comes_true(lambda: told(lab, "one", "a"))
    os.kill(switch, signal.SIGCONT)
    assert comes_true(lambda: are_reported(lab))
    assert told(lab, "one", "a") == {**counted(9), **known}


def test_a_host_of_an_old_state_takes_back_what_it_has_told(lab: FabricLab) -> None:
    one, other = started(lab.host("one", ALONE)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    send(connect(one), 2, BROADCAST)
    come_to(lambda: counters(one, "a"), counted(2))
    connect(other)
    come_to(lambda: counters(other, "a"), counted(2))
    one.stop()
    kept(one, "old")
    started(one)
    send(connect(one), 3, BROADCAST)
    come_to(lambda: counters(one, "a"), counted(5))
    connect(other)
    come_to(lambda: counters(other, "a"), counted(5))
    one.stop()
    restored(one, "old")
    assert counters(one, "a") == counted(2)
    # While the port is elsewhere.
    started(one)
    come_to(lambda: counters(one, "a"), counted(5))
    send(connect(one), 4, BROADCAST)
    come_to(lambda: counters(one, "a"), counted(9))
    connect(other)
    come_to(lambda: counters(other, "a"), counted(9))
