"""A state that takes nothing for a while, as on a full disk: frames go on, what they left behind is
kept until it can be put there, and who asks is told."""

import resource
from pathlib import Path

from _libvswitch import QEX_IO_ERROR, QEX_OK

from counted_frames import BROADCAST, LENGTH, come_to, counters, send
from fabric_lab import FabricLab, Host, are_reported, started
from frame_lab import Lab, comes_true

FULL = "host.db cannot be read or written"
SHARED = {"switches": [{"alias": "lab", "ports": [{"id": "a"}]}]}


def set_room(lab: Lab, size: int) -> None:
    """No file that the daemon writes to becomes larger."""
    assert lab.daemon is not None
    _, most = resource.prlimit(lab.daemon.pid, resource.RLIMIT_FSIZE)
    resource.prlimit(lab.daemon.pid, resource.RLIMIT_FSIZE, (size, most))


def fill(lab: Lab) -> None:
    """What the daemon puts into its state goes to the end of the log of that, which is larger than
    the one of what it says."""
    set_room(lab, Path(f"{lab.state}-wal").stat().st_size)


def make_room(lab: Lab) -> None:
    set_room(lab, resource.RLIM_INFINITY)


def of_broadcasts(frames: int) -> object:
    return {"pktsInBroadcast": frames, "bytesInBroadcast": frames * LENGTH}


def test_what_is_counted_on_a_full_disk_is_there_when_it_has_room(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    send(one, 3, BROADCAST)
    come_to(lambda: counters(lab, "a"), of_broadcasts(3))
    fill(lab)
    send(one, 2, BROADCAST)
    assert comes_true(lambda: FULL in lab.plane()["said"])
    assert FULL in lab.log()
    come_to(lambda: counters(lab, "a"), of_broadcasts(5))
    send(one, 1, BROADCAST)
    for _ in range(6):
        other.expect(lambda frame: frame[:6] == b"\xff" * 6)
    make_room(lab)
    assert comes_true(lambda: not lab.plane()["said"])
    come_to(lambda: counters(lab, "a"), of_broadcasts(6))
    lab.stop()
    assert counters(lab, "a") == of_broadcasts(6)


def test_links_that_cannot_be_put_on_a_full_disk_stop_no_other_change(lab: Lab) -> None:
    network = lab.network("nic0", "nic1")
    far, one, other = network.client(), lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(far)
    fill(lab)
    network.pull("nic0")
    assert comes_true(lambda: FULL in lab.plane()["said"])
    for port in "ab":
        lab.set_port("lab", port, vlan=7)
    assert comes_true(lab.is_in_force)
    assert one.comes_to_reach(other)
    for port in "ab":
        lab.set_port("lab", port, vlan=0)
    make_room(lab)
    assert comes_true(lambda: not lab.plane()["said"])
    assert "sends over nic1" in lab.ctl("show")
    assert one.comes_to_reach(far)


def test_a_daemon_goes_on_that_cannot_even_say_what_is_wrong(lab: Lab) -> None:
    one = lab.client("lab", "a")
    set_room(lab, 0)
    before = lab.log()
    send(one, 2, BROADCAST)
    assert comes_true(lambda: FULL in lab.plane()["said"])
    assert lab.log() == before
    make_room(lab)
    assert comes_true(lambda: not lab.plane()["said"])
    come_to(lambda: counters(lab, "a"), of_broadcasts(2))


def called_without_room(host: Host, mtu: int) -> int:
    """The status of a call that cannot put anything into the state."""
    return int(
        host.python(
            "import _libvswitch as vs, os, resource\n"
            f"size = os.stat('{host.state}-wal').st_size\n"
            "resource.setrlimit(resource.RLIMIT_FSIZE, (size, resource.RLIM_INFINITY))\n"
            f"print(vs.VSDVS_SetMTU('lab', {mtu}))"
        )
    )


def test_nothing_is_shared_by_a_call_whose_state_takes_nothing(tmp_path: Path) -> None:
    with FabricLab(tmp_path) as lab:
        one, other = started(lab.host("one", SHARED)), started(lab.host("two"))
        one.ctl("share", "lab")
        other.ctl("join", "lab")
        assert comes_true(lambda: are_reported(lab))

        def shared() -> object:
            return lab.databases.settings("Switch"), lab.databases.rows("Fabric")

        before = shared()
        assert called_without_room(one, 1600) == QEX_IO_ERROR
        assert shared() == before
        assert one.setting("lab", "mtu") != 1600
        assert one.call("VSDVS_SetMTU", "lab", 1700) == QEX_OK
        assert comes_true(lambda: other.setting("lab", "mtu") == 1700)


def test_a_fabric_is_told_of_a_full_disk_and_when_it_has_room(tmp_path: Path) -> None:
    with FabricLab(tmp_path) as lab:
        one, other = started(lab.host("one", SHARED)), started(lab.host("two"))
        one.ctl("share", "lab")
        other.ctl("join", "lab")
        client = one.client("lab", "a")

        def troubles(where: str = "frames") -> str:
            (row,) = lab.databases.rows("Host", name="one")
            return str(dict(row["errors"][1]).get(where, ""))

        # What others have changed is to be in the state already.
        assert comes_true(lambda: are_reported(lab) and troubles() == "")
        fill(one)
        send(client, 4, BROADCAST)
        assert comes_true(lambda: FULL in troubles()), one.log()
        # A device that comes has the daemon look at all once more, and frames go on.
        one.host.run("ip", "link", "add", "new", "type", "veth", "peer", "name", "newer")
        come_to(lambda: counters(one, "a"), of_broadcasts(4))
        assert FULL in one.plane()["said"]
        # The servers are not to tell all that there is again and again meanwhile.
        connections = one.log().count("the fabric is at")
        other.set_port("lab", "a", vlan=7)
        assert comes_true(lambda: FULL in troubles("state")), one.log()
        make_room(one)
        assert comes_true(lambda: one.ports("lab")["a"].get("vlan") == 7)
        assert comes_true(lambda: troubles() == troubles("state") == "")
        assert one.log().count("the fabric is at") == connections
        other.client("lab", "a")
        come_to(lambda: counters(other, "a"), of_broadcasts(4))
