"""Groups of uplinks whose partner is another Open vSwitch."""

import json
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Tuple

import pytest

import simhost
from frame_lab import Lab, comes_true
from lacp_partner import Partner
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import Client

HOST: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}, {"name": "nic2"}],
    "switches": [
        {
            "alias": "lab",
            "uplinks": ["nic0", "nic1", "nic2"],
            "lags": [{"name": "lag1", "uplinks": ["nic0", "nic1"], "rate": "fast"}],
            "teaming": {"balance": "explicit", "active": ["lag1"]},
            "ports": [{"id": "a"}],
        }
    ],
}
BOTH = ["nic0", "nic1"]
BROADCAST = "ff:ff:ff:ff:ff:ff"
# What tells the frames of these tests from all others.
MARK = b"one of many "
LENGTH = 1000  # of each


@pytest.fixture(scope="module")
def lab(tmp_path_factory: pytest.TempPathFactory) -> Iterator[Lab]:
    with Lab(tmp_path_factory.mktemp("lab"), HOST) as lab:
        lab.start()
        yield lab


@pytest.fixture(scope="module")
def lasting_partner(lab: Lab) -> Iterator[Partner]:
    with Partner(lab, lab.folder / "partner", "nic0", "nic1") as partner:
        yield partner


@pytest.fixture(scope="module")
def near(lab: Lab, lasting_partner: Partner) -> Client:
    return lab.client("lab", "a")


@pytest.fixture
def partner(lab: Lab, lasting_partner: Partner, near: Client) -> Partner:
    """With both uplinks, over which its client is reached."""
    lab.apply(HOST)
    lasting_partner.bond("nic0", "nic1")
    assert comes_true(lambda: up(lab) == ["nic0", "nic1"])
    assert near.comes_to_reach(lasting_partner.client)
    return lasting_partner


def up(lab: Lab) -> List[str]:
    """The uplinks that aggregation uses, as callers are told."""
    program = (
        "import json; from libvswitch import checked\n"
        "names = [uplink.name for uplink in checked.VSQEX_GetUplinks('lab')]\n"
        "state = checked.VSQEX_GetUplinkLACPLinkState\n"
        "print(json.dumps([name for name in names if state('lab', name) == 1]))"
    )
    names: List[str] = json.loads(lab.python(program).splitlines()[-1])
    return names


def numbered(source: str, destination: str, number: int) -> bytes:
    """One of many frames that differ in what flows differ in."""
    addresses = bytes([10, 1, number, 1, 10, 2, 0, 1])
    header = bytes([0x45, 0, 0, 60, 0, 0, 0, 0, 64, 17, 0, 0]) + addresses
    ports = (1000 + number).to_bytes(2, "big") + (2000).to_bytes(2, "big") + bytes([0, 40, 0, 0])
    payload = header + ports + MARK + bytes([number])
    return simhost.frame(
        destination, source, ethertype=0x0800, payload=payload.ljust(LENGTH, b"\0")
    )


def copies(client: Client, count: int) -> List[int]:
    """Which of so many marked frames came, each as often as it did."""
    came = [client.expect(lambda frame: MARK in frame) for _ in range(count)]
    client.expect_none(lambda frame: MARK in frame)
    return sorted(frame[frame.index(MARK) + len(MARK)] for frame in came)


def send_many(client: Client, destination: str) -> List[int]:
    """Frames of 32 flows; returns their numbers."""
    numbers = list(range(32))
    for number in numbers:
        client.send(numbered(client.mac, destination, number))
    return numbers


def test_flows_are_spread_over_the_uplinks_of_a_group(partner: Partner, near: Client) -> None:
    """In both directions, and of each frame there is one copy."""
    far = partner.client
    before = partner.received()
    sent = send_many(near, far.mac)
    assert copies(far, len(sent)) == sent
    # What LACP and the clients themselves send meanwhile is short.
    grown = {uplink: count - before[uplink] for uplink, count in partner.received().items()}
    assert all(count >= 5 * LENGTH for count in grown.values()), grown
    for destination in (near.mac, BROADCAST):
        sent = send_many(far, destination)
        assert copies(near, len(sent)) == sent
    sent = send_many(near, BROADCAST)
    assert copies(far, len(sent)) == sent
    near.expect_none(lambda frame: MARK in frame)


def test_an_uplink_whose_partner_is_gone_is_left(lab: Lab, partner: Partner, near: Client) -> None:
    # The wire of the other one keeps its link.
    partner.bond("nic1")
    assert comes_true(lambda: up(lab) == ["nic1"])
    assert "nic0       link up" in lab.ctl("show")
    assert near.comes_to_reach(partner.client)
    sent = send_many(near, partner.client.mac)
    assert copies(partner.client, len(sent)) == sent


