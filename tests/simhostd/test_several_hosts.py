"""Hosts whose uplinks meet on a network are one switch's, each with two of them."""

import itertools
from typing import Any, Dict, Iterator, List

import pytest

from frame_lab import comes_sooner_or_later, comes_true
from group_frames import data, joins, leaves
from rack import Rack, Segment, all_reach, check_all_get_one, hello
from simhost import Client


def document() -> Dict[str, Any]:
    return {
        "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
        "switches": [
            {
                "alias": "lab",
                "uplinks": ["nic0", "nic1"],
                "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
                "private_vlans": [
                    {"primary": 100, "secondary": 100, "type": "promiscuous"},
                    {"primary": 100, "secondary": 101, "type": "isolated"},
                    {"primary": 100, "secondary": 102, "type": "community"},
                    {"primary": 100, "secondary": 103, "type": "community"},
                ],
                "ports": [{"id": "a"}, {"id": "b"}],
            }
        ],
    }


@pytest.fixture(scope="module")
def rack(tmp_path_factory: pytest.TempPathFactory) -> Iterator[Rack]:
    with Rack(tmp_path_factory.mktemp("rack"), [document() for _ in range(3)]) as rack:
        yield rack


@pytest.fixture(scope="module")
def segment(rack: Rack) -> Segment:
    return Segment(rack)


@pytest.fixture(scope="module")
def clients(rack: Rack, segment: Segment) -> List[Client]:
    """One at each host."""
    del segment
    return rack.three_clients()


def test_a_frame_for_all_comes_to_each_host_once(clients: List[Client]) -> None:
    check_all_get_one(clients)


def test_vlans_hold_across_hosts(rack: Rack, clients: List[Client]) -> None:
    one, other, third = clients
    rack.hosts[0].set_port("lab", "a", vlan={"id": 7, "priority": 5})
    rack.hosts[1].set_port("lab", "a", vlan={"trunk": [7, 8]})
    rack.hosts[2].set_port("lab", "a", vlan=8)
    try:
        sent = hello(one)
        tagged = sent[:12] + bytes.fromhex("8100a007") + sent[12:]
        assert comes_sooner_or_later(one, other, sent, tagged)
        third.expect_none(sent)
    finally:
        rack.set_all(vlan=0)


def private(vlan: int) -> Dict[str, Any]:
    return {"id": vlan, "private": True}


@pytest.mark.parametrize(
    "kinds, reach",
    [
        ((100, 101, 101), {(0, 1), (1, 0), (0, 2), (2, 0)}),
        ((102, 102, 101), {(0, 1), (1, 0)}),
        ((102, 103, 100), {(0, 2), (2, 0), (1, 2), (2, 1)}),
    ],
)
def test_private_vlans_hold_across_hosts(
    rack: Rack, clients: List[Client], kinds: Any, reach: Any
) -> None:
    for host, vlan in zip(rack.hosts, kinds):
        host.set_port("lab", "a", vlan=private(vlan))
    try:
        for one, other in sorted(reach):
            assert comes_sooner_or_later(clients[one], clients[other], hello(clients[one]))
        for one in range(3):
            sent = hello(clients[one])
            clients[one].send(sent)
            for other in range(3):
                if (one, other) in reach:
                    clients[other].expect(sent)
                else:
                    clients[other].expect_none(sent)
    finally:
        rack.set_all(vlan=0)


def test_an_uplink_fails_and_the_others_hear_of_it(
    rack: Rack, segment: Segment, clients: List[Client]
) -> None:
    one, other, third = clients
    all_reach(clients)
    segment.wires["0/nic0"].pull()
    try:
        # Without a word of the client: it was announced at its new place.
        assert comes_sooner_or_later(other, one, hello(other, one.mac))
        assert comes_true(lambda: "sends over nic1" in rack.hosts[0].ctl("show"))
        all_reach(clients)
        sent = hello(third)
        third.send(sent)
        for client in one, other:
            client.expect(sent)
            client.expect_none(sent)
    finally:
        segment.wires["0/nic0"].plug()
    all_reach(clients)


def test_a_client_that_moves_to_another_host_is_found_there(
    rack: Rack, clients: List[Client]
) -> None:
    one = clients[0]
    before, after = rack.client(1, "b"), rack.client(2, "b")
    mac = "02:00:00:00:77:01"
    for client in before, after:
        client.run("ip", "link", "set", "eth0", "address", mac)
    assert comes_sooner_or_later(before, one, hello(before))
    assert comes_sooner_or_later(one, before, hello(one, mac))
    rack.hosts[1].ctl("disconnect", "lab", "b")
    assert comes_sooner_or_later(after, one, hello(after))
    assert comes_sooner_or_later(one, after, hello(one, mac))
    # Also from the host where it was.
    assert comes_sooner_or_later(clients[1], after, hello(clients[1], mac))
    rack.hosts[2].ctl("disconnect", "lab", "b")


def test_members_of_groups_are_found_across_hosts(rack: Rack, clients: List[Client]) -> None:
    one, other, third = clients
    group = "239.1.1.1"
    for host in rack.hosts:
        said = {"alias": "lab", "multicast": "snooping"}
        # Who says nothing is soon taken to want nothing.
        host.apply({"runtime_options": {"IGMPQueries": 1}, "switches": [said]})

    def sends(text: bytes) -> bytes:
        sent = data(one.mac, one.address, group, text)
        one.send(sent)
        return sent

    def is_only_for_the_member(number: Iterator[int] = itertools.count()) -> bool:
        other.send(joins(other.mac, other.address, group))
        text = b"%d" % next(number)
        sent = sends(text)
        try:
            other.expect(sent, timeout=0.3)
        except AssertionError:
            return False
        return third._socket.find(sent, 0.1) is None

    try:
        assert comes_true(is_only_for_the_member)
        other.send(leaves(other.mac, other.address, group))

        def gets_nothing(number: Iterator[int] = itertools.count()) -> bool:
            return other._socket.find(sends(b"later %d" % next(number)), 0.1) is None

        assert comes_true(gets_nothing)
    finally:
        for host in rack.hosts:
            host.apply({"switches": [{"alias": "lab", "multicast": "legacy"}]})
