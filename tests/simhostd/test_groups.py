"""Frames of groups go to their members."""

import ipaddress
import json
import sys
from typing import Any, Callable, Dict, List

import group_frames as frames
import pytest
from frame_lab import Lab, comes_true
from simhost import Client

GROUP = "239.1.1.1"
OTHER_GROUP = "239.2.2.2"
IPV6_GROUP = "ff15::101"
GROUP_BYTES = ipaddress.ip_address(GROUP).packed
SENDER = "198.51.100.7"
STRANGER = "198.51.100.8"


class Clients:
    """A sender and two receivers, whose switch has had its first replies."""

    def __init__(self, lab: Lab) -> None:
        self.lab = lab
        self.sender, self.one, self.other = (lab.client("lab", port) for port in "abc")
        self.macs = {client: client.mac for client in (self.sender, self.one, self.other)}
        self._sent = 0

    def mode(self, mode: str, **options: Any) -> None:
        self.lab.apply(
            {"runtime_options": options, "switches": [{"alias": "lab", "multicast": mode}]}
        )

    def says(self, client: Client, message: Callable[..., bytes], *words: Any) -> None:
        source = client.address if "." in str(words) else "fe80::1"
        client.send(message(self.macs[client], source, *words))

    def send(self, group: str, source: str = SENDER) -> bytes:
        """Sends a frame that is unlike all others."""
        self._sent += 1
        if ":" in group:
            source = "2001:db8::7"
        frame = frames.data(self.macs[self.sender], source, group, b"data %d" % self._sent)
        self.sender.send(frame)
        return frame

    def gets(self, group: str, source: str = SENDER) -> str:
        """Who gets a frame to a group."""
        frame = self.send(group, source)
        all_get = self.send(frames.ALL_SYSTEMS)
        found = ""
        for name, client in (("one", self.one), ("other", self.other)):
            client.expect(all_get)
            try:
                client.expect(frame, timeout=0)
                found += f" {name}"
            except AssertionError:
                pass
        return found.strip()

    def comes_to_get(self, wanted: str, group: str, source: str = SENDER) -> bool:
        return comes_true(lambda: self.gets(group, source) == wanted)

    def groups(self, client: str) -> List[Dict[str, Any]]:
        document = json.loads(self.lab.ctl("show", "--json"))
        (switch,) = (one for one in document["switches"] if one["alias"] == "lab")
        (port,) = (one for one in switch["ports"] if one["id"] == client)
        found: List[Dict[str, Any]] = port.get("groups", [])
        return found


@pytest.fixture
def clients(lab: Lab) -> Clients:
    return Clients(lab)


def test_members_get_frames_and_nobody_else(clients: Clients) -> None:
    assert clients.gets(GROUP) == "one other"
    clients.mode("snooping", IGMPQueries=1)
    # Who had no time to say what they want get all.
    assert clients.gets(GROUP) == "one other"
    clients.says(clients.one, frames.joins, GROUP)
    clients.says(clients.other, frames.joins, IPV6_GROUP)
    assert clients.comes_to_get("one", GROUP)
    assert clients.gets(OTHER_GROUP) == ""
    assert clients.gets(IPV6_GROUP) == "other"
    assert clients.gets("ff15::102") == ""
    for group in ("224.0.0.251", "ff02::1", "ff02::1:ff00:1"):
        assert clients.gets(group) == "one other"
    clients.says(clients.other, frames.joins, GROUP)
    assert clients.comes_to_get("one other", GROUP)
    clients.says(clients.one, frames.leaves, GROUP)
    clients.one.expect(lambda frame: frames.is_query(frame) and GROUP_BYTES in frame)
    assert clients.comes_to_get("other", GROUP)


def test_sources_are_looked_at(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1)
    clients.says(clients.one, frames.reports, frames.IS_INCLUDE, GROUP, [SENDER])
    clients.says(clients.other, frames.reports, frames.IS_EXCLUDE, GROUP, [SENDER])
    assert clients.comes_to_get("one", GROUP, SENDER)
    assert clients.gets(GROUP, STRANGER) == "other"
    # No listener says anything of IPv6.
    assert clients.gets(IPV6_GROUP) == "one other"
    clients.says(clients.other, frames.reports, frames.ALLOW, GROUP, [SENDER])
    clients.says(clients.one, frames.reports, frames.BLOCK, GROUP, [SENDER])
    assert clients.comes_to_get("other", GROUP, SENDER)
    assert clients.gets(GROUP, STRANGER) == "other"


def test_sources_of_ipv6_are_looked_at(clients: Clients) -> None:
    clients.mode("mld", IGMPQueries=1)
    clients.says(clients.one, frames.reports, frames.IS_INCLUDE, IPV6_GROUP, ["2001:db8::7"])
    clients.says(clients.other, frames.reports, frames.IS_EXCLUDE, IPV6_GROUP, ["2001:db8::7"])
    assert clients.comes_to_get("one", IPV6_GROUP)
    assert clients.gets(GROUP) == "one other"


