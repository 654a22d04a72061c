"""Which uplinks carry what, and what comes in over which, while links go down and up."""

from typing import Any, Dict, Iterator, List, Set

import pytest

from bench import Bench
from compiler import Compiler
from frames import Frame
from open_vswitch import OpenVSwitch

BROADCAST = "ff:ff:ff:ff:ff:ff"
P1, P2 = "02:00:00:00:00:01", "02:00:00:00:00:02"
STRANGER = "02:00:00:00:00:99"
UPLINKS = ("nic0", "nic1", "nic2")


class Links(Bench):
    """A switch with three uplinks whose links go down and up."""

    def down(self, uplink: str) -> None:
        self.set_link("teams", UPLINKS.index(uplink) + 1, is_up=False)

    def up(self, uplink: str) -> None:
        self.set_link("teams", UPLINKS.index(uplink) + 1, is_up=True)

    def have(self, *shares: int, **teaming: Any) -> None:
        """Two ports, p2 with the second share if there is one."""
        switch: Dict[str, Any] = {"uplinks": list(UPLINKS), "teaming": teaming}
        switch["ports"] = [{"id": "p1", "vlan": 7}, {"id": "p2", "vlan": 7}]
        clients = [{"port": "p1", "mac": P1}, {"port": "p2", "mac": P2}]
        for client, share in zip(clients, shares):
            client["share"] = share  # type: ignore[assignment]
        self.load(switch, clients)

    def sent_over(self, port: str, source: str, destination: str = STRANGER) -> Set[str]:
        return {name for name, _, _ in self.look(port, Frame(destination, source))}

    def accepted(self, destination: str) -> Set[str]:
        """The uplinks at which a frame comes in."""
        frame = Frame(destination, STRANGER, ((7, 0),))
        return {uplink for uplink in UPLINKS if self.look(uplink, frame)}


@pytest.fixture(scope="module")
def all_links(open_vswitch: OpenVSwitch, compiler: Compiler) -> Links:
    return Links(open_vswitch, compiler, "teams", 5)


@pytest.fixture
def links(all_links: Links) -> Iterator[Links]:
    yield all_links
    for uplink in UPLINKS:
        all_links.up(uplink)


def test_the_next_one_steps_in_and_back(links: Links) -> None:
    links.have(balance="explicit", active=["nic1"], standby=["nic0"])
    assert links.sent_over("p1", P1) == links.accepted(P1) == {"nic1"}
    links.down("nic1")
    assert links.sent_over("p1", P1) == links.accepted(P1) == {"nic0"}
    assert links.accepted(BROADCAST) == {"nic0"}
    links.up("nic1")
    assert links.sent_over("p1", P1) == links.accepted(P1) == {"nic1"}


def test_a_team_without_links_sends_and_takes_nothing(links: Links) -> None:
    links.have(balance="explicit", active=["nic1"], standby=["nic0"])
    links.down("nic0")
    links.down("nic1")
    assert links.sent_over("p1", P1) == set()
    assert links.accepted(BROADCAST) == set()


def test_each_port_has_its_own_by_its_share(links: Links) -> None:
    links.have(0, 2, balance="load", active=list(UPLINKS))
    assert links.sent_over("p1", P1) == links.accepted(P1) == {"nic0"}
    assert links.sent_over("p2", P2) == links.accepted(P2) == {"nic2"}
    # One of each way takes its copy.
    assert links.accepted(BROADCAST) == {"nic0", "nic2"}
    links.down("nic0")
    assert links.sent_over("p1", P1) == links.accepted(P1) == {"nic1"}
    assert links.accepted(BROADCAST) == {"nic1", "nic2"}


def test_sources_keep_to_one_while_it_has_a_link(links: Links) -> None:
    links.have(balance="mac", active=["nic0", "nic1"])
    used = {}
    for number in range(16):
        source = f"02:00:00:00:01:{number:02x}"
        (used[source],) = links.sent_over("p1", source)
    assert set(used.values()) == {"nic0", "nic1"}
    assert links.accepted(BROADCAST) == {"nic0"}
    links.down("nic0")
    assert {name for source in used for name in links.sent_over("p1", source)} == {"nic1"}
    assert links.accepted(BROADCAST) == {"nic1"}


def test_a_client_is_reached_where_it_sends_from(links: Links) -> None:
    """The network may flood what is for it to all uplinks."""
    clients = [f"02:00:00:00:01:{number:02x}" for number in range(16)]
    at_port = [{"mac": client, "vlan": 7, "type": "static"} for client in clients]
    switch = {
        "uplinks": list(UPLINKS),
        "teaming": {"balance": "mac", "active": list(UPLINKS)},
        "ports": [{"id": "p1", "vlan": 7, "addresses": at_port}],
    }
    links.load(switch, [{"port": "p1", "mac": P1}])
    states: List[List[str]] = [[], ["nic1"], ["nic1", "nic2"]]
    for down in states:
        for uplink in down:
            links.down(uplink)
        places = [links.accepted(client) for client in clients]
        assert places == [links.sent_over("p1", client) for client in clients]
        assert set.union(*places) == set(UPLINKS) - set(down)


def test_what_has_no_addresses_keeps_to_one(links: Links) -> None:
    links.have(balance="ip", active=["nic0", "nic1"])
    assert len({next(iter(links.sent_over("p1", P1))) for _ in range(4)}) == 1
    assert links.accepted(P1) == links.accepted(BROADCAST) == {"nic0", "nic1"}


