"""Uplinks that lose the network although they keep their links."""

from typing import Any, Dict, Iterator

import pytest

import simhost
from frame_lab import Lab, comes_true
from simhost import Client
from simhost._frames import Wire

UPLINKS = ("nic0", "nic1", "nic2")
HOST: Dict[str, Any] = {
    "uplinks": [{"name": uplink} for uplink in UPLINKS],
    "switches": [
        {
            "alias": "lab",
            "uplinks": list(UPLINKS),
            "teaming": {
                "balance": "explicit",
                "active": ["nic0"],
                "standby": ["nic1", "nic2"],
                "criteria": ["beacon"],
            },
            "ports": [{"id": "a"}, {"id": "b"}],
        }
    ],
}


class Hall:
    """The network, whose wires go on having links when it lets go of them."""

    def __init__(self, lab: Lab) -> None:
        self._namespace = lab.frames.new_namespace()
        quick = ["forward_delay", "0", "mcast_snooping", "0"]
        self._namespace.run("ip", "link", "add", "hall", "type", "bridge", *quick)
        self._namespace.run("ip", "link", "set", "hall", "up")
        self._wires: Dict[str, Wire] = {}
        for number, uplink in enumerate(UPLINKS):
            self._wires[uplink] = lab.frames.cabling.to_network(self._namespace, f"w{number}")
            self.join(uplink)
        far = lab.frames.new_namespace()
        lab.frames.cabling.connect(self._namespace, "c", far, "eth0")
        self._namespace.run("ip", "link", "set", "c", "master", "hall")
        self.client: Client = lab.frames.new_client(far)
        lab.apply({"uplinks": [{"name": n, "device": w.near} for n, w in self._wires.items()]})

    def cut(self, uplink: str) -> None:
        self._namespace.run("ip", "link", "set", self._wires[uplink].name, "nomaster")

    def join(self, uplink: str) -> None:
        self._namespace.run("ip", "link", "set", self._wires[uplink].name, "master", "hall")


@pytest.fixture(scope="module")
def lab(tmp_path_factory: pytest.TempPathFactory) -> Iterator[Lab]:
    with Lab(tmp_path_factory.mktemp("lab"), HOST) as lab:
        lab.start()
        yield lab


@pytest.fixture(scope="module")
def lasting_hall(lab: Lab) -> Hall:
    return Hall(lab)


@pytest.fixture(scope="module")
def near(lab: Lab, lasting_hall: Hall) -> Client:
    return lab.client("lab", "a")


@pytest.fixture
def hall(lab: Lab, lasting_hall: Hall, near: Client) -> Hall:
    """Which all uplinks lead to, and whose client is reached over the first."""
    lab.apply(HOST)
    for uplink in UPLINKS:
        lasting_hall.join(uplink)
    assert comes_true(lambda: "nic0" in carrier(lab) and "beacons down" not in lab.ctl("show"))
    assert near.comes_to_reach(lasting_hall.client)
    return lasting_hall


def carrier(lab: Lab) -> str:
    """The line of the port a, which says over what it sends."""
    return next(line for line in lab.ctl("show").splitlines() if "port a " in line)


def is_beacon(frame: bytes) -> bool:
    return frame[12:14] == b"\x88\xb5" and frame[0] == 3


def test_an_uplink_that_is_cut_off_is_left_until_it_is_back(
    lab: Lab, hall: Hall, near: Client
) -> None:
    hall.cut("nic0")
    assert near.comes_to_reach(hall.client)
    assert "nic1" in carrier(lab)
    assert "nic0       link up" in lab.ctl("show")
    hall.join("nic0")
    assert comes_true(lambda: "nic0" in carrier(lab))
    assert near.comes_to_reach(hall.client)


def test_of_two_uplinks_none_is_left(lab: Lab, hall: Hall, near: Client) -> None:
    """When one of three is cut off, the other two cannot tell of each other any more."""
    hall.cut("nic0")
    assert comes_true(lambda: "nic1" in carrier(lab))
    hall.cut("nic1")
    assert comes_true(lambda: "nic0" in carrier(lab))
    assert "nobody can tell" not in lab.plane()["said"]
    lab.apply(
        {"switches": [{"alias": "lab", "uplink_ports": [{"id": "uplink3", "blocked": True}]}]}
    )
    assert comes_true(lambda: "nobody can tell which one is cut off" in lab.plane()["said"])
    lab.apply(
        {"switches": [{"alias": "lab", "uplink_ports": [{"id": "uplink3", "blocked": False}]}]}
    )
    assert comes_true(lambda: "nobody can tell" not in lab.plane()["said"])


def test_nobody_sends_beacons_that_are_not_asked_for(lab: Lab, hall: Hall, near: Client) -> None:
    hall.cut("nic0")
    assert comes_true(lambda: "nic1" in carrier(lab))
    teaming = {**HOST["switches"][0]["teaming"], "criteria": ["link"]}
    lab.apply({"switches": [{"alias": "lab", "teaming": teaming}]})
    assert comes_true(lambda: "nic0" in carrier(lab))

    def is_silent() -> bool:
        try:
            hall.client.expect_none(is_beacon, timeout=0.7)
        except AssertionError:
            return False
        return True

    assert comes_true(is_silent)


def test_nobody_but_uplinks_gets_beacons(lab: Lab, hall: Hall, near: Client) -> None:
    """Neither the host's own, nor somebody else's."""
    stranger = simhost.frame("03:62:63:00:00:01", hall.client.mac)
    assert is_beacon(hall.client.expect(is_beacon)), "they go to all who are there"
    own = hall.client.expect(is_beacon)
    for _ in range(3):
        hall.client.send(stranger)
        near.send(stranger)
    other = lab.client("lab", "b")
    for client in (near, other):
        client.expect_none(is_beacon, timeout=0.6)
    hall.client.expect_none(lambda frame: frame == stranger)
    # One that is sent by a client is heard by nobody.
    hall.cut("nic0")
    for _ in range(8):
        near.send(own)
        near.expect_none(is_beacon, timeout=0.2)
    assert comes_true(lambda: "nic1" in carrier(lab))
