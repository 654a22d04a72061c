"""The frames of the guide "Writing tests against the simulated host"."""

import pytest
import simhost
from simhost import Frames

RACK = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [
        {
            "alias": "rack",
            "uplinks": ["nic0", "nic1"],
            "teaming": {"balance": "explicit"},
            "ports": [{"id": "web", "vlan": 10}, {"id": "db", "vlan": 20}, {"id": "desk"}],
        }
    ],
}
pytestmark = pytest.mark.scenario(RACK)


def test_a_broadcast_stays_in_its_vlan(frames: Frames) -> None:
    web, database = frames.client("rack", "web"), frames.client("rack", "db")
    far = frames.network("nic0", "nic1").client()
    web.send(simhost.frame("ff:ff:ff:ff:ff:ff", web.mac, payload=b"hello" * 10))
    received = far.expect(lambda frame: frame.endswith(b"hello"))
    assert received == simhost.frame("ff:ff:ff:ff:ff:ff", web.mac, vlan=10, payload=b"hello" * 10)
    database.expect_none()


def test_pings_go_on_without_an_uplink(frames: Frames) -> None:
    network = frames.network("nic0", "nic1")
    desk, far = frames.client("rack", "desk"), network.client()
    assert desk.comes_to_reach(far)
    network.pull("nic0")
    assert desk.comes_to_reach(far)
    said = desk.run("ping", "-c", "3", "-i", "0.1", far.address).stdout
    assert "3 received" in said, said
