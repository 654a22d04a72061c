"""Hosts without a common network: tunnels are the uplink of their switch."""

import json
import signal
import sys
from typing import Any, Callable, Dict, Iterator, List

import pytest

from frame_lab import comes_sooner_or_later, comes_true
from rack import ALL, Rack, Routers, all_reach, check_all_get_one, hello
from simhost import Client
from simhost._namespaces import Namespace


def fabric(host: int, hosts: int = 3, **changed: Any) -> Dict[str, Any]:
    peers = [Routers.address(other) for other in range(hosts) if other != host]
    return {"encapsulation": "vxlan", "key": 4711, "peers": peers, **changed}


def document(host: int, hosts: int = 3) -> Dict[str, Any]:
    return {
        "underlay": Routers.underlay(host),
        "switches": [
            {
                "alias": "lab",
                "mtu": 1400,
                "fabric": fabric(host, hosts),
                "private_vlans": [
                    {"primary": 100, "secondary": 100, "type": "promiscuous"},
                    {"primary": 100, "secondary": 101, "type": "isolated"},
                    {"primary": 100, "secondary": 102, "type": "community"},
                ],
                "ports": [{"id": "a"}, {"id": "b"}],
            }
        ],
    }


@pytest.fixture(scope="module")
def rack(tmp_path_factory: pytest.TempPathFactory) -> Iterator[Rack]:
    with Rack(tmp_path_factory.mktemp("rack"), [document(host) for host in range(3)]) as rack:
        yield rack


@pytest.fixture(scope="module")
def routers(rack: Rack) -> Routers:
    return Routers(rack)


@pytest.fixture(scope="module")
def clients(rack: Rack, routers: Routers) -> List[Client]:
    """One at each host."""
    del routers
    return rack.three_clients()


def is_over(rack: Rack, changed: Callable[[], None], one: Client, other: Client) -> None:
    """After a change no frame comes any more."""
    changed()
    for host in rack.hosts:
        assert comes_true(host.is_in_force)
    sent = hello(one)
    one.send(sent)
    other.expect_none(sent)


def use(rack: Rack, encapsulation: str) -> None:
    for number, host in enumerate(rack.hosts):
        said = fabric(number, encapsulation=encapsulation)
        host.apply({"switches": [{"alias": "lab", "fabric": said}]})


@pytest.fixture(params=["vxlan", "geneve"])
def encapsulation(rack: Rack, request: pytest.FixtureRequest) -> Iterator[str]:
    yield request.param
    use(rack, "vxlan")


def test_a_frame_for_all_comes_to_each_host_once(
    rack: Rack, clients: List[Client], encapsulation: str
) -> None:
    use(rack, encapsulation)
    check_all_get_one(clients)


def test_a_frame_for_one_host_goes_to_no_other(rack: Rack, clients: List[Client]) -> None:
    all_reach(clients)
    one, other, third = clients
    # A third host would deliver it to this one.
    rack.hosts[2].set_port("lab", "a", ethernet_filter={"frames": ["promiscuous"]})
    try:
        rack.hosts[0].have_counted()
        sent = hello(one, other.mac)
        one.send(sent)
        other.expect(sent)
        third.expect_none(sent)
        unknown = hello(one, "02:00:00:00:99:99")
        one.send(unknown)
        third.expect(unknown)
    finally:
        rack.hosts[2].set_port("lab", "a", ethernet_filter={"frames": []})


def test_what_comes_out_of_a_tunnel_goes_into_no_other(rack: Rack, clients: List[Client]) -> None:
    one, other, third = clients
    here = rack.hosts[0]

    def part() -> None:
        said = fabric(0, peers=[Routers.address(1)])
        here.apply({"switches": [{"alias": "lab", "fabric": said}]})

    all_reach(clients)
    is_over(rack, part, one, third)
    assert comes_sooner_or_later(one, other, hello(one))
    here.apply({"switches": [{"alias": "lab", "fabric": fabric(0)}]})
    assert comes_sooner_or_later(one, third, hello(one))


