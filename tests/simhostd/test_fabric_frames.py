"""Frames obey what hosts share, as far as each of them can: when a call returns on its own host,
and whatever stands in the way of the rest."""

import os
import signal
from pathlib import Path
from typing import Any, Dict, Iterator, List, Tuple

import pytest
from _libvswitch import QEX_NOT_SUPPORTED, QEX_OK

from fabric_lab import FabricLab, Host, are_reported, in_background, is_locked, started
from frame_lab import comes_true
from simhost import Client, frame

LAB = {"switches": [{"alias": "lab", "ports": [{"id": "a"}, {"id": "b"}, {"id": "c"}]}]}
LARGE = 9000
NARROW = f"the device narrow cannot carry packets of {LARGE} bytes: Invalid argument"


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        yield lab


@pytest.fixture
def two(lab: FabricLab) -> Tuple[Host, Host]:
    one, other = started(lab.host("one", LAB)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    return one, other


class Flow:
    """Frames from one client to another, each of which is another one."""

    def __init__(self, source: Client, to: Client) -> None:
        self._source, self._to = source, to
        self._sent: List[bytes] = []

    def send(self) -> None:
        payload = len(self._sent).to_bytes(46, "big")
        self._sent.append(frame(self._to.mac, self._source.mac, payload=payload))
        self._source.send(self._sent[-1])

    def passes(self) -> None:
        self.send()
        self._to.expect(self._sent[-1])

    def passed(self) -> List[int]:
        """Which of those that were sent have come."""
        self.passes()
        last = self._sent[-1]
        came = []
        while (one := self._to.expect(lambda frame: frame in self._sent)) != last:
            came.append(self._sent.index(one))
        return came


def set_vlan(host: Host, port: str, vlan: int) -> None:
    assert host.call("VSDVS_SetPortVLANPolicy", "lab", port, vlan, 0, 0, 0, None, 0) == QEX_OK


def test_a_change_is_in_force_here_when_its_call_returns(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    _, other = two
    one, to = (other.client("lab", port) for port in "bc")
    assert one.comes_to_reach(to)
    flow = Flow(one, to)
    flow.passes()
    # By itself Open vSwitch changes nothing any more of what it has remembered since.
    other.control("revalidator/pause")
    switch = other.processes()["ovs-vswitchd"]
    os.kill(switch, signal.SIGSTOP)
    call = in_background(other, "vs.VSDVS_SetPortVLANPolicy('lab', 'b', 7, 0, 0, 0, None, 0)")
    assert comes_true(lambda: "vlan" in lab.databases.settings("Port", id="b"))
    assert comes_true(lambda: not is_locked(other) and not is_locked(other))
    # All have it, and only these frames do not.
    assert call.poll() is None
    os.kill(switch, signal.SIGCONT)
    assert call.communicate(timeout=30)[0] == f"{QEX_OK}\n"
    flow.send()
    other.control("revalidator/resume")
    set_vlan(other, "c", 7)
    flow.passes()
    to.expect_none(lambda came: came[14:] == (1).to_bytes(46, "big"))


def shared(lab: FabricLab) -> Tuple[List[Dict[str, Any]], ...]:
    return tuple(lab.databases.rows(table) for table in ("Switch", "Port", "Fabric"))


def add_narrow(host: Host) -> None:
    """A device that carries no more than the one below it."""
    host.host.run("ip", "link", "add", "low", "type", "veth", "peer", "name", "below")
    host.host.run("ip", "link", "add", "link", "low", "name", "narrow", "type", "macvlan")


def errors(lab: FabricLab, host: Host) -> Dict[str, str]:
    (row,) = lab.databases.rows("Host", name=host.name)
    return dict(row["errors"][1])


def test_what_a_device_cannot_bear_is_told_and_the_rest_is_in_force(
    lab: FabricLab, two: Tuple[Host, Host]
) -> None:
    one, other = two
    add_narrow(one)
    one.ctl("connect", "lab", "a", "narrow")
    near, far = (one.client("lab", port) for port in "bc")
    assert near.comes_to_reach(far)
    # What its own frames cannot obey a host keeps from all.
    before = shared(lab)
    assert one.call("VSDVS_SetMTU", "lab", LARGE) == QEX_NOT_SUPPORTED
    assert shared(lab) == before
    # Of another one's change it says so.
    assert other.call("VSDVS_SetMTU", "lab", LARGE) == QEX_OK
    set_vlan(other, "b", 7)
    assert comes_true(lambda: errors(lab, one) == {"frames": NARROW} and are_reported(lab))
    assert one.setting("lab", "mtu") == LARGE
    flow = Flow(near, far)
    flow.send()
    set_vlan(other, "c", 7)
    assert comes_true(lambda: are_reported(lab))
    flow.passes()
    far.expect_none(lambda came: came[14:] == bytes(46))
    one.ctl("disconnect", "lab", "a")
    assert comes_true(lambda: errors(lab, one) == {})
