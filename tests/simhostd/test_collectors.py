"""Mirror sessions whose copies go to collectors: wrapped in GRE or ERSPAN, over the underlay."""

import json
import struct
from itertools import product
from pathlib import Path
from typing import Any, Dict, Iterator, List, NamedTuple, Tuple

import pytest
from counted_frames import come_to
from frame_lab import ONE_SWITCH, Lab, comes_true
from simhost import frame
from simhost._wires import PacketSocket
from wrapped_copies import ERSPAN_2, ERSPAN_3, ETHERNET, Packet, is_wrapped, read

BROADCAST = "ff:ff:ff:ff:ff:ff"
STRANGER = "02:00:00:00:88:01"


class Family(NamedTuple):
    """Addresses of the host and of collectors, and of one that is not there."""

    bits: int
    here: str
    one: str
    other: str
    nobody: str

    @property
    def underlay(self) -> Dict[str, str]:
        return {"device": "under", "address": f"{self.here}/{self.bits}"}


IPV4 = Family(24, *(f"198.51.100.{number}" for number in (1, 7, 8, 9)))
IPV6 = Family(64, *(f"2001:db8::{number}" for number in (1, 7, 8, 9)))
BOTH = pytest.mark.parametrize("family", [IPV4, IPV6], ids=["ipv4", "ipv6"], indirect=True)
_, HERE, ONE, OTHER, NOBODY = IPV4
GATEWAY, BEYOND = "198.51.100.254", "203.0.113.9"
KEY = 0xC0FFEE
ERSPAN = 1023


class Collectors:
    """A machine beyond the underlay with two addresses."""

    def __init__(self, lab: Lab, family: Family) -> None:
        self.lab = lab
        self.machine = lab.frames.new_namespace()
        self._bits = family.bits
        if family == IPV6:
            for namespace, devices in product((lab.host, self.machine), ("all", "default")):
                namespace.run("sysctl", "-qw", f"net.ipv6.conf.{devices}.disable_ipv6=0")
            # As of IPv4: whoever is switched off and on again has the same addresses.
            self.machine.run("sysctl", "-qw", "net.ipv6.conf.all.keep_addr_on_down=1")
        lab.wire("under", self.machine, "eth0")
        for address in (family.one, family.other):
            self.add_address(address)
        self._socket = PacketSocket(self.machine, "eth0")

    def add_address(self, address: str) -> None:
        # Without a second in which somebody else may have it.
        how = ["nodad"] if ":" in address else []
        self.machine.run("ip", "address", "add", f"{address}/{self._bits}", "dev", "eth0", *how)

    def expect(self, copy: bytes, count: int) -> List[Packet]:
        """So many wrapped copies, and no more than these."""
        packets: List[Packet] = []
        for _ in range(count):
            found = self._socket.find(lambda data: is_wrapped(data), 5)
            assert found is not None, f"{count - len(packets)} are missing"
            packets.append(read(found))
        assert self._socket.find(lambda data: is_wrapped(data), 0.1) is None
        assert [packet.copy for packet in packets] == [copy] * count
        return packets

    def drain(self) -> None:
        """Takes what comes of a trace."""
        while self._socket.find(lambda data: is_wrapped(data), 0.2):
            pass

    def close(self) -> None:
        self._socket.close()


def session(**said: Any) -> Dict[str, Any]:
    return {"sid": "s", "type": "encapsulated", "sent_by": [{"port": "a"}], **said}


def encapsulation(kind: str) -> Dict[str, Any]:
    return {"type": kind, "key": KEY} if kind == "gre" else {"type": kind, "id": ERSPAN}


def to(*addresses: str) -> List[Dict[str, str]]:
    return [{"ip": address} for address in addresses]


def mirror(lab: Lab, *sessions: Dict[str, Any], switch: str = "lab") -> None:
    lab.set_port(switch, "a", vlan=7, mirror_sessions=list(sessions))


