"""Real frames through the data path come out where the rules say."""

import re
from typing import Any, Iterator, Optional

import pytest
from hypothesis import strategies as st

import frames_by_chance
from compiler import Compiler
from drawn_switches import MACS, PORTS, UPLINKS, choosy_switches, mirroring_switches
from frames import Frame, Tags
from frames_by_chance import ANY
from open_vswitch import OpenVSwitch
from wires import Wires


@pytest.fixture(scope="module")
def wires(
    open_vswitch: OpenVSwitch, compiler: Compiler, tmp_path_factory: pytest.TempPathFactory
) -> Iterator[Wires]:
    folder = tmp_path_factory.mktemp("wires")
    made = Wires(open_vswitch, compiler, folder, len(UPLINKS) + len(PORTS))
    made.lead_to_collectors()
    yield made


def test_frames_of_any_content_come_out_where_the_rules_say(wires: Wires) -> None:
    count, wrong = frames_by_chance.run(wires, 7, 30, shrink=False)
    assert wrong == []
    # Not all of them are such that nothing passes.
    assert count.passed > count.sent / 5 > 100


@pytest.mark.parametrize(
    "switches", [mirroring_switches(), choosy_switches()], ids=["collectors", "groups"]
)
def test_they_do_for_collectors_and_for_who_asks_for_groups(
    wires: Wires, switches: "st.SearchStrategy[Any]"
) -> None:
    count, wrong = frames_by_chance.run(wires, 7, 10, shrink=False, switches=switches)
    assert wrong == []
    assert count.passed > count.sent / 5 > 30


@pytest.mark.parametrize(
    "found, becomes, switches",
    [
        (r"table=14,.*reg8=0x1,", None, ANY),
        (r"table=6, priority=200,", None, ANY),
        (r"move:NXM_NX_REG5\[0\.\.2\]->OXM_OF_VLAN_PCP\[\],", "", ANY),
        (r"move:NXM_NX_REG2\[0\.\.11\]->OXM_OF_VLAN_VID\[\]", "set_field:4097->vlan_vid", ANY),
        (r"check_pkt_larger\(1514\)", "check_pkt_larger(1515)", ANY),
        # Out over what is blocked.
        (r"(table=17, .*reg11=0x\d actions=)drop$", r"\1output:reg11", ANY),
        # The second uplink of a team before the first.
        (
            r"^(group_id=268\d+,type=ff,bucket=bucket_id:0,)(.*?)(,bucket=bucket_id:1,)(.*)",
            r"\1\4\3\2",
            ANY,
        ),
        # Not to those who ask for a group.
        (r"table=26, priority=100,.*dl_dst=01:00:5e:01:01:01", None, choosy_switches()),
        # To another collector, as another session, and told to leave the switch.
        ("198.18.0.7->tun_dst", "198.18.0.8->tun_dst", mirroring_switches()),
        ("0x3ff->tun_id", "0x3fe->tun_id", mirroring_switches()),
        ("0->tun_erspan_dir", "1->tun_erspan_dir", mirroring_switches()),
    ],
)
def test_what_is_wrong_would_be_noticed(
    wires: Wires, found: str, becomes: Optional[str], switches: "st.SearchStrategy[Any]"
) -> None:
    """A flow too few, another tag, one byte too many."""

    def change(flow: str) -> Optional[str]:
        if becomes is None:
            return None if re.search(found, flow) else flow
        return re.sub(found, becomes, flow)

    _, wrong = frames_by_chance.run(wires, 7, 40, shrink=False, change=change, switches=switches)
    assert len(wrong) == 1 and "the rules say" in wrong[0]


@pytest.mark.parametrize(
    "found, becomes, said",
    [
        # What goes out counts as dropped as well.
        (r"(table=23, .*actions=output:\d+)$", r"\1,resubmit(,24)", "came in: "),
        # What is dropped counts nowhere.
        (r".*table=24, .*", None, "came in: "),
        # What comes in for all counts as if it were for several, and so does what goes out.
        ("^cookie=0x14", "cookie=0x13", "came in at least: "),
        ("^cookie=0x17", "cookie=0x16", "went out: "),
    ],
)
def test_what_is_counted_wrong_would_be_noticed(
    wires: Wires, found: str, becomes: Optional[str], said: str
) -> None:
    def change(flow: str) -> Optional[str]:
        if becomes is None:
            return None if re.fullmatch(found, flow) else flow
        return re.sub(found, becomes, flow)

    _, wrong = frames_by_chance.run(wires, 7, 40, shrink=False, change=change)
    assert len(wrong) == 1 and f"counted that {said}" in wrong[0]


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