def from_address(number: int, is_ipv6: bool) -> Frame:
    """One flow of sixteen, by its address."""
    if is_ipv6:
        header = bytes.fromhex("86dd" "6000000000003b40")
        addresses = [bytes.fromhex("fd00" + 13 * "00") + bytes([at]) for at in (number, 0xFF)]
    else:
        header = bytes.fromhex("0800" "450000140000000040000000")
        addresses = [bytes([10, 0, 0, at]) for at in (number, 0xFF)]
    return Frame(STRANGER, P1, content=header + b"".join(addresses) + bytes(30))


@pytest.mark.parametrize("is_ipv6", [False, True])
def test_flows_keep_to_one_by_their_addresses(links: Links, is_ipv6: bool) -> None:
    links.have(balance="ip", active=["nic0", "nic1"])

    def used() -> List[str]:
        sent = [links.send("p1", from_address(number, is_ipv6)) for number in range(1, 17)]
        return [uplink for copies in sent for uplink, _, _ in copies]

    before = used()
    assert len(before) == 16 and set(before) == {"nic0", "nic1"}
    assert used() == before
    links.down("nic0")
    assert used() == 16 * ["nic1"]
    links.up("nic0")
    assert used() == before


def test_a_group_is_one_link(links: Links) -> None:
    switch = {
        "uplinks": list(UPLINKS),
        "lags": [{"name": "lag", "uplinks": ["nic0", "nic1"]}],
        "teaming": {"balance": "explicit", "active": ["lag"], "standby": ["nic2"]},
        "ports": [{"id": "p1", "vlan": 7}],
    }
    links.load(switch, [{"port": "p1", "mac": P1}])
    destinations = [f"02:00:00:00:02:{number:02x}" for number in range(16)]
    used = {to: links.sent_over("p1", P1, to) for to in destinations}
    assert set.union(*used.values()) == {"nic0", "nic1"}
    assert all(len(uplinks) == 1 for uplinks in used.values())
    assert used == {to: links.sent_over("p1", P1, to) for to in destinations}
    assert links.accepted(P1) == links.accepted(BROADCAST) == {"nic0", "nic1"}
    links.down("nic1")
    assert links.sent_over("p1", P1) == {"nic0"}
    assert links.accepted(BROADCAST) == {"nic0", "nic1"}
    links.down("nic0")
    assert links.sent_over("p1", P1) == links.accepted(BROADCAST) == {"nic2"}


def test_what_a_partner_sends_over_either_uplink_comes_in(links: Links) -> None:
    """Also where a policy names uplinks of a group by themselves."""
    switch = {
        "uplinks": list(UPLINKS),
        "lags": [{"name": "lag", "uplinks": ["nic0", "nic1"]}],
        "teaming": {"balance": "explicit", "active": ["nic1"], "standby": ["nic2"]},
        "ports": [{"id": "p1", "vlan": 7}],
    }
    links.load(switch, [{"port": "p1", "mac": P1}])
    assert links.sent_over("p1", P1) == {"nic1"}
    assert links.accepted(P1) == links.accepted(BROADCAST) == {"nic0", "nic1"}
    links.down("nic1")
    assert links.sent_over("p1", P1) == {"nic2"}


def test_a_port_of_another_network_hears_that_one_only(links: Links) -> None:
    switch = {
        "uplinks": list(UPLINKS),
        "teaming": {"balance": "explicit", "active": ["nic0"]},
        "ports": [{"id": "p1", "vlan": 7}, {"id": "p2", "vlan": 7, "uplink": "nic2"}],
    }
    links.load(switch, [{"port": "p1", "mac": P1}, {"port": "p2", "mac": P2}])
    assert links.sent_over("p2", P2) == links.accepted(P2) == {"nic2"}
    assert {name for name, _, _ in links.look("nic2", Frame(BROADCAST, STRANGER, ((7, 0),)))} == {
        "p2"
    }


def test_two_ways_get_what_comes_over_one_uplink(links: Links) -> None:
    """Also where lists look at their ports."""
    floods: Dict[str, Any] = {"mac_learning": {"flooding": True}, "vlan": {"trunk": [7]}}
    switch = {
        "uplinks": ["nic0"],
        "ports": [{"id": "p1", **floods, "teaming": {"balance": "mac"}}, {"id": "p2", **floods}],
    }
    links.load(switch, [{"port": "p1", "mac": P1}, {"port": "p2", "mac": P2}])
    for unknown in (BROADCAST, "02:00:00:00:00:98"):
        out = links.look("nic0", Frame(unknown, STRANGER, ((7, 0),)))
        assert set(out) == {("p1", ((7, 0),), None), ("p2", ((7, 0),), None)}


def test_a_blocked_uplink_lets_nothing_through(links: Links) -> None:
    uplink_ports = [{"id": "u0", "uplink": "nic0", "blocked": True}, {"id": "u1", "uplink": "nic1"}]
    switch = {
        "uplink_ports": uplink_ports,
        "teaming": {"balance": "explicit", "active": ["nic0"]},
        "ports": [{"id": "p1", "vlan": 7}],
        "uplinks": ["nic0", "nic1"],
    }
    links.load(switch, [{"port": "p1", "mac": P1}])
    assert links.sent_over("p1", P1) == set()
    assert links.look("nic0", Frame(BROADCAST, STRANGER, ((7, 0),))) == {}
