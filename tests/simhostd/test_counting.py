"""What frames leave behind: counters, exact, whatever ends or changes in between."""

import itertools
import json
import os
import signal
import socket
import sqlite3
import subprocess
from typing import Any, Dict, List, Set, Tuple

import pytest

from counted_frames import (
    BROADCAST,
    IN_VLAN_5,
    IN_VLAN_7,
    LENGTH,
    MULTICAST,
    PLAIN,
    come_to,
    counters,
    expect_from,
    send,
)
from frame_lab import TOOLS, Lab, comes_true, learned_ages
from lasting_open_vswitch import LastingOpenVSwitch


def test_frames_count_where_they_come_in_and_go_out(lab: Lab) -> None:
    one, other, _ = (lab.client("lab", port) for port in "abc")
    send(other, 1, BROADCAST)
    expect_from(one, other.mac)
    send(one, 5, other.mac)
    send(one, 3, BROADCAST)
    send(one, 2, MULTICAST)
    come_to(
        lambda: counters(lab, "a"),
        {
            **{"pktsInUnicast": 5, "bytesInUnicast": 5 * LENGTH},
            **{"pktsInBroadcast": 3, "bytesInBroadcast": 3 * LENGTH},
            **{"pktsInMulticast": 2, "bytesInMulticast": 2 * LENGTH},
            **{"pktsOutBroadcast": 1, "bytesOutBroadcast": LENGTH},
        },
    )
    come_to(
        lambda: counters(lab, "b"),
        {
            **{"pktsInBroadcast": 1, "bytesInBroadcast": LENGTH},
            **{"pktsOutUnicast": 5, "bytesOutUnicast": 5 * LENGTH},
            **{"pktsOutBroadcast": 3, "bytesOutBroadcast": 3 * LENGTH},
            **{"pktsOutMulticast": 2, "bytesOutMulticast": 2 * LENGTH},
        },
    )
    come_to(
        lambda: counters(lab, "c"),
        {
            **{"pktsOutBroadcast": 4, "bytesOutBroadcast": 4 * LENGTH},
            **{"pktsOutMulticast": 2, "bytesOutMulticast": 2 * LENGTH},
        },
    )


def test_what_is_not_let_in_is_dropped(lab: Lab) -> None:
    lab.set_port("lab", "a", forbids=["forged_transmits"])
    one = lab.client("lab", "a")
    lab.ctl("connect", "lab", "a", "c1", "--mac", one.mac)
    send(one, 1, BROADCAST)
    send(one, 4, BROADCAST, head=IN_VLAN_5)
    send(one, 2, "01:80:c2:00:00:0e")
    send(one, 3, BROADCAST, source="02:00:00:00:99:99")
    counted = {"pktsInBroadcast": 1, "bytesInBroadcast": LENGTH}
    come_to(lambda: counters(lab, "a"), {**counted, "pktsInDropped": 9})
    lab.set_port("lab", "a", blocked=True)
    send(one, 2, BROADCAST)
    come_to(lambda: counters(lab, "a"), {**counted, "pktsInDropped": 11})


def traffic(**rows: Tuple[int, int]) -> Dict[str, int]:
    """Counters of so many frames of that length each, by where they went and to whom."""
    counted: Dict[str, int] = {}
    for name, (frames, length) in rows.items():
        counted.update({f"pkts{name}": frames, f"bytes{name}": frames * length})
    return counted