def test_vlans_and_priorities_hold_across_hosts(rack: Rack, clients: List[Client]) -> None:
    one, other, third = clients
    rack.hosts[0].set_port("lab", "a", vlan={"id": 7, "priority": 5})
    rack.hosts[1].set_port("lab", "a", vlan={"trunk": [7, 8]})
    try:
        sent = hello(one)
        tagged = sent[:12] + bytes.fromhex("8100a007") + sent[12:]
        assert comes_sooner_or_later(one, other, sent, tagged)
        third.expect_none(sent)
        rack.hosts[2].set_port("lab", "a", vlan=8)
        in_eight = hello(other)
        assert comes_sooner_or_later(
            other, third, in_eight[:12] + bytes.fromhex("81000008") + in_eight[12:], in_eight
        )
        one.expect_none(in_eight)
    finally:
        rack.set_all(vlan=0)


def test_private_vlans_hold_across_hosts(
    rack: Rack, clients: List[Client], encapsulation: str
) -> None:
    use(rack, encapsulation)
    promiscuous, isolated, other = clients
    rack.set_all(vlan={"id": 101, "private": True})
    rack.hosts[0].set_port("lab", "a", vlan={"id": 100, "private": True})
    try:
        for one in isolated, other:
            assert comes_sooner_or_later(one, promiscuous, hello(one))
            assert comes_sooner_or_later(promiscuous, one, hello(promiscuous))
        sent = hello(isolated)
        isolated.send(sent)
        promiscuous.expect(sent)
        other.expect_none(sent)
        for host in rack.hosts[1:]:
            host.set_port("lab", "a", vlan={"id": 102, "private": True})
        assert comes_sooner_or_later(isolated, other, hello(isolated))
    finally:
        rack.set_all(vlan=0)


def test_a_client_that_moves_to_another_host_is_found_there(
    rack: Rack, clients: List[Client]
) -> None:
    one = clients[0]
    before, after = rack.client(1, "b"), rack.client(2, "b")
    mac = "02:00:00:00:77:01"
    for client in before, after:
        client.run("ip", "link", "set", "eth0", "address", mac)
    speaks = hello(before)
    assert comes_sooner_or_later(before, one, speaks)
    sent = hello(one, mac)
    assert comes_sooner_or_later(one, before, sent)
    moved = hello(after)
    assert comes_sooner_or_later(after, one, moved)
    assert comes_sooner_or_later(one, after, hello(one, mac))
    sent = hello(one, mac)
    one.send(sent)
    after.expect(sent)
    before.expect_none(sent)
    for host in rack.hosts[1:]:
        host.ctl("disconnect", "lab", "b")


def test_a_host_dies_and_returns(rack: Rack, clients: List[Client]) -> None:
    one, other, third = clients
    all_reach(clients)
    rack.hosts[1].stop(signal.SIGKILL)
    sent = hello(one)
    one.send(sent)
    third.expect(sent)
    lost = hello(one, other.mac)
    one.send(lost)
    other.expect_none(lost)
    rack.hosts[1].start()
    all_reach(clients)
    assert comes_sooner_or_later(one, other, hello(one, other.mac))


WRAPPED = """
import socket, sys
to, at, head, key, inner = sys.argv[1:]
wrapped = bytes.fromhex(head) + int(key).to_bytes(3, "big") + bytes(1) + bytes.fromhex(inner)
socket.socket(socket.AF_INET, socket.SOCK_DGRAM).sendto(wrapped, (to, int(at)))
"""
# The port, and what stands before the key.
HEADS = {"vxlan": ["4789", "08000000"], "geneve": ["6081", "00006558"]}


def test_frames_of_strangers_reach_nothing(
    rack: Rack, routers: Routers, clients: List[Client], encapsulation: str
) -> None:
    one, other, _ = clients
    use(rack, encapsulation)
    all_reach(clients)

    def sends(sender: Namespace, key: int) -> bytes:
        inner = hello(other)
        to = Routers.address(0)
        words = [to, *HEADS[encapsulation], str(key), inner.hex()]
        sender.run(sys.executable, "-c", WRAPPED, *words)
        return inner

    peer, stranger = rack.hosts[1].host, routers.namespace
    one.expect(sends(peer, 4711))
    one.expect_none(sends(peer, 4712))
    one.expect_none(sends(stranger, 4711))
    one.expect(sends(peer, 4711))


