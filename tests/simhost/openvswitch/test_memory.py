"""What a switch learns from frames, and what comes of it for the next ones."""

from typing import Any, Dict, Iterator, List, Mapping, Set

import pytest

from bench import Bench
from compiler import Compiler
from frames import Frame
from open_vswitch import OpenVSwitch

A = "02:00:00:00:aa:01"
B = "02:00:00:00:aa:02"
C = "02:00:00:00:aa:03"
BROADCAST = "ff:ff:ff:ff:ff:ff"
LEARNS = {"learning": True}
CLIENT = "02:00:00:00:00:01"


@pytest.fixture(scope="module")
def bench(open_vswitch: OpenVSwitch, compiler: Compiler) -> Bench:
    return Bench(open_vswitch, compiler, "memory", 5)


class Clock(Bench):
    """One whose time stands, so that it ages what it learned when it is told to."""

    def __init__(self, open_vswitch: OpenVSwitch, compiler: Compiler) -> None:
        super().__init__(open_vswitch, compiler, "aging", 5)
        self._clock = open_vswitch
        open_vswitch.ask("time/stop")

    def warp(self, seconds: int) -> None:
        self._clock.ask("time/warp", str(seconds * 1000), "1000")
        self._clock.ask("revalidator/wait")


@pytest.fixture(scope="module")
def clock(tmp_path_factory: pytest.TempPathFactory, compiler: Compiler) -> Iterator[Clock]:
    # It cannot be told to go on.
    stopped = OpenVSwitch(tmp_path_factory.mktemp("clock"))
    yield Clock(stopped, compiler)
    stopped.close()


def at_two_uplinks(*ports: Mapping[str, Any], **settings: Any) -> Dict[str, Any]:
    """A switch; its team uses the first uplink."""
    return {
        "uplinks": ["nic0", "nic1"],
        "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
        "ports": [{"id": f"p{number}", **port} for number, port in enumerate(ports, 1)],
        **settings,
    }


def load(bench: Bench, switch: Mapping[str, Any], *macs: str) -> None:
    clients: List[Dict[str, str]] = [{"port": port["id"]} for port in switch["ports"]]
    for client, mac in zip(clients, macs):
        client["mac"] = mac
    bench.load(switch, clients)


def reached(bench: Bench, at: str, destination: str, source: str) -> Set[str]:
    """The devices at which a frame comes out."""
    return {name for name, _, _ in bench.send(at, Frame(destination, source))}


def learner(**more: Any) -> Dict[str, Any]:
    return {"mac_learning": {**LEARNS, **more}}


def test_a_learned_address_is_at_one_port(bench: Bench) -> None:
    load(bench, at_two_uplinks(learner(), learner(), learner()))
    assert reached(bench, "p2", A, B) == {"nic0"}
    reached(bench, "p1", BROADCAST, A)
    assert reached(bench, "p2", A, B) == {"p1"}
    assert reached(bench, "p1", B, A) == {"p2"}


def test_it_moves_with_its_frames(bench: Bench) -> None:
    load(bench, at_two_uplinks(learner(), learner(), learner()))
    reached(bench, "p1", BROADCAST, A)
    reached(bench, "p3", BROADCAST, A)
    assert reached(bench, "p2", A, B) == {"p3"}


def test_it_is_known_in_its_vlan_only(bench: Bench) -> None:
    load(bench, at_two_uplinks({**learner(), "vlan": 7}, {**learner(), "vlan": 8}))
    reached(bench, "p1", BROADCAST, A)
    assert reached(bench, "p2", A, B) == {"nic0"}


def test_private_vlans_learn_as_one(bench: Bench) -> None:
    entries = [
        {"primary": 100, "secondary": 100, "type": "promiscuous"},
        {"primary": 100, "secondary": 101, "type": "isolated"},
    ]
    ports = [{**learner(), "vlan": {"id": vlan, "private": True}} for vlan in (100, 101)]
    load(bench, at_two_uplinks(*ports, private_vlans=entries))
    reached(bench, "p2", BROADCAST, A)
    assert reached(bench, "p1", A, B) == {"p2"}


