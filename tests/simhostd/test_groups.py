"""Frames of groups go to their members."""

import ipaddress
import json
import shutil
from concurrent.futures import ThreadPoolExecutor
from typing import Any

import group_frames as frames
import pytest
from frame_lab import Lab, comes_true
from lasting_open_vswitch import LastingOpenVSwitch
from group_clients import SENDER, Clients

GROUP = "239.1.1.1"
OTHER_GROUP = "239.2.2.2"
IPV6_GROUP = "ff15::101"
GROUP_BYTES = ipaddress.ip_address(GROUP).packed
ALL_NODES = ipaddress.ip_address("ff02::1").packed
STRANGER = "198.51.100.8"


@pytest.fixture
def clients(lab: Lab) -> Clients:
    """Of a switch that has had its first replies."""
    sender, one, other = (lab.client("lab", port) for port in "abc")
    return Clients(lab, sender=sender, one=one, other=other)


def test_members_get_frames_and_nobody_else(clients: Clients) -> None:
    assert clients.gets(GROUP) == "one other"
    clients.mode("snooping", IGMPQueries=1)
    # Who had no time to say what they want get all.
    assert clients.gets(GROUP) == "one other"
    clients.says("one", frames.joins, GROUP)
    clients.says("other", frames.joins, IPV6_GROUP)
    assert clients.comes_to_get("one", GROUP)
    assert clients.gets(OTHER_GROUP) == ""
    assert clients.gets(IPV6_GROUP) == "other"
    assert clients.gets("ff15::102") == ""
    for group in ("224.0.0.251", "ff02::1", "ff02::1:ff00:1"):
        assert clients.gets(group) == "one other"
    clients.says("other", frames.joins, GROUP)
    assert clients.comes_to_get("one other", GROUP)
    clients.says("one", frames.leaves, GROUP)
    clients.hears("one", lambda frame: frames.is_query(frame) and GROUP_BYTES in frame)
    assert clients.comes_to_get("other", GROUP)


def test_sources_are_looked_at(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1)
    clients.says("one", frames.reports, frames.IS_INCLUDE, GROUP, [SENDER])
    clients.says("other", frames.reports, frames.IS_EXCLUDE, GROUP, [SENDER])
    assert clients.comes_to_get("one", GROUP, SENDER)
    assert clients.gets(GROUP, STRANGER) == "other"
    # No listener says anything of IPv6.
    assert clients.gets(IPV6_GROUP) == "one other"
    clients.says("other", frames.reports, frames.ALLOW, GROUP, [SENDER])
    clients.says("one", frames.reports, frames.BLOCK, GROUP, [SENDER])
    assert clients.comes_to_get("other", GROUP, SENDER)
    assert clients.gets(GROUP, STRANGER) == "other"


def test_sources_of_ipv6_are_looked_at(clients: Clients) -> None:
    clients.mode("mld", IGMPQueries=1)
    clients.says("one", frames.reports, frames.IS_INCLUDE, IPV6_GROUP, ["2001:db8::7"])
    clients.says("other", frames.reports, frames.IS_EXCLUDE, IPV6_GROUP, ["2001:db8::7"])
    assert clients.comes_to_get("one", IPV6_GROUP)
    assert clients.gets(GROUP) == "one other"
    # Queries come from an address of the link, unless it is said which.
    query = clients.hears("other", frames.is_mld_query)
    assert query[22:30] == bytes.fromhex("fe80000000000000") and query[38:54] == ALL_NODES
    clients.mode("mld", IGMPQueries=1, IGMPQueryInterval=1, MLDRouterIP="fe80::77")
    chosen = ipaddress.ip_address("fe80::77").packed
    clients.hears("other", lambda came: frames.is_mld_query(came) and came[22:38] == chosen)


def test_who_is_silent_is_a_member_no_more(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1, IGMPQueryInterval=1, IGMPRouterIP="192.0.2.1")
    clients.says("one", frames.joins, GROUP)
    assert clients.comes_to_get("one", GROUP)
    query = clients.hears("one", frames.is_query)
    assert query[:6] == bytes.fromhex("01005e000001") and query[26:30] == bytes([192, 0, 2, 1])
    assert clients.comes_to_get("", GROUP)


def test_routers_get_all_groups_and_what_members_say(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1)
    assert clients.comes_to_get("", GROUP)
    clients.says("other", frames.asks, 1)
    assert clients.comes_to_get("other", GROUP)
    report = clients.says("sender", frames.joins, GROUP)
    clients.hears("other", report)
    clients["one"].expect_none(lambda frame: frame == report)
    # It asks no more.
    assert clients.comes_to_get("", GROUP)
    # One that asks nobody says what it is.
    clients.says("other", frames.routes_by_pim)
    assert clients.comes_to_get("other", GROUP)
    clients.says("one", frames.routes)
    assert clients.comes_to_get("one other", GROUP)
    # Those are routers of IPv4.
    clients.mode("mld", IGMPQueries=1)
    assert clients.comes_to_get("", IPV6_GROUP)
    clients.says("other", frames.asks_for_ipv6)
    assert clients.comes_to_get("other", IPV6_GROUP)
    clients.says("one", frames.routes_ipv6)
    assert clients.comes_to_get("one other", IPV6_GROUP)


