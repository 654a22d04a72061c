"""Frames that are counted, and what is said to have been counted."""

import json
import time
from typing import Any, Dict

from frame_lab import Lab
from simhost import Client
from simhost._namespaces import PATIENCE

BROADCAST, MULTICAST = "ff:ff:ff:ff:ff:ff", "01:00:5e:01:02:03"
LENGTH = 60
# A type of Ethernet that is nobody's.
PLAIN, IN_VLAN_5, IN_VLAN_7 = "88b5", "8100000588b5", "8100000788b5"


def send(client: Client, times: int, to: str, source: str = "", head: str = PLAIN) -> None:
    addresses = to + (source or client.mac)
    frame = bytes.fromhex(addresses.replace(":", "") + head).ljust(LENGTH, b".")
    for _ in range(times):
        client.send(frame)


def expect_from(client: Client, source: str) -> None:
    """Of two wires nobody knows at which one Open vSwitch looks first: what another one sends goes
    there before, with all that is learned of it."""
    client.expect(lambda frame: frame[6:12].hex(":") == source)


def counters(lab: Lab, port: str) -> Dict[str, int]:
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    (found,) = (one for one in switch["ports"] if one["id"] == port)
    return dict(found["counters"])


def come_to(read: Any, wanted: Any) -> None:
    """Open vSwitch adds up what it counted every half a second."""
    deadline = time.monotonic() + PATIENCE
    while (found := read()) != wanted and time.monotonic() < deadline:
        time.sleep(0.05)
    assert found == wanted, f"{found} instead of {wanted}"
