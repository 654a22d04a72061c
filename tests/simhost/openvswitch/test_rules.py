"""Switches made by chance, and frames at them: Open vSwitch, told what is made of each, sends every
frame where the rules say, with the tags that they say, and one copy."""

from typing import Any, Dict, List, Tuple

import pytest
from hypothesis import given
from hypothesis import strategies as st

from bench import Bench
from compiler import Compiler
from drawn_switches import (
    BROADCAST,
    CLIENTS,
    MACS,
    PORTS,
    STRANGER,
    UPLINKS,
    frames,
    switches_with_links,
)
from frames import Frame
from links import Links
from open_vswitch import OpenVSwitch
from rules import Rules
from seeds import options


@pytest.fixture(scope="module")
def bench(open_vswitch: OpenVSwitch, compiler: Compiler) -> Bench:
    return Bench(open_vswitch, compiler, "bench", len(UPLINKS) + len(PORTS))


def arrives(bench: Bench, rules: Rules, at: str, frame: Frame) -> None:
    """Holds what comes out of a frame to the rules."""
    found, wanted = bench.look(at, frame), rules.comes_out(at, frame)
    assert found in wanted, f"{frame} at {at}: {found} is none of {wanted}"


@options(40, derandomize=True)
@given(
    drawn=switches_with_links(),
    clients=CLIENTS,
    sent=st.lists(frames(), min_size=1, max_size=30),
)
def test_frames_come_out_where_the_rules_say(
    bench: Bench, drawn: Any, clients: Any, sent: List[Tuple[str, Frame]]
) -> None:
    switch, links = drawn
    rules = bench.load(switch, clients, links=links)
    for at, frame in sent:
        if at in bench.devices and at not in links.down:
            arrives(bench, rules, at, frame)


def of_vlans(*vlans: Any) -> Dict[str, Any]:
    return {"ports": [{"id": port, "vlan": vlan} for port, vlan in zip(PORTS, vlans)]}


def at_two_uplinks(**of_both: Any) -> Dict[str, Any]:
    uplinks = ["nic0", "nic1"]
    return {
        "uplinks": uplinks,
        "uplink_ports": [{"id": uplink, "uplink": uplink, **of_both} for uplink in uplinks],
        "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
        "ports": [{"id": "p1"}],
    }


def test_another_link_would_be_noticed(bench: Bench) -> None:
    clients = [{"port": "p1", "mac": MACS["p1"]}]
    out, into = Frame(BROADCAST, MACS["p1"]), Frame(BROADCAST, STRANGER)
    states = [Links(), Links.cut("nic0"), Links.cut("nic0", "nic1")]
    for links in states:
        rules = bench.load(at_two_uplinks(), clients, links=links)
        arrives(bench, rules, "p1", out)
        others = [Rules(at_two_uplinks(), rules.numbers, clients, one) for one in states]
        for other in others:
            if other.links != links:
                with pytest.raises(AssertionError):
                    arrives(bench, other, "p1", out)
    rules = bench.load(at_two_uplinks(), clients)
    blocked = Rules(at_two_uplinks(blocked=True), rules.numbers, clients)
    for at, frame in ("p1", out), ("nic0", into):
        arrives(bench, rules, at, frame)
        with pytest.raises(AssertionError):
            arrives(bench, blocked, at, frame)


def test_a_copy_too_many_would_be_noticed(bench: Bench) -> None:
    """So would one too few, and another tag."""
    clients = [{"port": port, "mac": MACS[port]} for port in PORTS]
    frame = Frame(BROADCAST, MACS["p1"])
    rules = bench.load(of_vlans(7, 7), clients[:2])
    arrives(bench, rules, "p1", frame)
    for other in (8, {"trunk": [7]}):
        wrong = Rules(of_vlans(7, other), rules.numbers, clients[:2])
        with pytest.raises(AssertionError):
            arrives(bench, wrong, "p1", frame)
    bench.load(of_vlans(7, 7, 7), clients[:3])
    with pytest.raises(AssertionError):
        arrives(bench, rules, "p1", frame)
