"""What somebody else changes in the same Open vSwitch: put right where it is the host's, left alone
where it is not."""

from functools import partial
from pathlib import Path
from typing import Iterator, List

import pytest

from counted_frames import MULTICAST, come_to, counters, send
from frame_lab import Lab, comes_sooner_or_later, comes_true
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import frame


# The tables that a switch fills by itself, with the kind that their cookies begin with.
SELF_FILLED = {31: 0x0D, 32: 0x0C, 33: 0x0E, 34: 0x0F, 42: 0x20}


def _is_in(flow: str, table: int) -> bool:
    # Not where one says what it teaches.
    return f", table={table}, " in flow


class Meddler:
    """Somebody who has the tools of Open vSwitch."""

    def __init__(self, lab: Lab) -> None:
        self._lab = lab
        (self.socket,) = lab.run_folder().glob("vs*.mgmt")
        self.bridge = self.socket.stem

    def ofctl(self, command: str, *words: str) -> str:
        target = f"unix:{self.socket}"
        return self._lab.host.run("ovs-ofctl", "-OOpenFlow15", command, target, *words)

    def vsctl(self, *words: str) -> str:
        database = f"--db=unix:{self._lab.run_folder()}/db.sock"
        return self._lab.host.run("ovs-vsctl", database, *words)

    def flows(self) -> List[str]:
        """Those that the host made, without what they counted."""
        lines = self.ofctl("dump-flows", "--no-stats").splitlines()
        return sorted(line for line in lines if not any(_is_in(line, n) for n in SELF_FILLED))

    def learned(self, table: int) -> List[str]:
        lines = self.ofctl("dump-flows", "--no-stats").splitlines()
        return sorted(line for line in lines if _is_in(line, table))

    def groups(self) -> List[str]:
        return sorted(self.ofctl("dump-groups").splitlines()[1:])


@pytest.fixture
def busy(lab: Lab) -> Lab:
    """Two clients at ports and one beyond two uplinks."""
    one, other, far = lab.client("lab", "a"), lab.client("lab", "b"), lab.network("nic0", "nic1")
    assert one.comes_to_reach(other)
    assert one.comes_to_reach(far.client())
    # What the host does by itself is nobody else's.
    assert "somebody else" not in lab.log()
    return lab


@pytest.fixture
def meddler(busy: Lab) -> Meddler:
    return Meddler(busy)


@pytest.mark.parametrize(
    "command, words",
    [
        ("del-flows", []),
        ("del-flows", ["table=13"]),
        ("add-flow", ["table=0,priority=60000,actions=drop"]),
        ("mod-flows", ["table=13,actions=drop"]),
        ("del-groups", []),
    ],
)
def test_flows_and_groups_are_put_right(
    busy: Lab, meddler: Meddler, command: str, words: List[str]
) -> None:
    before = meddler.flows(), meddler.groups()
    assert all(before)
    meddler.ofctl(command, *words)
    assert comes_true(lambda: (meddler.flows(), meddler.groups()) == before)
    assert f"somebody else changed flows or groups of the bridge {meddler.bridge}" in busy.log()