def counters_of_sessions(lab: Lab, alias: str) -> Any:
    switches = json.loads(lab.ctl("show", "--json"))["switches"]
    return next(one for one in switches if one["alias"] == alias).get("mirror_counters", {})


def counters(lab: Lab) -> Any:
    return counters_of_sessions(lab, "lab").get("s", {})


def all_reply(lab: Lab) -> bool:
    return comes_true(lambda: lab.is_in_force() and "does not reply" not in lab.plane()["said"])


UNDERLAY = IPV4.underlay


@pytest.fixture(name="family")
def family_of_the_underlay(request: pytest.FixtureRequest) -> Family:
    family: Family = getattr(request, "param", IPV4)
    return family


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[Lab]:
    """Two switches; copies of whole frames fit the underlay."""
    (switch,) = ONE_SWITCH["switches"]
    more = {"alias": "more", "ports": [{"id": "a"}]}
    with Lab(tmp_path, {"switches": [{"mtu": 1400, **switch, "uplinks": []}, more]}) as lab:
        yield lab


@pytest.fixture
def collectors(lab: Lab, family: Family) -> Iterator[Collectors]:
    collectors = Collectors(lab, family)
    lab.start()
    lab.apply({"underlay": family.underlay})
    yield collectors
    collectors.close()


@BOTH
def test_copies_come_wrapped(lab: Lab, family: Family, collectors: Collectors) -> None:
    _, here, first, second, _ = family
    macs = {port: f"02:00:00:00:77:0{port}" for port in "ab"}
    one, other = (lab.frames.client("lab", port, mac=mac) for port, mac in macs.items())
    lab.set_port("lab", "b", vlan=7)
    sent = frame(other.mac, one.mac, payload=bytes(range(200)) * 6)
    for kind, number in (("gre", ETHERNET), ("erspan2", ERSPAN_2), ("erspan3", ERSPAN_3)):
        key = KEY if kind == "gre" else ERSPAN
        mirror(lab, session(to=to(first, second), encapsulation=encapsulation(kind)))
        assert all_reply(lab)
        one.send(sent)
        other.expect(sent)
        assert sorted(collectors.expect(sent, 2)) == [
            Packet(number, here, address, key, False, sent) for address in (first, second)
        ]
        told = lab.ctl("trace", "lab/a", sent.hex())
        which = f"the key {KEY}" if kind == "gre" else f"the id {ERSPAN}"
        name = {"gre": "GRE", "erspan2": "ERSPAN II", "erspan3": "ERSPAN III"}[kind]
        for address in (first, second):
            wrapped = f"the collector {address}, in {name} with {which}, without a tag"
            assert f"is copied by the mirror session s to {wrapped}" in told
        collectors.drain()
        # What the port gets, a part of it, with its tag.
        cut = {"snap_length": 64, "keeps_vlan": True, "encapsulation": encapsulation(kind)}
        mirror(lab, session(to=to(first), sent_by=[], received_by=[{"port": "a"}], **cut))
        back = frame(one.mac, other.mac, payload=bytes(range(200)))
        tagged = frame(one.mac, other.mac, vlan=7, payload=bytes(range(200)))[:68]
        other.send(back)
        one.expect(back)
        (packet,) = collectors.expect(tagged, 1)
        assert packet.leaves == (kind == "erspan3")
    assert comes_true(lambda: bool(counters(lab) == {"mirroredPkts": 6, "mirrorPktCnt": 9}))


