"""Frames go on, or come back, whatever ends; configuration and counters stay as they are."""

import contextlib
import json
import os
import re
import signal
import sqlite3
import subprocess
from typing import Dict, Iterator, List

import pytest

from frame_lab import TOOLS, Lab, comes_sooner_or_later, comes_true
from going_frames import GoingFrames
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import Client, frame

EVERYBODY = "ff:ff:ff:ff:ff:ff"


def test_without_a_daemon_changes_are_pending(idle: Lab) -> None:
    assert idle.plane() == {"change": None, "in_force": None, "said": None}
    idle.start()
    one, other = idle.client("lab", "a"), idle.client("lab", "b")
    assert one.comes_to_reach(other)
    idle.stop()
    before = idle.plane()["change"]
    idle.set_port("lab", "a", vlan=7)
    plane = idle.plane()
    assert plane["change"] == before + 1 and plane["in_force"] is None
    assert "no simhostd" in plane["said"]
    assert f"change {before + 1} is pending: no simhostd" in idle.ctl("plane")
    idle.start()
    assert idle.plane()["in_force"] == before + 1
    assert one.ceases_to_reach(other)
    idle.set_port("lab", "b", vlan=7)
    # Open vSwitch started anew: where a client is, it knows when the client has sent something.
    assert other.comes_to_reach(one)


@pytest.mark.parametrize("program", ["ovs-vswitchd", "ovsdb-server"])
def test_either_process_of_open_vswitch_may_be_killed(lab: Lab, program: str) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    lab.set_port("lab", "a", vlan=7)
    lab.set_port("lab", "b", vlan=7)
    assert one.comes_to_reach(other)
    os.kill(lab.processes()[program], signal.SIGKILL)
    assert one.comes_to_reach(other)
    assert f"{program} was ended by signal 9" in lab.log()
    lab.set_port("lab", "b", vlan=8)
    assert one.ceases_to_reach(other)