def test_a_host_tells_of_its_tunnels(rack: Rack, clients: List[Client]) -> None:
    host = rack.hosts[0]
    shown = host.ctl("show")
    assert "underlay 192.0.2.1/24 at eth1" in shown
    assert "fabric0: vxlan with the key 4711 among 192.0.3.1, 192.0.4.1" in shown
    assert "sends over fabric0" in shown
    told = host.ctl("trace", "lab/a", f"dst={ALL}", f"src={clients[0].mac}")
    assert "goes out at uplink fabric0 to 192.0.3.1, without a tag" in told
    assert "goes out at uplink fabric0 to 192.0.4.1, without a tag" in told


def test_it_is_said_what_keeps_frames_from_a_tunnel(rack: Rack, clients: List[Client]) -> None:
    del clients
    host = rack.hosts[0]

    def says(words: str) -> bool:
        return comes_true(lambda: bool(words == host.plane()["said"]))

    assert says("")
    host.apply({"switches": [{"alias": "lab", "mtu": 1442}]})
    host.host.run("ip", "link", "set", "eth1", "mtu", "1499")
    assert says(
        "the way to the peer 192.0.3.1 of the switch 'lab' bears an MTU of 1441, and the switch has"
        " 1442; the way to the peer 192.0.4.1 of the switch 'lab' bears an MTU of 1441, and the"
        " switch has 1442"
    )
    # Which keeps nobody from changing something else.
    host.set_port("lab", "b", vlan=7)
    host.set_port("lab", "b", vlan=0)
    host.host.run("ip", "link", "set", "eth1", "mtu", "1500")
    assert says("")
    host.apply({"switches": [{"alias": "lab", "mtu": 1400}]})


def test_packets_as_large_as_a_tunnel_bears_pass(
    rack: Rack, clients: List[Client], encapsulation: str
) -> None:
    one, other, _ = clients
    use(rack, encapsulation)
    for host in rack.hosts:
        host.apply({"switches": [{"alias": "lab", "mtu": 1442}]})
    rack.set_all(vlan={"guest_tagging": True}, nested_tag=True)

    def sent(tags: str, size: int) -> bytes:
        start = hello(one)
        made = start[:12] + bytes.fromhex(tags) + start[12:]
        return made.ljust(14 + len(tags) // 2 + size, b".")

    try:
        # The second tag is counted in.
        for tags, most in ("", 1442), ("81000007", 1442), ("8100000781000008", 1438):
            assert comes_sooner_or_later(one, other, sent(tags, most))
            larger, largest = sent(tags, most + 1), sent(tags, most)
            one.send(larger)
            one.send(largest)
            other.expect(largest)
            other.expect_none(larger, timeout=0)
    finally:
        rack.set_all(vlan=0, nested_tag=False)
        for host in rack.hosts:
            host.apply({"switches": [{"alias": "lab", "mtu": 1400}]})


def test_packets_that_no_tunnel_bears_are_refused(rack: Rack, clients: List[Client]) -> None:
    del clients
    host = rack.hosts[0]

    def refusal(**settings: Any) -> str:
        document = {"switches": [{"alias": "lab", **settings}]}
        refused = host.try_ctl("apply", "-", given=json.dumps(document))
        assert refused.returncode != 0
        return refused.stdout

    bound = "bears an MTU of 1442, and the switch would have 1443 (QEX_NOT_SUPPORTED)"
    assert f"the way to the peer 192.0.3.1 {bound}" in refusal(mtu=1443)
    host.apply({"switches": [{"alias": "lab", "mtu": 1442, "fabric": {}}]})
    assert f"the way to the peer 192.0.3.1 {bound}" in refusal(mtu=1443, fabric=fabric(0))
    host.apply({"switches": [{"alias": "lab", "mtu": 1443}]})
    assert f"the way to the peer 192.0.4.1 {bound}" in refusal(
        fabric=fabric(0, peers=[Routers.address(2)])
    )
    host.apply({"switches": [{"alias": "lab", "mtu": 1442, "fabric": fabric(0)}]})
    host.apply({"switches": [{"alias": "lab", "mtu": 1400}]})