def test_what_was_counted_stays(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    meddler = Meddler(lab)
    before, counted = meddler.flows(), 0

    def count(times: int) -> None:
        nonlocal counted
        counted += times
        send(one, times, MULTICAST)
        come_to(lambda: counters(lab, "a").get("pktsInMulticast", 0), counted)

    count(3)
    meddler.ofctl("del-flows")
    assert comes_true(lambda: meddler.flows() == before)
    assert one.comes_to_reach(other)
    count(4)
    meddler.vsctl("del-br", meddler.bridge)
    assert one.comes_to_reach(other)
    count(5)


@pytest.mark.parametrize("words", [["del-flows"], ["del-flows", "table=31"], []])
def test_who_says_nothing_is_reached_after_it(lab: Lab, words: List[str]) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    # It is not to ask who was there.
    other.run("ip", "neighbour", "flush", "dev", "eth0")
    meddler = Meddler(lab)
    before = meddler.learned(31)
    assert len(before) == 2
    if words:
        meddler.ofctl(*words)
    else:
        meddler.vsctl("del-br", meddler.bridge)
    assert comes_sooner_or_later(one, other, frame(other.mac, one.mac, payload=b"are you there?"))
    assert comes_true(lambda: meddler.learned(31) == before)


def test_who_may_forge_nothing_sends_after_it(idle: Lab) -> None:
    """Also where no daemon saw that the bridge lost its client's address."""
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        idle.set_port("lab", "a", forbids=["forged_transmits"])
        one, other = idle.client("lab", "a"), idle.client("lab", "b")
        assert one.comes_to_reach(other)
        idle.stop()
        Meddler(idle).ofctl("del-flows", f"table=31,dl_dst={one.mac}")
        idle.start(open_vswitch.where)
        assert one.comes_to_reach(other)


def has_learned_all(meddler: Meddler, table: int) -> bool:
    """Whether all that is in the table looks at an address or a port, as what is learned does."""
    return all(",dl_" in flow or ",in_port=" in flow for flow in meddler.learned(table))


def test_what_nobody_learned_goes(busy: Lab, meddler: Meddler) -> None:
    """In whichever table, and however like what is learned."""
    somebodys = "cookie=0x99,priority=65000,actions=drop"
    of_another_port = "cookie={}abcdef,priority=100,actions=drop"
    # There are no words for this field here.
    of_the_first_port = "cookie={}000003,priority=100,ct_state=-trk,actions=drop"
    planted = {
        31: somebodys,
        32: of_another_port,
        34: of_the_first_port,
        33: somebodys,
        42: somebodys,
    }
    for table, said in planted.items():
        flow = said.format(f"{SELF_FILLED[table]:#x}00000000")
        meddler.ofctl("add-flow", f"table={table},{flow}")
        assert comes_true(partial(has_learned_all, meddler, table))
    said = f"somebody else changed flows or groups of the bridge {meddler.bridge}"
    assert busy.log().count(said) == 4


def test_a_meter_goes(meddler: Meddler) -> None:
    before = meddler.ofctl("dump-meters")
    meddler.ofctl("add-meter", "meter=7,kbps,band=type=drop,rate=1")
    meddler.ofctl("mod-meter", "meter=controller,pktps,burst,band=type=drop,rate=1,burst_size=1")
    assert comes_true(lambda: meddler.ofctl("dump-meters") == before)


def test_a_group_is_put_right(meddler: Meddler) -> None:
    before = meddler.groups()
    number = before[0].split("group_id=")[1].split(",")[0]
    meddler.ofctl("mod-group", f"group_id={number},type=all,bucket=actions=drop")
    assert comes_true(lambda: meddler.groups() == before)


@pytest.mark.parametrize(
    "change",
    [
        ["set", "Bridge", "{}", "fail_mode=standalone"],
        ["set", "Bridge", "{}", "protocols=OpenFlow13"],
        ["set-controller", "{}", "tcp:127.0.0.1:6653"],
        ["add-port", "{}", "lo"],
        ["del-port", "c1"],
        ["set", "Port", "c1", "tag=7"],
        ["set", "Port", "c1", "trunks=7"],
        ["set", "Interface", "c1", "ofport_request=99"],
        ["set", "Interface", "c1", "ingress_policing_rate=1"],
        ["del-br", "{}"],
    ],
)
def test_rows_are_put_right(meddler: Meddler, change: List[str]) -> None:
    def rows() -> List[str]:
        tables = (
            ("Bridge", "name fail_mode protocols controller"),
            ("Port", "name tag trunks"),
            (
                "Interface",
                "name ofport_request ingress_policing_rate",
            ),
        )
        said = []
        for table, columns in tables:
            said += meddler.vsctl(
                "--format=csv", f"--columns={columns.replace(' ', ',')}", "list", table
            ).splitlines()
        return sorted(said)

    before = rows()
    meddler.vsctl(*(word.format(meddler.bridge) for word in change))
    assert comes_true(lambda: rows() == before)


@pytest.fixture
def lasting(idle: Lab) -> Iterator[LastingOpenVSwitch]:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        yield open_vswitch


def test_bridges_of_others_are_left_alone(idle: Lab, lasting: LastingOpenVSwitch) -> None:
    others = "other0", "other-port"
    idle.start(lasting.where)
    one, other = idle.client("lab", "a"), idle.client("lab", "b")
    assert one.comes_to_reach(other)
    meddler = Meddler(idle)
    meddler.vsctl(
        *("add-br", others[0], "--", "set", "Bridge", others[0], "datapath_type=netdev"),
        *("--", "add-port", *others, "--", "set", "Interface", others[1], "type=internal"),
    )
    flows = ["ovs-ofctl", "dump-flows", "--no-stats", f"unix:{idle.run_folder()}/{others[0]}.mgmt"]
    before = idle.host.run(*flows)
    idle.set_port("lab", "a", vlan=7)
    idle.ctl("disconnect", "lab", "b")
    idle.stop()
    idle.start(lasting.where)
    assert idle.host.run(*flows) == before
    assert others[1] in meddler.vsctl("list-ports", others[0])
    assert meddler.vsctl("get", "Bridge", others[0], "external_ids").strip() == "{}"


def test_a_device_of_another_bridge_is_left_there(idle: Lab, lasting: LastingOpenVSwitch) -> None:
    idle.start(lasting.where)
    one, other = idle.client("lab", "a"), idle.client("lab", "b")
    assert one.comes_to_reach(other)
    meddler = Meddler(idle)
    meddler.vsctl("add-br", "other0", "--", "set", "Bridge", "other0", "datapath_type=netdev")
    idle.host.run("ip", "link", "add", "taken0", "type", "veth", "peer", "name", "taken1")
    meddler.vsctl("add-port", "other0", "taken0")
    change = idle.plane()["change"]
    done = idle.try_ctl("connect", "lab", "c", "taken0")
    assert done.returncode == 1
    assert done.stdout == "simhostctl: the device taken0 is at the bridge other0 (QEX_BUSY)\n"
    assert idle.plane()["change"] == change
    # One that is taken away later stays away, and nothing else stops for it.
    meddler.vsctl("del-port", "c1", "--", "add-port", "other0", "c1")
    why = "the device c1 is at the bridge other0 of somebody else"
    assert comes_true(lambda: why in idle.plane()["said"])
    idle.set_port("lab", "b", vlan=7)
    assert idle.is_in_force()
    assert "c1" in meddler.vsctl("list-ports", "other0")
    meddler.vsctl("del-port", "other0", "c1")
    assert comes_true(lambda: not idle.plane()["said"])
    idle.set_port("lab", "a", vlan=7)
    assert one.comes_to_reach(other)


def test_a_device_of_a_linux_bridge_is_refused(lab: Lab, tmp_path: Path) -> None:
    run = lab.host.run
    run("ip", "link", "add", "linux0", "type", "bridge")
    run("ip", "link", "add", "taken0", "type", "veth", "peer", "name", "taken1")
    run("ip", "link", "set", "taken0", "master", "linux0")
    done = lab.try_ctl("uplink", "nic0", "--device", "taken0")
    assert done.returncode == 1
    assert "the device taken0 is at the bridge linux0 (QEX_BUSY)\n" in done.stdout