def test_frames_count_at_ports_of_every_kind(lab: Lab) -> None:
    kinds: Dict[str, Dict[str, Any]] = {
        "access": {"vlan": 5},
        "trunk": {"vlan": {"trunk": [5]}, "nested_tag": True},
        "curious": {"vlan": 5, "ethernet_filter": {"frames": ["promiscuous"]}},
        "isolated": {"vlan": 71},
        "alone": {"vlan": 71},
        "server": {"vlan": 70},
    }
    private = [
        {"primary": 70, "secondary": secondary, "type": kind}
        for secondary, kind in ((70, "promiscuous"), (71, "isolated"))
    ]
    ports = [{"id": port, **settings} for port, settings in kinds.items()]
    lab.apply({"switches": [{"alias": "lab", "private_vlans": private, "ports": ports}]})
    macs = {port: f"02:00:00:00:00:0{number}" for number, port in enumerate(kinds, 1)}
    clients = {port: lab.frames.client("lab", port, mac=mac) for port, mac in macs.items()}
    # A second tag may not leave at the others. Once one without has passed, Open vSwitch would take
    # these for such.
    send(clients["trunk"], 2, BROADCAST, head=IN_VLAN_5[:8] + IN_VLAN_7)
    send(clients["trunk"], 3, BROADCAST, head=IN_VLAN_5)
    send(clients["access"], 4, macs["trunk"])
    send(clients["access"], 5, macs["trunk"], head=IN_VLAN_5)
    send(clients["isolated"], 6, BROADCAST)
    from_trunk = {"OutBroadcast": (3, LENGTH)}
    wanted = {
        "access": {**traffic(InUnicast=(4, LENGTH), **from_trunk), "pktsInDropped": 5},
        "trunk": traffic(InBroadcast=(5, LENGTH), OutUnicast=(4, LENGTH)),
        "curious": traffic(OutUnicast=(4, LENGTH), **from_trunk),
        "isolated": traffic(InBroadcast=(6, LENGTH)),
        "alone": {},
        "server": traffic(OutBroadcast=(6, LENGTH)),
    }
    come_to(lambda: {port: counters(lab, port) for port in kinds}, wanted)


def test_a_frame_that_is_too_large_counts_and_goes_nowhere(lab: Lab) -> None:
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    for near, client in (("c1", one), ("c2", other)):
        lab.host.run("ip", "link", "set", near, "mtu", "2000")
        client.namespace.run("ip", "link", "set", "eth0", "mtu", "2000")
    head = bytes.fromhex((BROADCAST + one.mac).replace(":", "") + PLAIN)
    # The MTU, with a header of Ethernet, and one byte more.
    whole, larger = (head.ljust(length, b".") for length in (1514, 1515))
    for sent in (larger, whole):
        one.send(sent)
    other.expect(whole)
    other.expect_none(larger, timeout=0)
    for port, way in (("a", "In"), ("b", "Out")):
        counted = {f"pkts{way}Broadcast": 2, f"bytes{way}Broadcast": 1514 + 1515}
        come_to(lambda: counters(lab, port), counted)


def come_to_count(lab: Lab, frames: int) -> None:
    """What port a was let send, to all."""
    counted = {"pktsInBroadcast": frames, "bytesInBroadcast": frames * LENGTH}
    come_to(lambda: counters(lab, "a"), counted if frames else {})


def test_counters_go_on_when_flows_and_processes_begin_anew(lab: Lab) -> None:
    one = lab.client("lab", "a")
    send(one, 3, BROADCAST)
    come_to_count(lab, 3)
    lab.ctl("disconnect", "lab", "a")
    come_to_count(lab, 3)
    lab.ctl("connect", "lab", "a", "c1")
    send(one, 4, BROADCAST)
    come_to_count(lab, 7)
    os.kill(lab.processes()["ovs-vswitchd"], signal.SIGKILL)
    come_to_count(lab, 7)
    come_to(lambda: lab.processes().keys(), {"ovs-vswitchd", "ovsdb-server"})
    lab.set_port("lab", "a", vlan=7)
    assert comes_true(lab.is_in_force)
    send(one, 5, BROADCAST)
    come_to_count(lab, 12)


def test_counters_go_on_when_the_database_begins_anew(lab: Lab) -> None:
    one = lab.client("lab", "a")
    send(one, 3, BROADCAST)
    come_to_count(lab, 3)
    killed = lab.processes()["ovsdb-server"]
    os.kill(killed, signal.SIGKILL)
    come_to(lambda: lab.processes().keys(), {"ovs-vswitchd", "ovsdb-server"})
    assert comes_true(lambda: lab.processes().get("ovsdb-server") not in (None, killed))
    lab.set_port("lab", "a", vlan=7)
    assert comes_true(lab.is_in_force)
    send(one, 4, BROADCAST)
    come_to_count(lab, 7)