def test_who_is_silent_is_a_member_no_more(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1, IGMPQueryInterval=1, IGMPRouterIP="192.0.2.1")
    clients.says(clients.one, frames.joins, GROUP)
    assert clients.comes_to_get("one", GROUP)
    query = clients.one.expect(frames.is_query, timeout=5)
    assert query[:6] == bytes.fromhex("01005e000001") and query[26:30] == bytes([192, 0, 2, 1])
    assert clients.comes_to_get("", GROUP)


def test_routers_get_all_groups_and_what_members_say(clients: Clients) -> None:
    clients.mode("igmp", IGMPQueries=1)
    assert clients.comes_to_get("", GROUP)
    clients.says(clients.other, frames.asks, 1)
    assert clients.comes_to_get("other", GROUP)
    clients.says(clients.sender, frames.joins, GROUP)
    report = frames.joins(clients.macs[clients.sender], clients.sender.address, GROUP)
    clients.other.expect(report)
    clients.one.expect_none(lambda frame: frame == report)
    # It asks no more.
    assert clients.comes_to_get("", GROUP)


def test_a_kernel_joins_and_leaves(clients: Clients) -> None:
    clients.mode("snooping", IGMPQueries=1, MLDVersion=1, IGMPVersion=2)
    assert clients.comes_to_get("", GROUP)
    for client in (clients.one, clients.other):
        # Who has no address of the link says nothing of IPv6.
        client.run("sysctl", "-w", "net.ipv6.conf.eth0.disable_ipv6=0")
        client.run("ip", "address", "add", "fe80::2/64", "dev", "eth0", "nodad")
    members = [
        client.start(sys.executable, "-c", JOINS, stdin=-1, stdout=-1)
        for client in (clients.one, clients.other)
    ]
    assert clients.comes_to_get("one other", GROUP)
    assert clients.comes_to_get("one other", IPV6_GROUP)
    members.pop().communicate()
    assert clients.comes_to_get("one", GROUP)
    assert clients.comes_to_get("one", IPV6_GROUP)
    members.pop().communicate()


JOINS = f"""
import socket, struct, sys
index = socket.if_nametoindex("eth0")
one = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
request = struct.pack("!4s4si", socket.inet_aton("{GROUP}"), bytes(4), 0)
one.setsockopt(socket.IPPROTO_IP, socket.IP_ADD_MEMBERSHIP, request[:8] + struct.pack("@i", index))
other = socket.socket(socket.AF_INET6, socket.SOCK_DGRAM)
request = socket.inet_pton(socket.AF_INET6, "{IPV6_GROUP}") + struct.pack("@I", index)
other.setsockopt(socket.IPPROTO_IPV6, socket.IPV6_JOIN_GROUP, request)
sys.stdin.read()
"""


def test_callers_are_told_what_is_joined(clients: Clients) -> None:
    clients.mode("snooping", IGMPQueries=1)
    clients.says(clients.one, frames.reports, frames.IS_INCLUDE, GROUP, [SENDER])
    clients.says(clients.one, frames.joins, IPV6_GROUP)
    assert clients.comes_to_get("one", GROUP)
    of_b, of_c = json.loads(clients.lab.python(ASKS))
    ethernet, of_ipv6, of_ipv4, more = (
        [group for group in of_b if group[0] == address]
        for address in (frames.mac_of(GROUP), IPV6_GROUP, GROUP, frames.mac_of(IPV6_GROUP))
    )
    assert ethernet == [[frames.mac_of(GROUP), 0, "none", []]]
    assert of_ipv4 == [[GROUP, 3, "include", [SENDER]]]
    assert of_ipv6 == [[IPV6_GROUP, 1, "none", []]]
    assert len(more) == 1 and len(of_b) == 4
    assert of_c == []
    clients.lab.stop()
    assert "Timeout" in clients.lab.python(REFUSED)


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
from libvswitch import errors
from vswitch import Host
try:
    Host().switches["lab"].ports["b"].groups
except errors.HostError as error:
    print(error)
"""


def test_without_listening_ports_get_what_they_ask_for(clients: Clients) -> None:
    clients.lab.set_port(
        "lab", "b", ethernet_filter={"frames": ["multicast"], "addresses": [frames.mac_of(GROUP)]}
    )
    assert clients.comes_to_get("one other", GROUP)
    assert clients.gets(OTHER_GROUP) == "other"
    assert clients.gets(IPV6_GROUP) == "other"
    assert clients.gets("224.0.0.251") == clients.gets("ff02::1") == "one other"
    # It is asked for besides what is joined.
    clients.mode("snooping", IGMPQueries=1)
    assert clients.comes_to_get("one", GROUP)
    clients.says(clients.other, frames.joins, GROUP)
    assert clients.comes_to_get("one other", GROUP)
    assert clients.gets(OTHER_GROUP) == ""
    clients.lab.set_port("lab", "b", ethernet_filter={"frames": ["all_multicast"]})
    assert clients.gets(OTHER_GROUP) == clients.gets(IPV6_GROUP) == "one"
