"""Members of groups come and go by chance, and real frames come out where what they want says."""

import re
from typing import Iterator, Optional

import pytest

import groups_by_chance
import member_rules
from compiler import Compiler
from drawn_switches import MACS, PORTS
from open_vswitch import OpenVSwitch
from wires import Wires


@pytest.fixture(scope="module")
def wires(
    open_vswitch: OpenVSwitch, compiler: Compiler, tmp_path_factory: pytest.TempPathFactory
) -> Iterator[Wires]:
    folder = tmp_path_factory.mktemp("members")
    yield Wires(open_vswitch, compiler, folder, len(PORTS) + 1, "members")


def test_frames_come_out_where_members_want_them(wires: Wires) -> None:
    count, wrong = groups_by_chance.run(wires, 7, 15, shrink=False)
    assert wrong == []
    # Not all of them are for everybody, or for nobody.
    assert count.passed > count.sent / 10 > 20


@pytest.mark.parametrize(
    "found, becomes",
    [
        # A member too few, and one that gets what it excluded.
        (r"table=26, priority=100,.*nw_dst=239.1.1.1", None),
        (r"table=26, priority=200,.*ipv6_src=", None),
        # Strangers' groups to everybody.
        (
            r"(table=26, priority=0,.*actions=).*",
            r"\1set_field:0x1->reg8,set_field:0->reg9,resubmit(,14)",
        ),
    ],
)
def test_what_is_wrong_would_be_noticed(wires: Wires, found: str, becomes: Optional[str]) -> None:
    def change(flow: str) -> Optional[str]:
        if becomes is None:
            return None if re.search(found, flow) else flow
        return re.sub(found, becomes, flow)

    _, wrong = groups_by_chance.run(wires, 7, 30, shrink=False, change=change)
    assert len(wrong) == 1 and "was wanted" in wrong[0]


@pytest.mark.parametrize("seconds", [-2, 2])
def test_ageing_too_early_or_too_late_would_be_noticed(
    wires: Wires, monkeypatch: pytest.MonkeyPatch, seconds: int
) -> None:
    """The members say nothing more, and the rules wait for another time than the switch."""
    timing = member_rules.Timing(queries=2, interval=125)
    group, source = "239.1.1.1", "10.0.0.1"
    member = member_rules.Host("p2", group, 0)
    members = member_rules.Members(timing, {("p2", group): 2}, MACS)
    passes = timing.membership - 1000 * seconds
    members.follow(
        [
            member_rules.Passes(5000),
            member_rules.Says(member, member_rules.ALL),
            member_rules.Dies(member),
            member_rules.Passes(passes),
        ]
    )
    switch = {
        "uplinks": ["nic0"],
        "multicast": "snooping",
        "ports": [{"id": port, "vlan": 7, "ethernet_filter": {"frames": []}} for port in PORTS],
    }
    clients = [{"port": port, "mac": MACS[port]} for port in PORTS]
    wires.load(switch, clients, heard=members.heard(PORTS))
    sent = ("p1", group, source)
    assert groups_by_chance.disagreement(wires, switch, members, sent) == ""
    # That the group is there, or is not, is what nobody else knows.
    members.now += 2000 * seconds
    assert groups_by_chance.disagreement(wires, switch, members, sent) != ""