def test_counters_go_on_when_the_daemon_does(lab: Lab) -> None:
    one = lab.client("lab", "a")
    send(one, 3, BROADCAST)
    come_to_count(lab, 3)
    lab.stop()
    # What was known at the end.
    come_to_count(lab, 3)
    lab.start()
    send(one, 4, BROADCAST)
    come_to_count(lab, 7)


def test_counters_of_a_restarted_host_begin_anew(lab: Lab) -> None:
    one = lab.client("lab", "a")
    send(one, 3, BROADCAST)
    come_to_count(lab, 3)
    lab.ctl("restart")
    come_to_count(lab, 0)
    send(one, 2, BROADCAST)
    come_to_count(lab, 2)


def test_counters_do_not_fall_when_a_daemon_with_its_own_open_vswitch_is_killed(lab: Lab) -> None:
    one = lab.client("lab", "a")
    send(one, 3, BROADCAST)
    come_to_count(lab, 3)
    # What has been put into the state is there whatever becomes of the daemon.
    assert comes_true(lambda: 3 in kept_counts(lab))
    lab.stop(signal.SIGKILL)
    come_to_count(lab, 3)
    lab.start()
    come_to_count(lab, 3)
    send(one, 4, BROADCAST)
    come_to_count(lab, 7)


def kept_counts(lab: Lab) -> Set[int]:
    """The values of counters in the state."""
    state = sqlite3.connect(lab.state)
    rows = state.execute("SELECT value FROM counter").fetchall()
    state.close()
    return {value for (value,) in rows}


