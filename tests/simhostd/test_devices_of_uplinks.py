"""What an uplink has of its device: link, speed and duplex, and what it counts."""

import json
import subprocess
import sys
from typing import Any, Dict, Iterator

import pytest

from counted_frames import BROADCAST, LENGTH, MULTICAST, PLAIN, come_to, send
from frame_lab import Lab, comes_true
from simhost import Client

IN_VLAN_7 = "81000007" + PLAIN
LLDP = "01:80:c2:00:00:0e"


def uplink(lab: Lab, name: str) -> Dict[str, Any]:
    uplinks = json.loads(lab.ctl("show", "--json"))["uplinks"]
    (found,) = (one["observed"] for one in uplinks if one["name"] == name)
    return dict(found)


STATISTICS = """
import json
from vswitch import Host, Port
print(json.dumps(vars(Port(Host().switches["lab"], {!r}).stats)))
"""


def counters_at(lab: Lab, uplink_port: str) -> Dict[str, int]:
    said = json.loads(lab.python(STATISTICS.format(uplink_port)))
    return {name: count for name, count in said.items() if count}


def link(lab: Lab, name: str) -> str:
    return str(uplink(lab, name)["link"])


@pytest.fixture
def wire_end(lab: Lab) -> Client:
    """The other end of the wire at nic0, where nobody speaks by himself."""
    far = lab.frames.new_namespace()
    wire = lab.frames.cabling.to_network(far, "eth0")
    lab.ctl("uplink", "nic0", "--device", wire.near)
    return lab.frames.new_client(far)


def test_an_uplink_counts_what_comes_and_goes_over_its_wire(lab: Lab, wire_end: Client) -> None:
    lab.set_port("lab", "a", vlan=7)
    near = lab.client("lab", "a")
    lab.ctl("connect", "lab", "a", "c1", "--mac", near.mac)
    # A tag takes bytes of a wire: a frame counts as it came in, wherever that was.
    send(near, 3, BROADCAST)
    send(near, 2, MULTICAST)
    send(near, 4, wire_end.mac)
    send(wire_end, 5, near.mac, head=IN_VLAN_7)
    send(wire_end, 6, BROADCAST, head=IN_VLAN_7)
    # For the link's other end only, from an address that is nobody's, and back from where it went.
    send(wire_end, 1, LLDP)
    send(wire_end, 2, BROADCAST, source="00:00:00:00:00:00", head=IN_VLAN_7)
    send(wire_end, 3, BROADCAST, source=near.mac, head=IN_VLAN_7)
    come_to(
        lambda: counters_at(lab, "uplink1"),
        {
            **{"pktsOutBroadcast": 3, "bytesOutBroadcast": 3 * LENGTH},
            **{"pktsOutMulticast": 2, "bytesOutMulticast": 2 * LENGTH},
            **{"pktsOutUnicast": 4, "bytesOutUnicast": 4 * LENGTH},
            **{"pktsInUnicast": 5, "bytesInUnicast": 5 * LENGTH},
            **{"pktsInBroadcast": 6, "bytesInBroadcast": 6 * LENGTH},
            "pktsInDropped": 6,
        },
    )
    assert counters_at(lab, "uplink2") == {}


# A device that takes so many frames of which nobody takes any from it.
ROOM = 4
NOBODY_READS = """
import fcntl, struct
device = open("/dev/net/tun", "r+b", buffering=0)
fcntl.ioctl(device, 0x400454CA, struct.pack("16sH22x", b"tap0", 0x1002))
print("attached", flush=True)
input()
"""


@pytest.fixture
def tap(lab: Lab) -> Iterator[str]:
    run = lab.host.run
    run("ip", "tuntap", "add", "tap0", "mode", "tap")
    run("ip", "link", "set", "tap0", "txqueuelen", str(ROOM), "up")
    words = [sys.executable, "-c", NOBODY_READS]
    reader = lab.host.start(*words, stdin=subprocess.PIPE, stdout=subprocess.PIPE)
    assert reader.stdout is not None and reader.stdout.readline()
    yield "tap0"
    reader.communicate("\n")


def test_what_a_device_has_no_room_for_is_dropped(lab: Lab, tap: str) -> None:
    lab.ctl("uplink", "nic0", "--device", tap)
    near = lab.client("lab", "a")
    assert comes_true(lambda: link(lab, "nic0") == "up")
    send(near, ROOM + 7, BROADCAST)
    sent = {"pktsOutBroadcast": ROOM + 7, "bytesOutBroadcast": (ROOM + 7) * LENGTH}
    come_to(lambda: counters_at(lab, "uplink1"), {**sent, "pktsOutDropped": 7})


def test_an_uplink_is_as_fast_as_its_device_says(lab: Lab, tap: str) -> None:
    lab.host.run("ethtool", "-s", tap, "speed", "1000", "duplex", "half", "autoneg", "off")
    lab.ctl("uplink", "nic0", "--device", tap)
    assert (uplink(lab, "nic0")["speed"], uplink(lab, "nic0")["duplex"]) == (1000, "half")
    # One that does not say it is as fast as what was there before, or as a simulated one.
    lab.host.run("ip", "link", "add", "silent", "type", "bridge")
    for name, speed in ("nic0", 1000), ("nic1", 10000):
        lab.ctl("uplink", name, "--device", "silent")
        assert (uplink(lab, name)["speed"], uplink(lab, name)["duplex"]) == (speed, "full")
        lab.ctl("uplink", name, "--device", "")


def test_an_uplink_is_switched_with_its_device(lab: Lab, wire_end: Client) -> None:
    near = lab.client("lab", "a")

    def switch(state: str) -> str:
        return lab.python(
            "from libvswitch import checked, enums\n"
            f"checked.VSQEX_SetUplinkAdminLinkState('lab', 'nic0', enums.LinkState.{state})\n"
            "print(checked.VSQEX_GetUplinkLinkState('lab', 'nic0').name)"
        ).strip()

    def device() -> Any:
        (said,) = json.loads(lab.host.run("ip", "-json", "link", "show", "u0"))
        return said["flags"]

    assert near.comes_to_reach(wire_end)
    assert switch("DOWN") == "DOWN"
    assert "UP" not in device()
    assert not near.reaches(wire_end)
    switch("UP")
    assert "UP" in device()
    assert comes_true(lambda: link(lab, "nic0") == "up")
    assert near.comes_to_reach(wire_end)
    # Nobody else switches it.
    lab.host.run("ip", "link", "set", "u0", "down")
    assert comes_true(lambda: "UP" in device())
