"""Ports of a team that goes by load move to the uplink that carries less, and nothing else does."""

import json
from typing import Dict

from frame_lab import Lab, comes_true
from simhost import Client, frame

EVERYBODY = "ff:ff:ff:ff:ff:ff"


def uplinks(lab: Lab) -> Dict[str, str]:
    """What carries what the ports send, as the host says."""
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    return {port["id"]: port["observed"]["uplink"] for port in switch["ports"]}


def send_much(client: Client) -> None:
    much = frame(EVERYBODY, client.mac, payload=b"much" * 350)
    for _ in range(40):
        client.send(much)


def test_who_sends_much_gets_an_uplink_of_its_own(lab: Lab) -> None:
    team = {"balance": "load", "active": ["nic0", "nic1"]}
    lab.apply({"switches": [{"alias": "lab", "teaming": team}]})
    clients = {port: lab.client("lab", port) for port in "abc"}
    network = lab.network("nic0", "nic1")
    before = uplinks(lab)
    # By their numbers, two of three share one.
    alone = next(port for port in "abc" if list(before.values()).count(before[port]) == 1)
    one, other = (port for port in "abc" if port != alone)
    clients[alone].send(frame(EVERYBODY, clients[alone].mac))

    def have_moved() -> bool:
        for port in one, other:
            send_much(clients[port])
        now = uplinks(lab)
        return now[one] != now[other]

    assert comes_true(have_moved)
    after = uplinks(lab)
    assert after[alone] == before[alone]
    # Also of a daemon that comes later, as long as the host is the same.
    lab.stop()
    lab.start()
    assert uplinks(lab) == after
    for port, client in clients.items():
        client.send(frame(EVERYBODY, client.mac, payload=b"where?"))
        assert comes_true(lambda: network.came_over(client.mac) == after[port])
    lab.ctl("restart")
    assert comes_true(lambda: uplinks(lab) == before)
    # An uplink that fails is left by all, whatever was chosen.
    network.pull("nic1")
    assert comes_true(lambda: set(uplinks(lab).values()) == {"nic0"})