def test_two_switches_mirror_to_one_collector(lab: Lab, collectors: Collectors) -> None:
    both = [lab.client("lab", "a"), lab.client("more", "a")]
    for switch in ("lab", "more"):
        said = session(to=to(ONE), encapsulation=encapsulation("gre"))
        mirror(
            lab,
            said,
            {**said, "sid": "t", "to": to(ONE, OTHER), "encapsulation": encapsulation("erspan2")},
            switch=switch,
        )
    assert all_reply(lab)
    for client in both:
        sent = frame(BROADCAST, client.mac, payload=b"both" * 20)
        for _ in range(3):
            client.send(sent)
            came = [(packet.kind, packet.destination) for packet in collectors.expect(sent, 3)]
            assert sorted(came) == [(ETHERNET, ONE), (ERSPAN_2, ONE), (ERSPAN_2, OTHER)]
    # Each session for itself: what it took, and what became of that.
    counted = {
        "s": {"mirroredPkts": 3, "mirrorPktCnt": 3},
        "t": {"mirroredPkts": 3, "mirrorPktCnt": 6},
    }
    for switch in ("lab", "more"):
        come_to(lambda: counters_of_sessions(lab, switch), counted)


@BOTH
def test_a_collector_that_does_not_reply_is_told_and_counted(
    lab: Lab, family: Family, collectors: Collectors
) -> None:
    client = lab.client("lab", "a")
    mirror(lab, session(to=to(family.nobody)))
    told = f"the collector {family.nobody} of mirror sessions does not reply"

    def send() -> bytes:
        sent = frame(BROADCAST, client.mac, payload=b"three" * 20)
        for _ in range(3):
            client.send(sent)
        return sent

    assert told in lab.plane()["said"]
    send()
    failed = {"failedPkts": 3, "mirrorPktFailCnt": 3}
    assert comes_true(lambda: bool(counters(lab) == failed)), counters(lab)
    mirror(lab, session(to=to(family.one, family.nobody)))
    assert comes_true(lambda: family.one not in lab.plane()["said"])
    collectors.expect(send(), 3)
    both = {"failedPkts": 3, "mirrorPktFailCnt": 6, "mirroredPkts": 3, "mirrorPktCnt": 3}
    assert comes_true(lambda: bool(counters(lab) == both)), counters(lab)
    # It comes, its wire is pulled, and plugged in again.
    collectors.add_address(family.nobody)
    assert all_reply(lab)
    collectors.machine.run("ip", "link", "set", "eth0", "down")
    assert comes_true(lambda: told in lab.plane()["said"])
    collectors.machine.run("ip", "link", "set", "eth0", "up")
    assert all_reply(lab)
    collectors.expect(send(), 6)


def test_a_collector_beyond_a_gateway_is_reached_while_that_replies(
    lab: Lab, collectors: Collectors
) -> None:
    client = lab.client("lab", "a")
    lab.apply({"underlay": {**UNDERLAY, "gateway": GATEWAY}})
    mirror(lab, session(to=to(BEYOND)))
    told = f"the collector {BEYOND} of mirror sessions does not reply"
    assert comes_true(lambda: lab.is_in_force() and told in lab.plane()["said"])
    sent = frame(BROADCAST, client.mac, payload=b"beyond" * 20)
    client.send(sent)
    failed = {"failedPkts": 1, "mirrorPktFailCnt": 1}
    assert comes_true(lambda: bool(counters(lab) == failed)), counters(lab)
    collectors.add_address(GATEWAY)
    assert all_reply(lab)
    client.send(sent)
    (packet,) = collectors.expect(sent, 1)
    assert packet.destination == BEYOND
    both = {**failed, "mirroredPkts": 1, "mirrorPktCnt": 1}
    assert comes_true(lambda: bool(counters(lab) == both)), counters(lab)
    collectors.machine.run("ip", "link", "set", "eth0", "down")
    assert comes_true(lambda: told in lab.plane()["said"])


def test_what_comes_back_wrapped_reaches_nobody(lab: Lab, collectors: Collectors) -> None:
    client = lab.client("lab", "a")
    mirror(lab, session(to=to(ONE)))
    assert all_reply(lab)
    client.send(frame(BROADCAST, client.mac, payload=b"there" * 20))
    (data,) = [collectors._socket.find(lambda found: is_wrapped(found), 5)]
    assert data is not None
    # The same way back, with the key of each switch.
    addresses = data[6:12] + data[:6]
    for key in range(4):
        header = data[12:26] + data[30:34] + data[26:30] + data[34:38] + struct.pack("!I", key)
        collectors._socket.send(
            addresses + header + frame(BROADCAST, STRANGER, payload=b"back" * 20)
        )
    client.expect_none(lambda came: b"back" in came)