def test_clients_that_say_nothing_are_reached_after_a_kill(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    to_other = frame(other.mac, one.mac, payload=b"are you there?")
    # It is not to ask who was there.
    other.run("ip", "neighbour", "flush", "dev", "eth0")
    os.kill(lab.processes()["ovs-vswitchd"], signal.SIGKILL)
    assert comes_sooner_or_later(one, other, to_other)
    # Another client at the port is another one: nobody knows it yet.
    lab.ctl("disconnect", "lab", "b")
    os.kill(lab.processes()["ovs-vswitchd"], signal.SIGKILL)
    third = lab.client("lab", "b")
    to_all, at_last = (frame(EVERYBODY, one.mac, payload=said) for said in (b"all", b"at last"))
    assert comes_sooner_or_later(one, third, to_all)
    to_third = frame(third.mac, one.mac, payload=b"who are you?")
    for sent in (to_other, to_third, at_last):
        one.send(sent)
    third.expect(at_last)
    # Those before would have come by then.
    third.expect_none(lambda came: came in (to_other, to_third), timeout=0)
    assert third.comes_to_reach(one)
    # What Open vSwitch remembers of such frames goes a little later.
    assert comes_sooner_or_later(one, third, to_third)


def test_clients_that_say_nothing_are_reached_after_the_daemon_is_killed(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    to_other = frame(other.mac, one.mac, payload=b"are you there?")
    other.run("ip", "neighbour", "flush", "dev", "eth0")
    assert comes_true(lambda: len(remembered(lab)) == 2)
    lab.stop(signal.SIGKILL)
    lab.start()
    assert comes_sooner_or_later(one, other, to_other)
    # What was put where the bridge learns by itself was not learned.
    (socket,) = lab.run_folder().glob("vs*.mgmt")
    put = "table=31,priority=100,dl_dst=02:00:00:00:00:99,actions=drop"
    lab.host.run("ovs-ofctl", "-OOpenFlow15", "add-flow", f"unix:{socket}", put)
    lab.ctl("disconnect", "lab", "b")
    assert comes_true(lambda: remembered(lab) == [one.mac])


def remembered(lab: Lab) -> List[str]:
    """The addresses of the state that the data path learned."""
    state = sqlite3.connect(lab.state)
    rows = state.execute("SELECT mac FROM remembered").fetchall()
    state.close()
    return sorted(mac.hex(":") for (mac,) in rows)


def test_a_killed_daemon_leaves_nothing_running_and_another_takes_over(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    lab.stop(signal.SIGKILL)
    lab.start()
    assert len(lab.processes()) == 2
    assert one.comes_to_reach(other)
    lab.stop()
    assert not lab.processes()


# Flows of many kinds.
SETTINGS = {
    "switches": [
        {
            "alias": "lab",
            "teaming": {"balance": "mac", "active": ["nic0", "nic1"]},
            "mac_learning": {"aging_time": 70000, "limit": 50},
            "private_vlans": [
                {"primary": 70, "secondary": 70, "type": "promiscuous"},
                {"primary": 70, "secondary": 71, "type": "isolated"},
            ],
            "ports": [
                {
                    "id": "a",
                    "mirror_sessions": [
                        {"sid": "m", "to": [{"port": "c"}], "sent_by": [{"port": "a"}]}
                    ],
                },
                {
                    "id": "c",
                    "vlan": {"trunk": ["7-9"]},
                    "mac_learning": {"learning": True, "limit": 5, "limit_policy": "drop"},
                },
                {
                    "id": "d",
                    "vlan": {"id": 71, "private": True},
                    "forbids": ["forged_transmits", "mac_changes"],
                    "teaming": {"balance": "ip"},
                },
            ],
        }
    ]
}


def test_a_restart_changes_no_flow_of_an_open_vswitch_that_stays(idle: Lab) -> None:
    idle.apply(SETTINGS)
    idle.network("nic0", "nic1")
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        one, other = idle.client("lab", "a"), idle.client("lab", "b")
        for port in "cd":
            idle.client("lab", port)
        assert one.comes_to_reach(other)
        with GoingFrames(one, other):
            idle.stop()
            # They are counted without it, too.
            come_to_count_more(idle)
            said, before = idle.log(), counted(idle)
            idle.start(open_vswitch.where)
            assert "in force" not in idle.log().replace(said, "")
            kept(before, counted(idle))
            # An unrelated change leaves what was counted and learned alone.
            idle.set_port("lab", "e", vlan=9)
            kept(before, counted(idle))


def test_an_open_vswitch_that_stays_may_be_started_anew(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        one, other = idle.client("lab", "a"), idle.client("lab", "b")
        assert one.comes_to_reach(other)
        vlan = 0
        for programs in (
            ("ovs-vswitchd",),
            ("ovsdb-server",),
            ("ovs-vswitchd", "ovsdb-server"),
        ):
            open_vswitch.start_anew(*programs)
            assert one.comes_to_reach(other)
            vlan += 1
            idle.set_port("lab", "a", vlan=vlan)
            assert one.ceases_to_reach(other)
            idle.set_port("lab", "b", vlan=vlan)
            assert one.comes_to_reach(other)


def test_frames_that_do_not_go_on_are_missed(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    with pytest.raises(AssertionError, match="frames did not come"):
        with GoingFrames(one, other, patience=0.1):
            lab.set_port("lab", "a", vlan=7)
            lab.set_port("lab", "a", vlan=0)


def come_to_count_more(lab: Lab) -> None:
    before = sum(counted(lab).values())
    assert comes_true(lambda: sum(counted(lab).values()) > before)


def counted(lab: Lab) -> Dict[str, int]:
    """How many frames each flow counted, but for the one that says which change is in force, and
    those that are there for a while."""
    found = (re.fullmatch(r"(.*), n_packets=(\d+), n_bytes=\d+(.*)", one) for one in lab.flows())
    flows = {one.group(1) + one.group(3): int(one.group(2)) for one in found if one}
    left_out = re.compile("table=250|_timeout=")
    return {flow: count for flow, count in flows.items() if not left_out.search(flow)}


def kept(before: Dict[str, int], after: Dict[str, int]) -> None:
    assert before.keys() == after.keys()
    assert any(before.values())
    assert all(after[flow] >= count for flow, count in before.items())


def test_a_second_daemon_says_who_is_there(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        assert idle.daemon is not None
        second = idle.simhostd(open_vswitch.where, stderr=subprocess.PIPE)
        _, said = second.communicate()
        assert second.returncode == 1
        assert said == (f"simhostd: the process {idle.daemon.pid} has {idle.state}-simhostd.lock\n")


@pytest.mark.parametrize(
    "file",
    [
        "/usr/bin/ovsdb-tool",
        "/usr/sbin/ovsdb-server",
        "/usr/sbin/ovs-vswitchd",
        "/usr/share/openvswitch/vswitch.ovsschema",
    ],
)
def test_without_its_package_it_says_which(idle: Lab, file: str) -> None:
    # The daemon sees something else in place of the file.
    hide = 'mount --bind /dev/null "$0" && exec "$@"'
    done = idle.host.try_run(
        *("unshare", "--mount", "sh", "-c", hide, file),
        *(str(TOOLS / "simhostd"), "--state", str(idle.state)),
        *("--openvswitch", f"private:{idle.run_folder()}"),
    )
    assert done.returncode == 1
    assert done.stdout == (
        "simhostd: a private Open vSwitch needs Debian's package openvswitch-switch: "
        f"there is no {file}\n"
    )
    assert idle.plane()["change"] is None


def test_a_device_may_vanish_and_return(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    lab.host.run("ip", "link", "delete", "c1")
    assert one.ceases_to_reach(other)
    said = "there is no device c1\n"
    assert comes_true(lambda: said in lab.ctl("plane"))
    assert said in lab.log()
    lab.wire("c1", one.namespace, "eth0")
    one.set_up()
    assert one.comes_to_reach(other)
    assert comes_true(lambda: said not in lab.ctl("plane"))


def test_a_device_may_vanish_and_return_while_another_change_is_made(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    with held_up(lab):
        lab.client("lab", "c")
        remake(lab, one)
    assert one.comes_to_reach(other)
    lab.host.run("ip", "link", "delete", "c1")
    assert one.ceases_to_reach(other)
    with held_up(lab):
        lab.set_port("lab", "c", vlan=9)
        remake(lab, one)
    assert one.comes_to_reach(other)


@contextlib.contextmanager
def held_up(lab: Lab) -> Iterator[None]:
    """With an Open vSwitch that does nothing, so that whoever tells it something waits."""
    switch = lab.processes()["ovs-vswitchd"]
    os.kill(switch, signal.SIGSTOP)
    try:
        yield
    finally:
        os.kill(switch, signal.SIGCONT)


def remake(lab: Lab, client: Client) -> None:
    """Its device, under the name of the one that it may still have."""
    lab.host.try_run("ip", "link", "delete", "c1")
    lab.wire("c1", client.namespace, "eth0")
    client.set_up()


def test_a_device_that_is_not_there_is_refused(lab: Lab) -> None:
    change = lab.plane()["change"]
    done = lab.try_ctl("connect", "lab", "a", "nowhere0")
    assert done.returncode == 1
    assert done.stdout == ("simhostctl: simhostd sees no device nowhere0 (QEX_NOT_FOUND)\n")
    assert lab.plane()["change"] == change


def test_a_caller_that_is_killed_leaves_old_or_new(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    program = (
        "import itertools\n"
        "from libvswitch import checked\n"
        "print(flush=True)\n"
        "for mtu in itertools.cycle((1500, 1600)): checked.VSDVS_SetMTU('lab', mtu)"
    )
    caller = subprocess.Popen(
        ["/usr/bin/python3", "-c", program], env=lab.environment, stdout=subprocess.PIPE
    )
    assert caller.stdout is not None and caller.stdout.readline()
    assert one.comes_to_reach(other)
    caller.kill()
    caller.communicate()
    assert one.comes_to_reach(other)
    # What it wrote last is on its way.
    assert comes_true(lab.is_in_force)


# No flows can be made of such a session; it is accepted where no frames go.
FAR_SESSION = {
    "sid": "far",
    "type": "encapsulated",
    "to": [{"ip": "192.0.2.1"}],
    "encapsulation": {"type": "gre", "key": 9},
}


def test_a_switch_that_cannot_be_run_goes_on_as_it_was(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    assert one.comes_to_reach(other)
    spare = {"alias": "spare", "ports": [{"id": "s", "mirror_sessions": [FAR_SESSION]}]}
    second = {"alias": "second", "ports": [{"id": "x"}, {"id": "y"}]}
    lab.apply({"switches": [spare, second]})
    third, fourth = lab.client("second", "x"), lab.client("second", "y")
    move_mirror_sessions(lab, "s", "a")
    why = "the switch 'lab' cannot be run: the mirror session 'far'"
    assert comes_true(lambda: why in lab.plane()["said"])
    assert lab.log().count(why) == 1
    assert one.comes_to_reach(other)
    assert third.comes_to_reach(fourth)
    # The others can be changed, but not into such a one.
    lab.set_port("second", "x", vlan=8)
    assert lab.is_in_force() and third.ceases_to_reach(fourth)
    refused_far_session(lab, "second", "x")
    # So can it be itself.
    lab.set_port("lab", "a", vlan=7)
    assert one.comes_to_reach(other)
    lab.set_port("lab", "a", mirror_sessions=[])
    assert not lab.plane()["said"] and lab.is_in_force()
    assert one.ceases_to_reach(other)
    refused_far_session(lab, "lab", "a")


# Of a daemon that goes wrong with switches of these MTUs.
PLANTED_FAULTS = {
    6001: "a fault planted in the compiler",
    6002: "the name of a selection method has at most 15 characters",
    6003: "the switch refuses to add group",
}


def test_a_switch_with_which_something_is_wrong_stops_no_other(
    idle: Lab, monkeypatch: pytest.MonkeyPatch
) -> None:
    with_faults = TOOLS.parent / "tests" / "simhost" / "simhostd_with_faults"
    monkeypatch.setattr("simhost._loaded.program", lambda *_, **__: with_faults)
    idle.start()
    idle.apply({"switches": [{"alias": "second", "ports": [{"id": "x"}, {"id": "y"}]}]})
    one, other = idle.client("lab", "a"), idle.client("lab", "b")
    third, fourth = idle.client("second", "x"), idle.client("second", "y")
    assert one.comes_to_reach(other) and third.comes_to_reach(fourth)
    for mtu, why in PLANTED_FAULTS.items():
        idle.apply({"switches": [{"alias": "lab", "mtu": mtu, "multicast": "snooping"}]})
        said = f"the switch 'lab' cannot be run: {why}"
        assert comes_true(lambda: said in idle.plane()["said"] and idle.is_in_force())
        # What frames obey is as it was.
        assert multicast_mode(idle) == "legacy"
        # The others can be changed.
        idle.set_port("second", "x", vlan=8)
        assert third.ceases_to_reach(fourth)
        idle.set_port("second", "x", vlan=0)
        assert third.comes_to_reach(fourth)
        assert one.comes_to_reach(other)
        assert idle.log().count(said) == 1
    # So can it be itself, into one with which nothing is wrong.
    idle.apply({"switches": [{"alias": "lab", "mtu": 1500, "ports": [{"id": "a", "vlan": 7}]}]})
    assert comes_true(lambda: idle.is_in_force() and not idle.plane()["said"])
    assert one.ceases_to_reach(other)
    assert multicast_mode(idle) == "snooping"


def multicast_mode(lab: Lab) -> str:
    """The one that frames obey."""
    asked = "checked.VSQEX_GetMcastFilterMode('lab').name"
    return lab.python(f"from libvswitch import checked; print({asked})").strip().lower()


def test_a_switch_with_devices_at_uplinks_alone_is_not_made_unfit(lab: Lab) -> None:
    lab.network("nic0")
    refused_far_session(lab, "lab", "a")


def refused_far_session(lab: Lab, switch: str, port: str) -> None:
    """With nothing changed."""
    before = lab.plane()["change"]
    ports = [{"id": port, "mirror_sessions": [FAR_SESSION]}]
    document = json.dumps({"switches": [{"alias": switch, "ports": ports}]})
    done = lab.try_ctl("apply", "-", given=document)
    assert done.returncode == 1
    assert "the mirror session 'far'" in done.stdout
    assert lab.plane()["change"] == before


def move_mirror_sessions(lab: Lab, one: str, other: str) -> None:
    """From one port to another, as no call can."""
    state = sqlite3.connect(lab.state)
    moved = state.execute(
        "UPDATE property SET (switch, port) ="
        " (SELECT switch, number FROM port WHERE identifier = ?)"
        " WHERE name = 'com.quorix.vswitch.port.mirrorSessions' AND port ="
        " (SELECT number FROM port WHERE identifier = ?)",
        (other, one),
    )
    assert moved.rowcount == 1
    state.commit()
    state.close()
