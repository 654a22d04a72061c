"""Databases of a fabric that fail: no change that was made is lost, and none that was
refused appears."""

from pathlib import Path
from typing import Any, Iterator, Tuple

import pytest
from _libvswitch import QEX_BUSY, QEX_OK, QEX_TIMEOUT

from counted_frames import BROADCAST
from fabric_lab import (
    FabricLab,
    Host,
    are_reported,
    in_background,
    is_locked,
    relay_of,
    revision,
    started,
)
from frame_lab import comes_true
from going_frames import GoingFrames
from relays import FROM_HOST, TO_HOST
from simhost import frame

LAB = {"switches": [{"alias": "lab", "ports": [{"id": "a"}]}]}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path, servers=3) as lab:
        yield lab


@pytest.fixture
def two(lab: FabricLab) -> Tuple[Host, Host]:
    one, other = started(lab.host("one", LAB)), started(lab.host("two"))
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    return one, other


def mtu(host: Host) -> Any:
    return host.setting("lab", "mtu")


def test_a_majority_decides(lab: FabricLab, two: Tuple[Host, Host]) -> None:
    one, other = two
    more = [{"id": "b"}, {"id": "c"}, {"id": "d", "vlan": 9}]
    one.apply({"switches": [{"alias": "lab", "ports": more}]})
    near, far, beside, apart = (one.client("lab", port) for port in "abcd")
    assert near.comes_to_reach(far)
    with GoingFrames(near, far):
        lab.databases.kill(lab.databases.leader())
        assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
        assert comes_true(lambda: mtu(other) == 1600)
        (last, alone) = lab.databases.running()
        lab.databases.kill(last)
        # It takes the other one a moment to see it.
        assert comes_true(lambda: not lab.databases.tells("connected", alone))
        assert other.call("VSDVS_SetMTU", "lab", 1700) == QEX_BUSY
        assert other.call("VSDVS_CreateVSwitch", "own", "", "", 0, 1, 0, 1700, 0) == QEX_OK
        assert mtu(other) == 1600
        near.send(frame(BROADCAST, near.mac, payload=b"to one VLAN"))
        beside.expect(lambda came: b"to one VLAN" in came)
        apart.expect_none(lambda came: b"to one VLAN" in came)
        lab.databases.start(last)
        assert comes_true(lambda: other.call("VSDVS_SetMTU", "lab", 1800) == QEX_OK)
        assert comes_true(lambda: mtu(one) == 1800)
        assert lab.databases.settings("Switch")["mtu"] == 1800


def test_a_first_server_that_hangs_keeps_nobody(lab: FabricLab, two: Tuple[Host, Host]) -> None:
    one, other = two
    assert all("192.0.2.1:6640" in host.ctl("fabric") for host in two)
    lab.databases.pause_first()
    third = lab.host("three")
    third.start()
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    # Nobody asks for anything there, and who hangs does not say so.
    assert comes_true(lambda: mtu(other) == 1600)
    assert comes_true(lambda: "in the fabric at" in third.ctl("fabric")), third.log()
    # What the server has still to learn nobody follows.
    lab.databases.resume(0)
    other.stop()
    started(other)
    assert mtu(other) == 1600
    assert one.call("VSDVS_SetMTU", "lab", 1700) == QEX_OK
    assert comes_true(lambda: mtu(other) == 1700)


def test_nobody_knows_and_then_it_is_decided(lab: FabricLab, two: Tuple[Host, Host]) -> None:
    one, other = two
    # Servers that hear of it, and say nothing.
    assert comes_true(lambda: are_reported(lab))
    lab.databases.pause()
    calls = [
        in_background(host, f"vs.VSDVS_SetMTU('lab', {wanted})")
        for host, wanted in ((one, 1600), (other, 1700))
    ]
    for call in calls:
        assert call.communicate(timeout=30)[0] == f"{QEX_TIMEOUT}\n"
    assert mtu(one) == mtu(other) == 1500
    lab.databases.resume()
    for host in two:
        assert comes_true(lambda: "of which nobody knew was" in host.log()), host.log()
    made = {host.name for host in two if "nobody knew was made" in host.log()}
    assert len(made) <= 1
    wanted = {"one": 1600, "two": 1700}[made.pop()] if made else 1500
    assert comes_true(lambda: mtu(one) == mtu(other) == wanted), (mtu(one), mtu(other), wanted)
    assert one.call("VSDVS_SetMTU", "lab", 1900) == QEX_OK
    assert comes_true(lambda: mtu(other) == 1900)