def test_what_is_learned_beyond_the_uplinks_stays_there(bench: Bench) -> None:
    load(bench, at_two_uplinks({"mac_learning": {"flooding": True}}, {}), A, B)
    assert reached(bench, "p2", C, B) == {"p1", "nic0"}
    reached(bench, "nic0", BROADCAST, C)
    assert reached(bench, "p2", C, B) == {"nic0"}
    assert reached(bench, "nic0", C, "02:00:00:00:aa:04") == set()


def test_it_ages(clock: Clock) -> None:
    load(clock, at_two_uplinks(learner(), {}, mac_learning={"aging_time": 20}), CLIENT, B)
    reached(clock, "p1", BROADCAST, A)
    clock.warp(seconds=19)
    assert reached(clock, "p2", A, B) == {"p1"}
    clock.warp(seconds=2)
    assert reached(clock, "p2", A, B) == {"nic0"}


@pytest.mark.parametrize("policy, passes", [("drop", False), ("allow", True)])
def test_a_port_has_so_many(bench: Bench, policy: str, passes: bool) -> None:
    limited = learner(limit=2, limit_policy=policy)
    load(bench, at_two_uplinks(limited, learner()))
    for address in (A, B):
        assert reached(bench, "p1", BROADCAST, address) == {"p2", "nic0"}
    assert bool(reached(bench, "p1", BROADCAST, C)) == passes
    assert reached(bench, "p2", C, A) == {"nic0"}


@pytest.mark.parametrize("policy, passes", [("drop", False), ("allow", True)])
def test_a_port_that_may_have_none_has_none(bench: Bench, policy: str, passes: bool) -> None:
    load(bench, at_two_uplinks(learner(limit=0, limit_policy=policy), learner()), C)
    assert bool(reached(bench, "p1", BROADCAST, A)) == passes
    assert reached(bench, "p1", BROADCAST, C) == {"p2", "nic0"}


@pytest.mark.parametrize("policy, passes", [("drop", False), ("allow", True)])
def test_so_has_a_switch(bench: Bench, policy: str, passes: bool) -> None:
    port = learner(limit_policy=policy)
    load(bench, at_two_uplinks(port, port, mac_learning={"limit": 1}), CLIENT, C)
    for _ in range(2):
        assert reached(bench, "p1", BROADCAST, A) == {"p2", "nic0"}
        assert bool(reached(bench, "p2", BROADCAST, B)) == passes
    assert reached(bench, "p2", BROADCAST, C) == {"p1", "nic0"}


def test_an_address_that_is_not_known_is_the_first_one(bench: Bench) -> None:
    load(bench, at_two_uplinks({"forbids": ["forged_transmits"]}, {}))
    assert reached(bench, "p1", BROADCAST, A) == {"p2", "nic0"}
    assert reached(bench, "p1", BROADCAST, B) == set()
    assert reached(bench, "p1", BROADCAST, A) == {"p2", "nic0"}
    assert reached(bench, "p2", A, C) == {"p1"}


def test_it_is_that_in_all_vlans_of_a_client_that_tags(bench: Bench) -> None:
    trunk = {"vlan": {"trunk": ["7-8"]}}
    load(bench, at_two_uplinks({**trunk, "forbids": ["forged_transmits"]}, trunk))

    def passes(vlan: int, source: str) -> bool:
        return bool(bench.send("p1", Frame(BROADCAST, source, ((vlan, 0),))))

    assert passes(7, A)
    assert not passes(8, B)
    assert passes(8, A)
    assert set(bench.send("p2", Frame(A, C, ((8, 0),)))) == {("p1", ((8, 0),), None)}


