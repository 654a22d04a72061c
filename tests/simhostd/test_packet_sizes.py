"""Devices carry packets as large as those of their switch, or are refused; larger ones they may."""

import json
from typing import Iterator

import pytest

from frame_lab import Lab, comes_true

LARGE = 9000


def mtu(lab: Lab, device: str) -> int:
    (link,) = json.loads(lab.host.run("ip", "-json", "link", "show", device))
    return int(link["mtu"])


def set_mtu(lab: Lab, device: str, size: int) -> None:
    lab.host.run("ip", "link", "set", device, "mtu", str(size))


def set_mtu_of_switch(lab: Lab, size: int) -> None:
    lab.python(f"from libvswitch import checked; checked.VSDVS_SetMTU('lab', {size})")


def test_devices_carry_what_their_switch_does(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    for client in one, other:
        client.run("ip", "link", "set", "eth0", "mtu", str(LARGE))
    large = ["ping", "-c", "1", "-W", "1", "-M", "do", "-s", str(LARGE - 28), other.address]
    assert one.comes_to_reach(other)
    assert one.run(*large).returncode != 0
    set_mtu_of_switch(lab, LARGE)
    assert [mtu(lab, device) for device in ("c1", "c2")] == [LARGE, LARGE]
    assert comes_true(lambda: one.run(*large).returncode == 0)
    # Whoever makes it smaller is overruled.
    set_mtu(lab, "c1", 1400)
    assert comes_true(lambda: mtu(lab, "c1") == LARGE)
    assert comes_true(lambda: one.run(*large).returncode == 0)
    # Nobody needs the size, but somebody may have wanted it.
    set_mtu_of_switch(lab, 1500)
    assert mtu(lab, "c1") == LARGE
    lab.network("nic0")
    set_mtu_of_switch(lab, 1600)
    assert mtu(lab, "u0") == 1600


@pytest.fixture
def narrow(lab: Lab) -> Iterator[str]:
    """A device that carries no more than the one below it, which is called low."""
    lab.host.run("ip", "link", "add", "low", "type", "veth", "peer", "name", "below")
    lab.host.run("ip", "link", "add", "link", "low", "name", "narrow", "type", "macvlan")
    yield "narrow"


def refused(lab: Lab, *words: str, given: str = "") -> None:
    """With nothing changed."""
    change, sizes = lab.plane()["change"], (mtu(lab, "c1"), mtu(lab, "narrow"))
    done = lab.try_ctl(*words, given=given)
    assert done.returncode == 1
    why = "the device narrow cannot carry packets of 9000 bytes: Invalid argument"
    assert f"{why} (QEX_NOT_SUPPORTED)" in done.stdout
    assert lab.plane()["change"] == change
    assert (mtu(lab, "c1"), mtu(lab, "narrow")) == sizes


def test_a_device_that_cannot_is_refused(lab: Lab, narrow: str) -> None:
    large = {"alias": "large", "mtu": LARGE, "ports": [{"id": "x"}], "uplinks": ["nic2"]}
    lab.apply({"uplinks": [{"name": "nic2"}], "switches": [large]})
    lab.client("lab", "a")
    refused(lab, "connect", "large", "x", narrow)
    refused(lab, "uplink", "nic2", "--device", narrow)
    lab.ctl("connect", "lab", "b", narrow)
    larger = json.dumps({"switches": [{"alias": "lab", "mtu": LARGE}]})
    refused(lab, "apply", "-", given=larger)
    # A device and a size of the same change.
    lab.ctl("disconnect", "lab", "b")
    port = {"id": "b", "device": {"name": narrow}}
    both = json.dumps({"switches": [{"alias": "lab", "mtu": LARGE, "ports": [port]}]})
    refused(lab, "apply", "-", given=both)


def test_what_a_device_can_do_no_more_is_told(lab: Lab, narrow: str) -> None:
    lab.ctl("connect", "lab", "b", narrow)
    set_mtu(lab, "low", 1400)
    why = "the device narrow cannot carry packets of 1500 bytes: Invalid argument"
    assert comes_true(lambda: lab.ctl("plane").endswith(f" is in force, but {why}\n"))
    assert lab.log().count(why) == 1
    # Nor does it stand in the way of others, or of what would help.
    lab.client("lab", "a")
    larger = lab.try_ctl(
        "apply", "-", given=json.dumps({"switches": [{"alias": "lab", "mtu": 1501}]})
    )
    assert "the device narrow cannot carry packets of 1501 bytes" in larger.stdout
    set_mtu(lab, "low", 1500)
    assert comes_true(lambda: lab.ctl("plane").endswith(" is in force\n"))
    assert mtu(lab, "narrow") == 1500
