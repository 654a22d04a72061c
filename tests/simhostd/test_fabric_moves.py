"""Ports of a shared switch that are connected now on one host, now on another."""

from pathlib import Path
from typing import Iterator

import pytest

from fabric_lab import FabricLab, Host, started
from frame_lab import comes_true

CLIENT = "02:00:00:00:00:0a"
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
                },
                {"id": "b", "vlan": {"id": 7}},
            ],
        }
    ],
}


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
    other.client("lab", "b")
    one.frames.client("lab", "a", mac=CLIENT)
    assert lab.databases.rows("Port", id="a")[0]["host"] == "one"
    assert lab.databases.rows("Port", id="b")[0]["host"] == "two"
    here.expect(is_announcement, timeout=20)
    there.expect_none(is_announcement)

    other.frames.client("lab", "a", mac=CLIENT)
    assert lab.databases.rows("Port", id="a")[0]["host"] == "two"
    there.expect(is_announcement, timeout=20)
    assert comes_true(lambda: device_of(one, "a") is None)
    here.expect_none(is_announcement)
    assert device_of(other, "b") is not None
    # Nobody has it when it is disconnected where it is.
    other.ctl("disconnect", "lab", "a")
    assert lab.databases.rows("Port", id="a")[0]["host"] == ""
