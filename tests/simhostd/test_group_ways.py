"""Frames of groups where clients tag, in private VLANs, over several uplinks, and while no daemon
is there."""

import ipaddress
import signal
import sys
from typing import Callable

import group_frames as frames
import pytest
from frame_lab import Lab, comes_true
from going_frames import GoingFrames
from group_clients import SENDER, Clients
from lasting_open_vswitch import LastingOpenVSwitch

GROUP, OTHER_GROUP, IPV6_GROUP = "239.1.1.1", "239.2.2.2", "ff15::101"
GROUP_BYTES = ipaddress.ip_address(GROUP).packed


def is_asked(came: bytes) -> bool:
    """Whether a frame, with whatever tag, asks about the group."""
    untagged = came[:12] + came[16:] if came[12:14] == b"\x81\0" else came
    return frames.is_query(untagged) and GROUP_BYTES in untagged


@pytest.fixture
def clients(lab: Lab) -> Clients:
    sender, one, other = (lab.client("lab", port) for port in "abc")
    return Clients(lab, sender=sender, one=one, other=other)


def test_a_client_that_tags_is_a_member_where_it_says_so(clients: Clients) -> None:
    clients.lab.set_port("lab", "a", vlan={"trunk": [7, 8]})
    clients.lab.set_port("lab", "b", vlan={"trunk": ["7-4094"]})
    clients.lab.set_port("lab", "c", vlan=8)
    clients.mode("igmp", IGMPQueries=1)
    clients.says("one", frames.joins, GROUP, vlan=7)
    assert clients.comes_to_get("one:7", GROUP, vlan=7, told=["one"])
    assert clients.comes_to_get("", GROUP, vlan=8)
    clients.says("one", frames.joins, GROUP, vlan=8)
    clients.says("other", frames.joins, GROUP)
    assert clients.comes_to_get("one:8 other", GROUP, vlan=8)
    assert clients.gets(GROUP, sender="other") == "one:8"
    # In each VLAN it leaves by itself, and is asked there.
    clients.says("one", frames.leaves, GROUP, vlan=7)
    asked = clients.hears("one", is_asked)
    assert asked[12:16] == bytes.fromhex("81000007")
    assert clients.comes_to_get("", GROUP, vlan=7, told=["one"])
    assert clients.gets(GROUP, vlan=8) == "one:8 other"


def test_members_in_private_vlans_get_what_they_may(clients: Clients) -> None:
    kinds = {100: "promiscuous", 101: "isolated"}
    private = [{"primary": 100, "secondary": vlan, "type": kind} for vlan, kind in kinds.items()]
    ports = [
        {"id": port, "vlan": {"id": vlan, "private": True}}
        for port, vlan in (("a", 100), ("b", 101), ("c", 101))
    ]
    clients.lab.apply({"switches": [{"alias": "lab", "private_vlans": private, "ports": ports}]})
    clients.mode("igmp", IGMPQueries=1)
    clients.says("one", frames.joins, GROUP)
    assert clients.comes_to_get("one", GROUP)
    clients.says("sender", frames.joins, GROUP)
    clients.says("other", frames.joins, GROUP)
    assert clients.comes_to_get("one other", GROUP)
    # What is isolated reaches no other that is.
    for isolated in "one", "other":
        assert clients.gets(GROUP, sender=isolated, told=["sender"]) == "sender"
        assert clients.gets(OTHER_GROUP, sender=isolated, told=["sender"]) == ""
    clients.says("one", frames.leaves, GROUP)
    clients.hears("one", is_asked)
    assert clients.comes_to_get("other", GROUP)