def test_a_message_that_is_cut_loses_and_doubles_nothing(lab: FabricLab) -> None:
    one = started(lab.relayed(lab.host("one", LAB)))
    assert one.relay is not None
    one.ctl("share", "lab")
    before = revision(lab)
    for wanted, direction in ((1600, FROM_HOST), (1700, TO_HOST)):
        assert comes_true(lambda: are_reported(lab))
        one.relay.cut(direction)
        assert one.call("VSDVS_SetMTU", "lab", wanted) == QEX_OK
        assert lab.databases.settings("Switch")["mtu"] == wanted
    assert revision(lab) == before + 2
    # What comes late is no other than what comes at once.
    one.relay.delay(0.2)
    assert one.call("VSDVS_SetMTU", "lab", 1800) == QEX_OK
    assert (lab.databases.settings("Switch")["mtu"], revision(lab)) == (1800, before + 3)


@pytest.mark.parametrize("reply_only", [False, True], ids=["unheard", "made"])
def test_the_leader_is_lost_in_mid_change(lab: FabricLab, reply_only: bool) -> None:
    """With what it was told, or with what it would have told."""
    one = started(lab.relayed(lab.host("one", LAB)))
    relay = relay_of(one)
    one.ctl("share", "lab")
    assert comes_true(lambda: are_reported(lab))
    before, leader = revision(lab), lab.databases.leader()
    relay.hold(*([TO_HOST] if reply_only else [FROM_HOST, TO_HOST]))
    call = in_background(one, "vs.VSDVS_SetMTU('lab', 1600)")
    if reply_only:
        assert comes_true(lambda: revision(lab) == before + 1)
    else:
        assert comes_true(lambda: is_locked(one))
        assert revision(lab) == before
    lab.databases.kill(leader)
    relay.cut(TO_HOST)
    relay.release()
    assert call.communicate(timeout=30)[0] == f"{QEX_OK}\n"
    assert (lab.databases.settings("Switch")["mtu"], revision(lab)) == (1600, before + 1)
    assert mtu(one) == 1600


def test_servers_may_be_slow_as_long_as_they_reply(lab: FabricLab) -> None:
    one = started(lab.relayed(lab.host("one", LAB)))
    one.ctl("share", "lab")
    one.stop()
    relay_of(one).delay(0.4)
    started(one)
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    assert lab.databases.settings("Switch")["mtu"] == 1600


def test_what_a_server_makes_twice_is_made_once(lab: FabricLab) -> None:
    one, other = lab.relayed(lab.host("one", LAB)), lab.relayed(lab.host("two"))
    for host in (one, other):
        relay_of(host).repeat()
        started(host)
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    other.set_port("lab", "b", vlan={"id": 9})
    assert one.call("VSDVS_RemoveDVPort", "lab", "a") == QEX_OK
    assert comes_true(lambda: (mtu(other), set(one.ports("lab"))) == (1600, {"b"}))
    # Who had the name lets go of it.
    one.stop()
    started(one)
    assert other.call("VSDVS_SetMTU", "lab", 1700) == QEX_OK
    assert comes_true(lambda: are_reported(lab))
    assert mtu(one) == 1700
    assert revision(lab) == len(lab.databases.rows("Change")) == 6
    for host in (one, other):
        # An election may have come in between, but no refusal was believed.
        for refusal in ("refuses to wait", "constraint violation", "another simhostd"):
            assert refusal not in host.log(), host.log()
