"""Which uplink frames take as links come and go."""

import json
import signal
import sqlite3
import time
from typing import Any

import pytest

from frame_lab import Lab, comes_true
from simhost import Client, Network, frame


def set_teaming(lab: Lab, **teaming: Any) -> None:
    team = {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"], **teaming}
    lab.apply({"switches": [{"alias": "lab", "teaming": team}]})


@pytest.fixture
def network(lab: Lab) -> Network:
    return lab.network("nic0", "nic1")


@pytest.fixture
def far(network: Network) -> Client:
    return network.client()


@pytest.fixture
def near(lab: Lab, far: Client) -> Client:
    client = lab.client("lab", "a")
    assert client.comes_to_reach(far)
    return client


def test_an_uplink_that_comes_up_is_used_after_its_delay(
    lab: Lab, network: Network, far: Client, near: Client
) -> None:
    lab.apply({"runtime_options": {"TeamPolicyUpDelay": 3_600_000}})
    # Whatever came up while the wires were laid has been up for long.
    lab.ctl("clock", "step", "3600")
    network.pull("nic0")
    assert near.comes_to_reach(far)
    network.plug("nic0")
    assert comes_true(lambda: "nic0       link up" in lab.ctl("show"))
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic1"
    network.pull("nic1")
    assert comes_true(lambda: "nic1       link down" in lab.ctl("show"))
    assert near.ceases_to_reach(far)
    lab.ctl("clock", "step", "3600")
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic0"


def test_nobody_has_to_ask_for_the_delay_to_end(
    lab: Lab, network: Network, far: Client, near: Client
) -> None:
    lab.apply({"runtime_options": {"TeamPolicyUpDelay": 300}})
    network.pull("nic0")
    network.pull("nic1")
    assert comes_true(lambda: "nic1       link down" in lab.ctl("show"))
    network.plug("nic0")
    assert near.comes_to_reach(far)


def test_an_uplink_that_returns_is_used_again(network: Network, far: Client, near: Client) -> None:
    network.pull("nic0")
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic1"
    network.plug("nic0")
    assert comes_true(lambda: near.reaches(far) and network.came_over(near.mac) == "nic0")


def test_a_daemon_replies_while_somebody_writes_to_the_state(
    lab: Lab, network: Network, far: Client, near: Client
) -> None:
    writer = sqlite3.connect(lab.state, isolation_level=None, timeout=30)
    writer.execute("BEGIN IMMEDIATE")
    network.pull("nic0")
    # Which it hears before all of these questions are asked.
    for _ in range(20):
        assert lab.plane()["in_force"] is not None
    assert near.comes_to_reach(far)
    assert "nic0       link up" in lab.ctl("show")
    writer.execute("ROLLBACK")
    writer.close()
    assert comes_true(lambda: "nic0       link down" in lab.ctl("show"))
    assert network.came_over(near.mac) == "nic1"


def test_a_rolling_team_stays_where_it_is(
    lab: Lab, network: Network, far: Client, near: Client
) -> None:
    set_teaming(lab, flags=["rolling"])
    network.pull("nic0")
    assert near.comes_to_reach(far)
    network.plug("nic0")
    assert comes_true(lambda: "nic0       link up" in lab.ctl("show"))
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic1"
    # Also for a daemon that comes later.
    lab.stop(signal.SIGTERM)
    lab.start()
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic1"
    network.pull("nic1")
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic0"


# What a device of this kind has: 10 Gbit/s in both directions at once.
@pytest.mark.parametrize(
    "unmet, met",
    [
        ({"criteria": ["speed"], "speed": 1000}, {"criteria": ["speed"], "speed": 10000}),
        (
            {"criteria": ["speed_at_least"], "speed": 10001},
            {"criteria": ["speed_at_least"], "speed": 1000},
        ),
        (
            {"criteria": ["duplex"], "full_duplex": False},
            {"criteria": ["duplex"], "full_duplex": True},
        ),
    ],
)
def test_an_uplink_that_does_not_meet_the_criteria_is_not_used(
    lab: Lab, network: Network, far: Client, near: Client, unmet: Any, met: Any
) -> None:
    set_teaming(lab, **unmet)
    assert near.ceases_to_reach(far)
    set_teaming(lab, **met)
    assert near.comes_to_reach(far)


def test_an_uplink_whose_port_is_blocked_is_not_used(
    lab: Lab, network: Network, far: Client, near: Client
) -> None:
    set_teaming(lab, criteria=["blocked"])
    lab.apply(
        {"switches": [{"alias": "lab", "uplink_ports": [{"id": "uplink1", "blocked": True}]}]}
    )
    assert near.comes_to_reach(far)
    assert network.came_over(near.mac) == "nic1"


class Damaging:
    """A wire at whose near end frames of more than that device carries count as damaged."""

    def __init__(self, lab: Lab) -> None:
        run = lab.host.run
        far = lab.frames.new_namespace()
        run("ip", "link", "add", "below", "mtu", "9000", "type", "veth", "peer", "name", "end")
        for device in "below", "end":
            run("ip", "link", "set", device, "mtu", "9000", "up")
        for device in "near", "far":
            run("ip", "link", "add", device, "link", "below", "type", "macvlan", "mode", "bridge")
        run("ip", "link", "set", "near", "mtu", "1500", "up")
        run("ip", "link", "set", "far", "mtu", "9000", "netns", str(far.pid))
        far.run("ip", "link", "set", "far", "name", "eth0", "up")
        self.client = lab.frames.new_client(far)
        lab.ctl("uplink", "nic0", "--device", "near")

    def send(self, whole: int, damaged: int) -> None:
        for frames, size in (whole, 100), (damaged, 3000):
            for _ in range(frames):
                self.client.send(frame("ff:ff:ff:ff:ff:ff", self.client.mac, payload=bytes(size)))


def test_an_uplink_is_left_while_too_many_frames_come_in_damaged(lab: Lab) -> None:
    wire = Damaging(lab)
    set_teaming(lab, criteria=["errors"], error_percent=20)
    far = lab.network("nic1").client()
    near = lab.client("lab", "a")

    def comes_over(uplink: str, whole: int, damaged: int) -> bool:
        def comes() -> bool:
            wire.send(whole, damaged)
            time.sleep(0.1)  # what is sent afterwards is to be more soon
            host = json.loads(lab.ctl("show", "--json"))
            percent = host["uplinks"][0]["observed"]["error_percent"]
            carrier = host["switches"][0]["ports"][0]["observed"]["uplink"]
            # After a while all that came lately was whole.
            return bool(carrier == uplink and (percent > 0 or not damaged))

        return comes_true(comes)

    assert comes_over("nic0", whole=9, damaged=1)
    # What came before is a part of what came lately.
    assert comes_over("nic1", whole=0, damaged=10)
    assert near.comes_to_reach(far)
    assert comes_over("nic0", whole=100, damaged=0)
