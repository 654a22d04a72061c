"""Real frames through the data path come out where the rules say."""

import re
from typing import Any, Iterator, Optional

import pytest

import frames_by_chance
from compiler import Compiler
from drawn_switches import MACS, PORTS, UPLINKS
from frames import Frame, Tags
from open_vswitch import OpenVSwitch
from wires import Wires


@pytest.fixture(scope="module")
def wires(
    open_vswitch: OpenVSwitch, compiler: Compiler, tmp_path_factory: pytest.TempPathFactory
) -> Iterator[Wires]:
    folder = tmp_path_factory.mktemp("wires")
    yield Wires(open_vswitch, compiler, folder, len(UPLINKS) + len(PORTS))


def test_frames_of_any_content_come_out_where_the_rules_say(wires: Wires) -> None:
    count, wrong = frames_by_chance.run(wires, 7, 40, shrink=False)
    assert wrong == []
    # Not all of them are such that nothing passes.
    assert count.passed > count.sent / 5 > 100


@pytest.mark.parametrize(
    "found, becomes",
    [
        (r"table=14,.*reg8=0x1,", None),
        (r"table=6, priority=200,", None),
        (r"move:NXM_NX_REG5\[0\.\.2\]->OXM_OF_VLAN_PCP\[\],", ""),
        (r"move:NXM_NX_REG2\[0\.\.11\]->OXM_OF_VLAN_VID\[\]", "set_field:4097->vlan_vid"),
        (r"check_pkt_larger\(1514\)", "check_pkt_larger(1515)"),
        # Out over what is blocked.
        (r"(table=17, .*reg11=0x\d actions=)drop$", r"\1output:reg11"),
    ],
)
def test_what_is_wrong_would_be_noticed(wires: Wires, found: str, becomes: Optional[str]) -> None:
    """A flow too few, another tag, one byte too many."""

    def change(flow: str) -> Optional[str]:
        if becomes is None:
            return None if re.search(found, flow) else flow
        return re.sub(found, becomes, flow)

    _, wrong = frames_by_chance.run(wires, 7, 40, shrink=False, change=change)
    assert len(wrong) == 1 and "the rules say" in wrong[0]


@pytest.mark.parametrize("vlan, tags", [(0, ()), ({"trunk": [7]}, ((7, 0),))])
def test_a_giant_does_not_pass(wires: Wires, vlan: Any, tags: Tags) -> None:
    """A tag is no part of the packet."""
    ports = [{"id": port, "vlan": vlan} for port in ("p1", "p2")]
    clients = [{"port": port, "mac": MACS[port]} for port in ("p1", "p2")]
    wires.load({"mtu": 1400, "ports": ports}, clients)
    for size, count in ((1414, 1), (1415, 0)):
        out = wires.transmit("p1", Frame(MACS["p2"], MACS["p1"], tags, size).to_bytes())
        assert sum(out.values()) == count


def test_a_third_tag_does_not_pass(wires: Wires) -> None:
    ports = [
        {"id": port, "vlan": {"guest_tagging": True}, "nested_tag": True} for port in ("p1", "p2")
    ]
    wires.load({"ports": ports}, [{"port": port, "mac": MACS[port]} for port in ("p1", "p2")])
    for tags, count in ((((7, 0), (8, 0)), 1), (((7, 0), (8, 0), (9, 0)), 0)):
        out = wires.transmit("p1", Frame(MACS["p2"], MACS["p1"], tags).to_bytes())
        assert sum(out.values()) == count