def test_a_kernel_joins_and_leaves(clients: Clients) -> None:
    clients.mode("snooping", IGMPQueries=1, MLDVersion=1, IGMPVersion=2)
    assert clients.comes_to_get("", GROUP)
    for client in (clients["one"], clients["other"]):
        # Who has no address of the link says nothing of IPv6.
        client.run("sysctl", "-w", "net.ipv6.conf.eth0.disable_ipv6=0")
        client.run("ip", "address", "add", "fe80::2/64", "dev", "eth0", "nodad")
    members = [clients.has_kernel_join(name, GROUP, IPV6_GROUP) for name in ("one", "other")]
    assert clients.comes_to_get("one other", GROUP)
    assert clients.comes_to_get("one other", IPV6_GROUP)
    members.pop().communicate()
    assert clients.comes_to_get("one", GROUP)
    assert clients.comes_to_get("one", IPV6_GROUP)
    members.pop().communicate()


def test_callers_are_told_what_is_joined(clients: Clients) -> None:
    clients.mode("snooping", IGMPQueries=1)
    clients.says("one", frames.reports, frames.IS_INCLUDE, GROUP, [SENDER])
    clients.says("one", frames.joins, IPV6_GROUP)
    assert clients.comes_to_get("one", GROUP)
    of_b, of_c = groups_of_ports(clients)
    ethernet, of_ipv6, of_ipv4, more = (
        [group for group in of_b if group[0] == address]
        for address in (frames.mac_of(GROUP), IPV6_GROUP, GROUP, frames.mac_of(IPV6_GROUP))
    )
    assert ethernet == [[frames.mac_of(GROUP), 0, "none", []]]
    assert of_ipv4 == [[GROUP, 3, "include", [SENDER]]]
    assert of_ipv6 == [[IPV6_GROUP, 1, "none", []]]
    assert len(more) == 1 and len(of_b) == 4
    assert of_c == []
    clients.says("other", frames.reports, frames.IS_EXCLUDE, GROUP, [SENDER])
    assert clients.comes_to_get("other", GROUP, STRANGER)
    assert [GROUP, 3, "exclude", [SENDER]] in groups_of_ports(clients)[1]
    clients.says("one", frames.reports, frames.TO_INCLUDE, GROUP)
    assert clients.comes_to_get("", GROUP)
    of_b, of_c = groups_of_ports(clients)
    assert sorted(group[0] for group in of_b) == [frames.mac_of(IPV6_GROUP), IPV6_GROUP]
    assert [GROUP, 3, "exclude", [SENDER]] in of_c
    clients.lab.stop()
    assert "Timeout" in clients.lab.python(
        REFUSED.format(asked='Host().switches["lab"].ports["b"].groups')
    )


def groups_of_ports(clients: Clients) -> Any:
    """Of b and of c."""
    return json.loads(clients.lab.python(ASKS))


ASKS = """
import json
from vswitch import Host
ports = Host().switches["lab"].ports
print(json.dumps([
    [
        [
            str(group.address), group.version, group.source_mode,
            [str(source) for source in group.sources],
        ]
        for group in ports[port].groups
    ]
    for port in "bc"
]))
"""
REFUSED = """
from libvswitch import checked, errors
from vswitch import Host
try:
    {asked}
except errors.HostError as error:
    print(error)
"""


def test_callers_are_told_the_mode_that_frames_obey(idle: Lab) -> None:
    def modes() -> Any:
        return json.loads(idle.python(MODES))

    with LastingOpenVSwitch(idle.host, idle.run_folder()) as open_vswitch:
        idle.start(open_vswitch.where)
        idle.client("lab", "a")
        idle.apply({"switches": [{"alias": "lab", "multicast": "igmp"}]})
        assert comes_true(lambda: modes() == ["igmp", "igmp"])
    shutil.rmtree(idle.run_folder())
    with ThreadPoolExecutor() as another:
        # Which waits for it to be in force.
        change = {"switches": [{"alias": "lab", "multicast": "mld"}]}
        pending = another.submit(idle.apply, change)
        assert comes_true(lambda: modes() == ["mld", "igmp"])
        with LastingOpenVSwitch(idle.host, idle.run_folder()):
            assert comes_true(lambda: modes() == ["mld", "mld"])
            pending.result()
    idle.stop()
    asked = 'checked.VSQEX_GetMcastFilterMode("lab")'
    assert "Timeout" in idle.python(REFUSED.format(asked=asked))


MODES = """
import json
from libvswitch import checked
modes = checked.VSDVS_GetMcastFilterMode("lab"), checked.VSQEX_GetMcastFilterMode("lab")
print(json.dumps([mode.name.lower() for mode in modes]))
"""


def test_without_listening_ports_get_what_they_ask_for(clients: Clients) -> None:
    clients.lab.set_port(
        "lab", "b", ethernet_filter={"frames": ["multicast"], "addresses": [frames.mac_of(GROUP)]}
    )
    assert clients.comes_to_get("one other", GROUP)
    assert clients.gets(OTHER_GROUP) == "other"
    assert clients.gets(IPV6_GROUP) == "other"
    assert clients.gets("224.0.0.251") == clients.gets("ff02::1") == "one other"
    assert groups_of_ports(clients) == [[[frames.mac_of(GROUP), 0, "none", []]], []]
    # It is asked for besides what is joined.
    clients.mode("snooping", IGMPQueries=1)
    assert clients.comes_to_get("one", GROUP)
    clients.says("other", frames.joins, GROUP)
    assert clients.comes_to_get("one other", GROUP)
    assert clients.gets(OTHER_GROUP) == ""
    clients.lab.set_port("lab", "b", ethernet_filter={"frames": ["all_multicast"]})
    assert clients.gets(OTHER_GROUP) == clients.gets(IPV6_GROUP) == "one"
