"""Switches made by chance, and frames at them: Open vSwitch, told what is made of each, sends every
frame where the rules say, with the tags that they say, and one copy."""

from collections import Counter
from typing import Any, Counter as Counts, Dict, List, Tuple

import pytest
from hypothesis import given
from hypothesis import strategies as st

from bench import Bench
from compiler import Compiler
from frames import Copy, Frame
from open_vswitch import OpenVSwitch
from rules import Rules
from seeds import options

UPLINKS = ["nic0", "nic1", "nic2"]
PORTS = ["p1", "p2", "p3", "p4"]
MACS = {port: f"02:00:00:00:00:0{port[1]}" for port in PORTS}
STRANGER = "02:00:00:00:00:99"
BROADCAST = "ff:ff:ff:ff:ff:ff"
SOME_GROUP = "01:00:5e:00:00:05"
PRIVATE = [
    {"primary": 100, "secondary": 100, "type": "promiscuous"},
    {"primary": 100, "secondary": 101, "type": "isolated"},
    {"primary": 100, "secondary": 102, "type": "community"},
    {"primary": 100, "secondary": 103, "type": "community"},
]
# Few, so that ports have them in common.
VLANS = [0, 1, 7, 8, 4094]
IN_MAP = [100, 101, 102, 103]
# Of ranges.
ENDS = [0, 1, 6, 7, 8, 99, 101, 103, 4094]


def optional(strategy: "st.SearchStrategy[Any]") -> "st.SearchStrategy[List[Any]]":
    return st.lists(strategy, max_size=1)


@st.composite
def port_vlans(draw: Any, private: bool) -> Any:
    kind = draw(st.sampled_from(["access", "trunk", "guest", "private" if private else "access"]))
    some = VLANS + (IN_MAP if private else [])
    said: Dict[str, Any] = {"id": draw(st.sampled_from(some))}
    if kind == "private":
        said = {"id": draw(st.sampled_from(IN_MAP)), "private": True}
    if kind == "guest":
        said = {"id": draw(st.sampled_from([0, 0, 7])), "guest_tagging": True}
    if kind == "trunk":
        ends = sorted(draw(st.sets(st.sampled_from(ENDS), min_size=1)))
        pairs = zip(ends[::2], ends[1::2])
        said["trunk"] = [f"{first}-{last}" for first, last in pairs]
        if len(ends) % 2:
            said["trunk"].append(ends[-1])
        said["id"] = draw(st.sampled_from([0, 0, *some]))
    for priority in draw(optional(st.integers(0, 7))):
        said["priority"] = priority
    return said


@st.composite
def teamings(draw: Any, uplinks: List[str]) -> Any:
    order = draw(st.permutations(uplinks))
    active = draw(st.integers(0, len(order)))
    return {
        "balance": draw(st.sampled_from(["explicit", "port", "mac", "ip"])),
        "active": order[:active],
        "standby": order[active:] if active else [],
    }


@st.composite
def ports(draw: Any, name: str, private: bool, uplinks: List[str]) -> Any:
    said: Dict[str, Any] = {"id": name, "vlan": draw(port_vlans(private))}
    rare = st.integers(0, 5).map(lambda number: number == 0)
    said["blocked"] = draw(rare)
    said["nested_tag"] = draw(rare)
    said["transmit_uplink"] = draw(rare)
    said["forbids"] = draw(optional(st.sampled_from(["promiscuous", "forged_transmits"])))
    taken = draw(st.sampled_from([[], [], [], ["promiscuous"], ["sink"], ["broadcast"]]))
    said["ethernet_filter"] = {"frames": taken}
    said["mac_learning"] = {"flooding": draw(rare), "learning": draw(rare)}
    if uplinks and draw(rare):
        said["teaming"] = draw(teamings(uplinks))
    return said


@st.composite
def switches(draw: Any) -> Any:
    private = draw(st.booleans())
    uplinks = UPLINKS[: draw(st.integers(0, 3))]
    said: Dict[str, Any] = {
        "uplinks": uplinks,
        "ports": [draw(ports(name, private, uplinks)) for name in PORTS],
    }
    if private:
        said["private_vlans"] = PRIVATE
    if uplinks and draw(st.booleans()):
        said["teaming"] = draw(teamings(uplinks))
    return said


ADDRESSES = st.sampled_from([*MACS.values(), STRANGER])
VIDS = st.sampled_from([*VLANS, *IN_MAP, 4095])
TAGS = st.lists(st.tuples(VIDS, st.integers(0, 7)), max_size=2).map(lambda tags: (*tags,))
FRAMES = st.builds(
    Frame,
    destination=st.one_of(ADDRESSES, st.sampled_from([BROADCAST, SOME_GROUP, "01:80:c2:00:00:0e"])),
    source=st.one_of(ADDRESSES, ADDRESSES, st.sampled_from([SOME_GROUP, "00:00:00:00:00:00"])),
    tags=TAGS,
    size=st.sampled_from([60, 60, 60, 1514, 1515]),
)


@pytest.fixture(scope="module")
def bench(open_vswitch: OpenVSwitch, compiler: Compiler) -> Bench:
    return Bench(open_vswitch, compiler, "bench", len(UPLINKS) + len(PORTS))


def held_to(rules: Rules, at: str, frame: Frame, out: "Counts[Copy]") -> None:
    """Holds what came out of a frame to the rules."""
    wanted, allowed = rules.comes_out(at, frame)
    found: Counts[Copy] = Counter()
    used = set()
    for (name, tags, most), count in out.items():
        if name in UPLINKS:
            used.add(name)
        found[("wire" if name in UPLINKS else name, tags, most)] += count
    assert found == wanted, f"{frame} at {at}"
    assert used <= allowed


def arrives(bench: Bench, rules: Rules, at: str, frame: Frame) -> None:
    held_to(rules, at, frame, bench.look(at, frame))


@options(40)
@given(
    switch=switches(),
    known=st.lists(st.booleans(), min_size=len(PORTS), max_size=len(PORTS)),
    sent=st.lists(st.tuples(st.integers(0, 6), FRAMES), min_size=1, max_size=30),
)
def test_frames_come_out_where_the_rules_say(
    bench: Bench, switch: Any, known: List[bool], sent: List[Tuple[int, Frame]]
) -> None:
    clients: List[Dict[str, Any]] = [
        {"port": port, "mac": MACS[port]} if is_known else {"port": port}
        for port, is_known in zip(PORTS, known)
    ]
    rules = bench.load(switch, clients)
    places = [*switch["uplinks"], *PORTS]
    for place, frame in sent:
        arrives(bench, rules, places[place % len(places)], frame)


def of_vlans(*vlans: Any) -> Dict[str, Any]:
    return {"ports": [{"id": port, "vlan": vlan} for port, vlan in zip(PORTS, vlans)]}


def test_a_copy_too_many_would_be_noticed(bench: Bench) -> None:
    """So would one too few, and another tag."""
    clients = [{"port": port, "mac": MACS[port]} for port in PORTS]
    frame = Frame(BROADCAST, MACS["p1"])
    rules = bench.load(of_vlans(7, 7), clients[:2])
    arrives(bench, rules, "p1", frame)
    for other in (8, {"trunk": [7]}):
        wrong = Rules(of_vlans(7, other), rules.numbers, rules.macs)
        with pytest.raises(AssertionError):
            arrives(bench, wrong, "p1", frame)
    bench.load(of_vlans(7, 7, 7), clients[:3])
    with pytest.raises(AssertionError):
        arrives(bench, rules, "p1", frame)