def test_members_get_one_copy_whatever_the_uplinks(lab: Lab) -> None:
    network = lab.network("nic0", "nic1")
    near, one, other = (lab.client("lab", port) for port in "abc")
    clients = Clients(lab, far=network.client(), near=near, one=one, other=other)
    team = {"balance": "port", "active": ["nic0", "nic1"]}
    lab.apply({"switches": [{"alias": "lab", "teaming": team}]})
    clients.mode("igmp", IGMPQueries=1)
    clients.says("one", frames.joins, GROUP)
    report = clients.says("other", frames.joins, GROUP)
    clients.hears("far", report)
    assert clients.comes_to_get("one other", GROUP)
    assert clients.gets(OTHER_GROUP) == ""
    # The network may send back over one uplink what it got over the other.
    for sender in "near", "one", "other":
        sent = clients.sends(sender, GROUP)
        assert clients.comes_to_get("one other", GROUP)
        assert clients.have_got(sent) == "far " + " ".join(
            member for member in ("one", "other") if member != sender
        )
    for uplink in "nic0", "nic1":
        network.pull(uplink)
        assert clients.comes_to_get_again("one other", GROUP)
        network.plug(uplink)
        assert clients.comes_to_get_again("one other", GROUP)
    clients["far"].expect_none(lambda came: came == report, timeout=0)


FLOODS = """
import socket, sys, time
device = socket.socket(socket.AF_PACKET, socket.SOCK_RAW)
device.bind(("eth0", 0))
frame = bytes.fromhex(sys.argv[1])
count = 0
while True:
    for _ in range(100):
        device.send(frame)
    time.sleep(0.005)
    count += 1
    if count == 50:  # by then no meter lets a burst through any more
        print("floods", flush=True)
"""


def test_a_client_that_says_too_much_keeps_no_other_from_being_heard(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1)
    assert clients.comes_to_get("", GROUP)
    report = clients.says("other", frames.joins, GROUP)
    floods = clients["other"].start(sys.executable, "-c", FLOODS, report.hex(), stdout=-1)
    try:
        assert floods.stdout is not None and floods.stdout.readline() == "floods\n"
        groups = [f"239.3.0.{number}" for number in range(20)]
        for group in groups:
            clients.says("one", frames.joins, group)
        for group in groups:
            assert clients.comes_to_get("one", group, told=["one"])
    finally:
        floods.kill()
        floods.communicate()


def sent_up(lab: Lab) -> int:
    """How many frames there were for a daemon."""
    flows = [flow for flow in lab.flows() if "meter:" in flow]
    return sum(int(flow.split("n_packets=")[1].split(",")[0]) for flow in flows)


def going_data(mac: str) -> Callable[[int], bytes]:
    return lambda number: frames.data(mac, SENDER, GROUP, b"going on, %d" % number)


def test_members_go_on_getting_frames_while_a_daemon_starts_anew(idle: Lab) -> None:
    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        sender, one, other = (idle.client("lab", port) for port in "abc")
        clients = Clients(idle, sender=sender, one=one, other=other)
        clients.mode("igmp", IGMPQueryInterval=60, IGMPQueries=10)
        member = clients.has_kernel_join("one", GROUP, IPV6_GROUP)
        assert clients.comes_to_get("one", GROUP)
        clients.says("other", frames.joins, OTHER_GROUP)
        assert clients.comes_to_get("other", OTHER_GROUP)
        with GoingFrames(sender, one, going_data(sender.mac)):
            idle.stop(signal.SIGKILL)
            assert clients.gets(GROUP) == "one"
            assert clients.gets(OTHER_GROUP) == "other"
            idle.have_counted()
            heard = sent_up(idle)
            assert heard > 0
            idle.start(open_vswitch.where)
            # The flows that lead to a daemon are those of before.
            assert sent_up(idle) >= heard
            # By which nobody has long to reply.
            clients.mode("igmp", IGMPQueryInterval=1, IGMPQueries=10)

            def is_known() -> bool:
                got = clients.gets(GROUP)
                assert "one" in got
                return got == "one"

            assert comes_true(is_known)
        # Who says nothing when it is asked is a member no more.
        assert clients.comes_to_get("", OTHER_GROUP)
        member.communicate()