def test_what_an_open_vswitch_that_stays_counts_without_a_daemon_is_counted(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as lasting:
        idle.start(lasting.where)
        one = idle.client("lab", "a")
        send(one, 3, BROADCAST)
        come_to_count(idle, 3)
        idle.stop(signal.SIGKILL)
        send(one, 4, BROADCAST)
        idle.start(lasting.where)
        come_to_count(idle, 7)


AT_A, AT_NIC0, IN_VLAN = {"port": "a"}, {"uplink": "nic0"}, {"vlan": 7}
TO_B, TO_C, TO_NOBODY = {"port": "b"}, {"port": "c"}, {"port": "d"}
# What they copy of three frames from port a and two from beyond nic0, all of VLAN 7.
SESSIONS: Dict[str, Tuple[Dict[str, Any], Dict[str, int]]] = {
    "of a port": ({"sent_by": [AT_A]}, {"mirroredPkts": 3, "mirrorPktCnt": 3}),
    "to a port": ({"received_by": [AT_A]}, {"mirroredPkts": 2, "mirrorPktCnt": 2}),
    "both ways": (
        {"sent_by": [AT_A], "received_by": [AT_A]},
        {"mirroredPkts": 5, "mirrorPktCnt": 5},
    ),
    "of a VLAN": ({"sent_by": [IN_VLAN]}, {"mirroredPkts": 3, "mirrorPktCnt": 3}),
    "to a VLAN": ({"received_by": [IN_VLAN]}, {"mirroredPkts": 2, "mirrorPktCnt": 2}),
    "to an uplink": ({"sent_by": [AT_NIC0]}, {"mirroredPkts": 3, "mirrorPktCnt": 3}),
    "of an uplink": ({"received_by": [AT_NIC0]}, {"mirroredPkts": 2, "mirrorPktCnt": 2}),
    "cut": ({"sent_by": [AT_A], "snap_length": 20}, {"mirroredPkts": 3, "mirrorPktCnt": 3}),
    "to two": (
        {"sent_by": [AT_A], "to": [TO_B, TO_C]},
        {"mirroredPkts": 3, "mirrorPktCnt": 6},
    ),
    "to one of two": (
        {"sent_by": [AT_A], "to": [TO_B, TO_NOBODY]},
        {"mirroredPkts": 3, "mirrorPktCnt": 3},
    ),
    "to nobody": ({"sent_by": [AT_A], "to": [TO_NOBODY]}, {"discardedPkts": 3}),
    "disabled": ({"sent_by": [AT_A], "disabled": True}, {}),
}


def test_mirror_sessions_count_what_they_copy(lab: Lab) -> None:
    beyond = lab.network("nic0").client()
    one, *_ = (lab.client("lab", port) for port in "abc")
    for port in "bcd":
        lab.set_port("lab", port, vlan=99)
    sessions = [{"sid": sid, "to": [TO_B], **said} for sid, (said, _) in SESSIONS.items()]
    lab.set_port("lab", "a", vlan=7, mirror_sessions=sessions)

    def counted() -> Any:
        (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
        return switch["mirror_counters"]

    send(one, 3, BROADCAST)
    send(beyond, 2, BROADCAST, head=IN_VLAN_7)
    come_to(counted, {sid: values for sid, (_, values) in SESSIONS.items() if values})
    # Copies are none of what is sent out at a port.
    assert counters(lab, "b") == {}


REFUSED = "simhostctl: {} has the device {}: what comes over it cannot be set (QEX_NOT_SUPPORTED)\n"


def test_no_counter_of_what_has_a_device_is_set(idle: Lab) -> None:
    idle.ctl("connect", "lab", "a", "c1")
    port = REFUSED.format("the port 'a' of the switch 'lab'", "c1")

    def said(*words: str) -> str:
        return idle.try_ctl("counter", "lab", *words).stdout

    assert said("pktsInUnicast", "7", "--port", "a") == port
    assert said("mirroredPkts", "7", "--session", "s") == port
    # These have no device, and nothing that one brings.
    assert said("pktsInUnicast", "7", "--port", "b") == ""
    assert said("rarpPktsSent", "7") == ""
    idle.ctl("uplink", "nic0", "--device", "u0")
    uplink = REFUSED.format("the uplink 'nic0'", "u0")
    (switch,) = json.loads(idle.ctl("show", "--json"))["switches"]
    (at,) = (one["id"] for one in switch["uplink_ports"] if one["uplink"] == "nic0")
    assert said("pktsInUnicast", "7", "--port", at) == uplink
    assert said("rarpPktsSent", "7") == uplink
    assert counters(idle, "b") == {"pktsInUnicast": 7}


def test_an_address_that_moves_counts_where_it_comes_to(lab: Lab) -> None:
    learns = {"learning": True, "flooding": True}
    for port in "ab":
        lab.set_port("lab", port, mac_learning=learns)
    one, other = lab.client("lab", "a"), lab.client("lab", "b")
    moving = "02:00:00:00:77:01"
    send(one, 1, BROADCAST, source=moving)
    expect_from(other, moving)
    send(other, 1, BROADCAST, source=moving)
    come_to(lambda: counters(lab, "b").get("numMACsMoved"), 1)
    assert "numMACsMoved" not in counters(lab, "a")


def ages(lab: Lab) -> Dict[str, int]:
    return learned_ages(lab, "a")


@pytest.mark.parametrize("learns", [{}, {"mac_learning": {"learning": True, "flooding": True}}])
def test_an_address_is_as_old_as_its_last_frame(lab: Lab, learns: Dict[str, Any]) -> None:
    lab.set_port("lab", "a", **learns)
    at_port, beyond = lab.client("lab", "a"), lab.network("nic0", "nic1").client()
    seen, unseen = "02:00:00:00:77:01", "02:00:00:00:77:02"
    client = at_port if learns else beyond
    send(client, 1, BROADCAST, source=seen)
    send(client, 1, BROADCAST, source=unseen)
    assert comes_true(lambda: ages(lab).get(seen, 0) > 0 and ages(lab).get(unseen, 0) > 0)

    def is_young_again() -> bool:
        send(client, 1, BROADCAST, source=seen)
        return ages(lab)[seen] == 0

    assert comes_true(is_young_again)
    assert ages(lab)[unseen] > 0


ASKS = """
from libvswitch import checked
checked.VSQEX_GetUplinks("lab"), checked.VSQEX_GetUplinkLinkState("lab", "nic0")
checked.VSDVS_GetMTU("lab"), checked.VSQEX_GetRARPStats("lab"), checked.VSQEX_GetVSInfo("lab")
checked.VSQEX_GetPortMACTable("lab", "b", 0)
"""


def test_only_what_frames_leave_behind_is_asked_of_the_daemon(
    idle: Lab, monkeypatch: pytest.MonkeyPatch
) -> None:
    idle.start()
    idle.client("lab", "a")
    idle.stop()
    with socket.socket(socket.AF_UNIX) as line:
        # An address of a socket is short.
        monkeypatch.chdir(idle.folder)
        line.bind(f"{idle.state.name}-simhostd")
        line.listen()
        line.setblocking(False)
        idle.python(ASKS)
        with pytest.raises(BlockingIOError):
            line.accept()
        # It hangs up on whoever asks; they are told what was known last.
        asking = subprocess.Popen([TOOLS / "simhostctl", "show"], env=idle.environment)
        while asking.poll() is None:
            try:
                line.settimeout(0.1)
                line.accept()[0].close()
            except socket.timeout:
                pass
        assert asking.returncode == 0


@pytest.mark.parametrize(
    "words, said",
    [
        (["show"], "switch lab: 3 of 128 ports"),
        # It asks before what it changes is in the state, and after that.
        (["disconnect", "lab", "a"], ""),
    ],
)
def test_a_daemon_that_says_nothing_is_waited_for_once(
    idle: Lab, monkeypatch: pytest.MonkeyPatch, words: List[str], said: str
) -> None:
    idle.start()
    for port in "abc":
        idle.client("lab", port)
    idle.stop()
    with socket.socket(socket.AF_UNIX) as line:
        monkeypatch.chdir(idle.folder)
        line.bind(f"{idle.state.name}-simhostd")
        line.listen()
        assert said in idle.ctl(*words)
        line.setblocking(False)
        with line.accept()[0], pytest.raises(BlockingIOError):
            line.accept()


@pytest.mark.parametrize("forbids", [[], ["forged_transmits"]])
def test_what_is_remembered_of_frames_outlasts_what_others_teach(
    lab: Lab, forbids: List[str]
) -> None:
    """What goes by it while it is forgotten may not be counted."""
    database = f"--db=unix:{lab.run_folder()}/db.sock"
    # However long it takes to look at it.
    settings = ["set", "Open_vSwitch", ".", "other_config:max-revalidator=9000"]
    lab.host.run("ovs-vsctl", database, *settings)
    learning = {"learning": True, "flooding": True, "limit": 4096, "limit_policy": "drop"}
    lab.set_port("lab", "a", forbids=forbids, mac_learning=learning)
    lab.set_port("lab", "b", mac_learning=learning)
    one, other = lab.client("lab", "a"), lab.client("lab", "b")

    def frames_in() -> int:
        found = counters(lab, "a")
        return found.get("pktsInBroadcast", 0) + found.get("pktsInDropped", 0)

    def send_from(source: str) -> None:
        wanted = frames_in() + 1
        send(one, 1, BROADCAST, source=source)
        come_to(frames_in, wanted)

    send_from(one.mac)
    numbers = itertools.count()

    def is_kept() -> bool:
        number = next(numbers)
        source, teacher = (f"02:00:00:00:{where}:{number:02x}" for where in ("66", "67"))
        send_from(source)
        send(other, 1, BROADCAST, source=teacher)
        expect_from(one, teacher)
        lab.have_counted()
        return f"src={source}" in lab.control("dpctl/dump-flows")

    # A setting that comes late may have it looked up anew, once.
    assert comes_true(is_kept)