@pytest.mark.parametrize("port", [learner(), {}])
def test_own_frames_do_not_come_back(clock: Clock, port: Any) -> None:
    """Nor does a client that is heard elsewhere stay unheard there."""
    load(clock, at_two_uplinks(port, learner()))
    assert reached(clock, "p1", BROADCAST, A) == {"p2", "nic0"}
    assert reached(clock, "nic0", BROADCAST, A) == set()
    assert reached(clock, "p2", A, B) == {"p1"}
    clock.warp(seconds=3)
    assert reached(clock, "nic0", BROADCAST, A) == {"p1", "p2"}


@pytest.mark.parametrize("aging", [0, 300])
def test_nor_do_frames_from_addresses_that_are_not_the_client_s(bench: Bench, aging: int) -> None:
    """Of a port that learns nothing; the other one would hear them twice, over its own uplink."""
    other = {"teaming": {"balance": "explicit", "active": ["nic1"]}}
    fixed = {"addresses": [{"mac": C, "type": "static"}], "mac_learning": {"aging_time": aging}}
    load(bench, at_two_uplinks({}, other, **fixed), CLIENT, B)
    for source in (A, C):
        assert reached(bench, "p1", BROADCAST, source) == {"p2", "nic0"}
        assert reached(bench, "nic1", BROADCAST, source) == set()


def test_a_port_does_not_hear_what_it_had_to_send(bench: Bench) -> None:
    load(bench, at_two_uplinks({"transmit_uplink": True}, {}), CLIENT, B)
    for source in (CLIENT, A):
        assert reached(bench, "p1", BROADCAST, source) == {"nic0"}
        assert reached(bench, "nic0", BROADCAST, source) == {"p2"}


def test_what_comes_back_over_the_only_uplink_teaches_nothing(bench: Bench) -> None:
    switch = at_two_uplinks({**learner(), "transmit_uplink": True}, {})
    load(bench, {**switch, "uplinks": ["nic0"], "teaming": {}}, CLIENT, B)
    assert reached(bench, "p1", B, A) == {"nic0"}
    assert reached(bench, "nic0", B, A) == {"p2"}
    assert reached(bench, "p2", A, B) == {"p1"}


def test_what_had_to_go_over_an_uplink_comes_back(bench: Bench) -> None:
    load(bench, at_two_uplinks({**learner(), "transmit_uplink": True}, {}), CLIENT, B)
    for source in (CLIENT, A):
        assert reached(bench, "p1", B, source) == {"nic0"}
        assert reached(bench, "nic0", B, source) == {"p2"}
        assert reached(bench, "p2", source, B) == {"p1"}


def test_a_fixed_address_stays(bench: Bench) -> None:
    fixed = {"addresses": [{"mac": A, "type": "static"}]}
    load(bench, at_two_uplinks(fixed, learner(), {}))
    reached(bench, "p2", BROADCAST, A)
    assert reached(bench, "p3", A, C) == {"p1"}


def test_or_moves_where_the_switch_says_so(bench: Bench) -> None:
    moving = {"mac_learning": {"aging_time": 300, "limit": 9, "learn_static": True}}
    load(bench, at_two_uplinks({}, learner(), {}, **moving), CLIENT)
    assert reached(bench, "p3", CLIENT, C) == {"p1"}
    reached(bench, "p2", BROADCAST, CLIENT)
    assert reached(bench, "p3", CLIENT, C) == {"p2"}
    reached(bench, "p1", BROADCAST, CLIENT)
    assert reached(bench, "p3", CLIENT, C) == {"p1"}


def test_one_of_a_port_without_a_device_is_nowhere(bench: Bench) -> None:
    away = {"addresses": [{"mac": A, "type": "static"}]}
    switch = at_two_uplinks({"mac_learning": {"flooding": True}}, {}, away)
    bench.load(switch, [{"port": "p1"}, {"port": "p2"}])
    for at in ("nic0", "p2"):
        assert reached(bench, at, A, B) == set()


def test_addresses_beyond_the_uplinks_can_be_fixed(bench: Bench) -> None:
    beyond = {"addresses": [{"mac": A, "type": "user"}]}
    load(bench, at_two_uplinks({"mac_learning": {"flooding": True}}, {}, **beyond))
    assert reached(bench, "p2", A, B) == {"nic0"}