def test_a_group_is_up_while_it_has_a_partner(lab: Lab, partner: Partner, near: Client) -> None:
    """And an uplink that stands by for it carries nothing so long."""
    other = lab.network("nic2").client()
    teaming = {"balance": "explicit", "active": ["lag1"], "standby": ["nic2"]}
    lab.apply({"switches": [{"alias": "lab", "teaming": teaming}]})
    assert "group lag1 up" in lab.ctl("show")
    assert near.comes_to_reach(partner.client)
    assert not near.reaches(other)
    partner.leave()
    assert near.comes_to_reach(other)
    assert up(lab) == []
    assert "group lag1 down" in lab.ctl("show")
    groups = "print([(group.name, group.link.name) for group in Host().switches['lab'].lags])"
    assert "[('lag1', 'DOWN')]" in lab.python(f"from vswitch import Host; {groups}")


def test_uplinks_come_and_go_without_the_others(lab: Lab, partner: Partner, near: Client) -> None:
    def group(*uplinks: str) -> None:
        lags = [{"name": "lag1", "uplinks": list(uplinks), "rate": "fast"}]
        lab.apply({"switches": [{"alias": "lab", "lags": lags}]})

    group("nic0")
    assert up(lab) == ["nic0"], "nothing begins anew"
    group("nic0", "nic1")
    assert comes_true(lambda: up(lab) == ["nic0", "nic1"])
    group("nic1")
    assert up(lab) == ["nic1"]
    assert near.comes_to_reach(partner.client)


def test_a_daemon_that_comes_later_finds_the_partners(
    lab: Lab, partner: Partner, near: Client
) -> None:
    lab.stop()
    partner.leave()
    lab.start()
    assert comes_true(lambda: up(lab) == [])
    partner.bond("nic0", "nic1")
    assert near.comes_to_reach(partner.client)


@pytest.fixture
def standing(tmp_path: Path) -> Iterator[Tuple[Lab, LastingOpenVSwitch, Partner]]:
    """A host, its Open vSwitch and that of its partner, whose clocks can be stopped."""
    with Lab(tmp_path, HOST) as lab:
        own = LastingOpenVSwitch(lab.host, lab.run_folder(), clock_may_stand=True)
        with own, Partner(lab, tmp_path / "partner", *BOTH, clock_may_stand=True) as partner:
            lab.start(own.where)
            yield lab, own, partner


def members(own: LastingOpenVSwitch) -> List[str]:
    """What Open vSwitch says of them."""
    said = own.ask("lacp/show").splitlines()
    return [line.split(": ")[2] for line in said if line.startswith("member: ")]


def heard(own: LastingOpenVSwitch) -> List[int]:
    """How many messages came over each member."""
    said = own.ask("lacp/show-stats").splitlines()
    return [int(line.split(": ")[1]) for line in said if "  RX PDUs: " in line]


def test_a_silent_partner_is_left_in_time_and_one_that_waits_is_asked(
    standing: Tuple[Lab, LastingOpenVSwitch, Partner]
) -> None:
    lab, own, partner = standing
    clocks = own, partner.open_vswitch
    for clock in clocks:
        clock.stop_clock()

    def comes_in_time(condition: Callable[[], bool]) -> bool:
        def is_true() -> bool:
            for clock in clocks:
                clock.warp(1)
            return condition()

        return comes_true(is_true)

    # Three times what a partner may take from one message to the next.
    for lacp, rate, next_message, still, too_long in (
        ("active", "fast", 2, 2, 2),
        ("passive", "slow", 31, 85, 10),
    ):
        partner.bond(*BOTH, lacp=lacp, rate=rate)
        assert comes_in_time(lambda: up(lab) == BOTH)
        lags = [{"name": "lag1", "uplinks": BOTH, "rate": rate}]
        lab.apply({"switches": [{"alias": "lab", "lags": lags}]})
        assert comes_in_time(lambda: partner.rate_wanted() == rate)
        before = heard(own)
        partner.open_vswitch.warp(next_message)
        assert comes_true(lambda: all(now > was for now, was in zip(heard(own), before)))
        partner.leave()
        own.warp(still)
        assert members(own) == ["current attached"] * 2
        assert up(lab) == BOTH
        own.warp(too_long)
        assert comes_true(lambda: up(lab) == []), members(own)
