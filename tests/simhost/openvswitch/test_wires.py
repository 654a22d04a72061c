"""Real frames through the data path come out where the rules say."""

from typing import Any, Iterator, List, Tuple

import pytest
from hypothesis import given
from hypothesis import strategies as st

from compiler import Compiler
from frames import Frame, Tags
from open_vswitch import OpenVSwitch
from seeds import options
from test_rules import FRAMES, MACS, PORTS, UPLINKS, held_to, switches
from wires import Wires


@pytest.fixture(scope="module")
def wires(
    open_vswitch: OpenVSwitch, compiler: Compiler, tmp_path_factory: pytest.TempPathFactory
) -> Iterator[Wires]:
    folder = tmp_path_factory.mktemp("wires")
    yield Wires(open_vswitch, compiler, folder, len(UPLINKS) + len(PORTS))


@options(8)
@given(
    switch=switches(),
    sent=st.lists(st.tuples(st.integers(0, 6), FRAMES), min_size=6, max_size=6),
)
def test_frames_come_out_where_the_rules_say(
    wires: Wires, switch: Any, sent: List[Tuple[int, Frame]]
) -> None:
    rules = wires.load(switch, [{"port": port, "mac": MACS[port]} for port in PORTS])
    places = [*switch["uplinks"], *PORTS]
    for place, frame in sent:
        at = places[place % len(places)]
        wires.forget()
        held_to(rules, at, frame, wires.transmit(at, frame))


@pytest.mark.parametrize("vlan, tags", [(0, ()), ({"trunk": [7]}, ((7, 0),))])
def test_a_giant_does_not_pass(wires: Wires, vlan: Any, tags: Tags) -> None:
    """A tag is no part of the packet."""
    ports = [{"id": port, "vlan": vlan} for port in ("p1", "p2")]
    clients = [{"port": port, "mac": MACS[port]} for port in ("p1", "p2")]
    wires.load({"mtu": 1400, "ports": ports}, clients)
    for size, count in ((1414, 1), (1415, 0)):
        out = wires.transmit("p1", Frame(MACS["p2"], MACS["p1"], tags, size))
        assert sum(out.values()) == count


def test_a_third_tag_does_not_pass(wires: Wires) -> None:
    ports = [
        {"id": port, "vlan": {"guest_tagging": True}, "nested_tag": True} for port in ("p1", "p2")
    ]
    wires.load({"ports": ports}, [{"port": port, "mac": MACS[port]} for port in ("p1", "p2")])
    for tags, count in ((((7, 0), (8, 0)), 1), (((7, 0), (8, 0), (9, 0)), 0)):
        out = wires.transmit("p1", Frame(MACS["p2"], MACS["p1"], tags))
        assert sum(out.values()) == count