def port_a(lab: Lab) -> Dict[str, Any]:
    (port,) = (
        one
        for switch in json.loads(lab.ctl("show", "--json"))["switches"]
        for one in switch["ports"]
        if one["id"] == "a" and switch["alias"] == "lab"
    )
    return dict(port)


@pytest.mark.parametrize(
    "said, why",
    [
        ({"to": to(ONE)}, "mirrors to an address, and the host has no underlay"),
        ({"to": to(ONE), "type": "port"}, "mirrors to an address, and wraps nothing"),
    ],
)
def test_what_cannot_be_is_refused(lab: Lab, said: Dict[str, Any], why: str) -> None:
    lab.start()
    lab.client("lab", "a")
    ports = [{"id": "a", "mirror_sessions": [session(**said)]}]
    document = {"switches": [{"alias": "lab", "ports": ports}]}
    refused = lab.try_ctl("apply", "-", given=json.dumps(document))
    assert refused.returncode != 0 and f"the mirror session 's' {why}" in refused.stdout
    assert "mirror_sessions" not in port_a(lab)


# The record of such a session, a call that appends it, and what it returns.
APPENDS = """
import _libvswitch as vs
table = vs.alloc_dvmirror_session_table(1, 1)
vs.DVMirrorSessionTable_version_set(table, vs.VS_DVMIRROR_VERSION_V3)
session = vs.DVMirrorSessionTable___getitem__(table, 0)
vs.DVMirrorSession_sid_set(session, "s")
vs.DVMirrorSession_type_set(session, vs.VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC)
vs.DVMirrorSession_numDstEntities_set(session, 1)
entity = vs.DVMirrorSessionTable_get_first_session_entity(table, 0)
vs.DVMirrorEntity_type_set(entity, vs.MIRROR_ENTTYPE_IP)
vs.DVMirrorEntity_set_entity(entity, "{address}")
print(vs.VSDVS_AppendDVMirrorSessions("lab", "a", table) == vs.{status})
"""
ASSIGNS = """
from libvswitch.errors import HostError
from vswitch import Host, Mirror, MirrorEnd
port = Host().switches["lab"].ports["a"]
try:
    port.mirrors += (Mirror("s", type="encapsulated", to=(MirrorEnd(ip="{address}"),)),)
    print("assigned")
except HostError as error:
    print(type(error).__name__, error)
"""


@pytest.mark.parametrize(
    "family, address, kinds",
    [(IPV4, IPV6.one, ("IPv6", "IPv4")), (IPV6, IPV4.one, ("IPv4", "IPv6"))],
    ids=["ipv4", "ipv6"],
    indirect=["family"],
)
def test_collectors_of_the_other_family_are_refused_however_one_asks(
    lab: Lab, collectors: Collectors, address: str, kinds: Tuple[str, str]
) -> None:
    lab.client("lab", "a")
    before = lab.plane()["change"]
    assert lab.python(APPENDS.format(address=address, status="QEX_NOT_SUPPORTED")) == "True\n"
    assert lab.python(ASSIGNS.format(address=address)).startswith("NotSupported ")
    ports = [{"id": "a", "mirror_sessions": [session(to=to(address))]}]
    document = {"switches": [{"alias": "lab", "ports": ports}]}
    refused = lab.try_ctl("apply", "-", given=json.dumps(document))
    assert refused.returncode == 1
    collector, underlay = kinds
    why = f"mirrors to an address of {collector}, and the underlay has one of {underlay}"
    assert f"the mirror session 's' {why} (QEX_NOT_SUPPORTED)" in refused.stdout
    assert lab.plane()["change"] == before
    assert "mirror_sessions" not in port_a(lab)
