"""Up to which limits ports and a switch learn: where frames of the last address and of the next one
go, and what of them is counted, exact to the frame."""

import os
import signal
from typing import Any, Dict

import pytest

from counted_frames import BROADCAST, LENGTH, come_to, counters, send
from frame_lab import Lab, comes_true, learned_ages
from lasting_open_vswitch import LastingOpenVSwitch
from simhost import Client

ROW = 5


def address(number: int) -> str:
    return f"02:00:00:00:77:{number:02x}"


def learns(limit: int, policy: str = "drop") -> Dict[str, Any]:
    return {
        "mac_learning": {
            "learning": True,
            "flooding": True,
            "limit": limit,
            "limit_policy": policy,
        }
    }


class Sender:
    """A client at a port."""

    def __init__(self, lab: Lab, port: str, clock_stands: bool = False) -> None:
        self._lab = lab
        self._port = port
        self._clock_stands = clock_stands
        self.client: Client = lab.client("lab", port)

    def rows(self, source: str, count: int = 1) -> int:
        """Frames to everybody, each row of them when all before are counted; how many they are."""
        for _ in range(count):
            self._send(source, ROW)
        return count * ROW

    def refused_rows(self, source: str, count: int = 1) -> int:
        """Likewise of an address for which there is no room.

        Open vSwitch forgets how the first one went when it learns that, and may count none of
        those that go so at that moment."""
        for _ in range(count):
            self._send(source, 1)
            self._lab.have_counted()
            self._send(source, ROW - 1)
        return count * ROW

    def tells(self, **wanted: int) -> None:
        """Comes to these counters, and to no others."""
        for name in ("InBroadcast", "OutBroadcast"):
            if frames := wanted.pop(name, 0):
                wanted.update({f"pkts{name}": frames, f"bytes{name}": frames * LENGTH})
        come_to(
            lambda: counters(self._lab, self._port),
            {name: number for name, number in wanted.items() if number},
        )

    def number_learned(self) -> int:
        return len(learned_ages(self._lab, self._port))

    def _send(self, source: str, count: int) -> None:
        wanted = self._counted() + count
        send(self.client, count, BROADCAST, source=source)
        come_to(self._counted, wanted)

    def _counted(self) -> int:
        if self._clock_stands:
            self._lab.have_counted()
        found = counters(self._lab, self._port)
        return found.get("pktsInBroadcast", 0) + found.get("pktsInDropped", 0)


def count_often(lab: Lab) -> None:
    """So that nobody has to wait half a second for what was counted."""
    database = f"--db=unix:{lab.run_folder()}/db.sock"
    lab.host.run(
        *("ovs-vsctl", database, "set", "Open_vSwitch", "."),
        "other_config:max-revalidator=50",
    )


@pytest.fixture(name="lab")
def lab_that_counts_often(idle: Lab) -> Lab:
    idle.start()
    count_often(idle)
    return idle


def limit_switch(lab: Lab, limit: int) -> None:
    lab.apply({"switches": [{"alias": "lab", "mac_learning": {"limit": limit}}]})


@pytest.mark.parametrize("whose, policy", [("port", "drop"), ("switch", "allow")])
def test_an_address_past_the_limit_is_refused(lab: Lab, whose: str, policy: str) -> None:
    lab.set_port("lab", "a", **learns(limit=2 if whose == "port" else 9, policy=policy))
    if whose == "switch":
        limit_switch(lab, 2)
    one, other = Sender(lab, "a"), Sender(lab, "b")
    let_in = sum(one.rows(address(number), count=2) for number in (1, 2))
    refused = sum(one.refused_rows(address(number)) for number in (3, 4))
    let_in += one.rows(address(1))
    if policy == "drop":
        one.tells(InBroadcast=let_in, pktsInDropped=refused, noLearningDroppedPkts=refused)
    else:
        let_in += refused
        one.tells(InBroadcast=let_in, noLearningAllowedPkts=refused)
    other.tells(OutBroadcast=let_in)
    assert one.number_learned() == 2


def test_what_a_port_refuses_takes_no_room_of_the_switch(lab: Lab) -> None:
    lab.set_port("lab", "a", **learns(limit=1))
    lab.set_port("lab", "b", **learns(limit=9))
    limit_switch(lab, 2)
    one, other = Sender(lab, "a"), Sender(lab, "b")
    let_in = one.rows(address(1))
    refused = one.refused_rows(address(2)) + one.refused_rows(address(3))
    more = other.rows(address(4))
    refused_more = other.refused_rows(address(5))
    dropped = {"pktsInDropped": refused, "noLearningDroppedPkts": refused}
    one.tells(InBroadcast=let_in, OutBroadcast=more, **dropped)
    dropped = {"pktsInDropped": refused_more, "noLearningDroppedPkts": refused_more}
    other.tells(InBroadcast=more, OutBroadcast=let_in, **dropped)


def test_a_forged_address_takes_no_room(lab: Lab) -> None:
    """Of a client whose address nobody said: the first that it sends from is its own."""
    lab.set_port("lab", "a", forbids=["forged_transmits"], **learns(limit=9))
    lab.set_port("lab", "b", **learns(limit=9))
    limit_switch(lab, 2)
    one, other = Sender(lab, "a"), Sender(lab, "b")
    let_in = one.rows(one.client.mac)
    forged = one.rows(address(1)) + one.rows(address(2))
    let_in += one.rows(one.client.mac)
    assert one.number_learned() == 1
    more = other.rows(other.client.mac)
    one.tells(InBroadcast=let_in, OutBroadcast=more, pktsInDropped=forged)
    other.tells(InBroadcast=more, OutBroadcast=let_in)
    # Whoever is forged is where it was.
    lab.set_port("lab", "b", forbids=["forged_transmits"])
    forged += one.rows(other.client.mac)
    more += other.rows(other.client.mac)
    one.tells(InBroadcast=let_in, OutBroadcast=more, pktsInDropped=forged)


def test_frames_count_where_the_address_was_that_moves(
    idle: Lab, clock: LastingOpenVSwitch
) -> None:
    for port in "ab":
        idle.set_port("lab", port, **learns(limit=2))
    one, other = (Sender(idle, port, clock_stands=True) for port in "ab")
    # Nothing is added up before it moves.
    clock.stop_clock()
    moving = bytes.fromhex(address(1).replace(":", ""))
    here = there = 0
    for _ in range(3):
        send(one.client, ROW, BROADCAST, source=address(1))
        for _ in range(ROW):
            other.client.expect(lambda frame: frame[6:12] == moving)
        here += ROW
        there += other.rows(address(1))
    one.tells(InBroadcast=here, OutBroadcast=there, numMACsMoved=2)
    other.tells(InBroadcast=there, OutBroadcast=here, numMACsMoved=3)


def test_no_address_moves_to_a_port_that_has_no_room(lab: Lab) -> None:
    lab.set_port("lab", "a", **learns(limit=1))
    lab.set_port("lab", "b", **learns(limit=9))
    one, other = Sender(lab, "a"), Sender(lab, "b")
    here = one.rows(address(1))
    there = other.rows(address(2))
    refused = one.refused_rows(address(2))
    there += other.rows(address(2))
    dropped = {"pktsInDropped": refused, "noLearningDroppedPkts": refused}
    one.tells(InBroadcast=here, OutBroadcast=there, **dropped)
    other.tells(InBroadcast=there, OutBroadcast=here)
    assert (one.number_learned(), other.number_learned()) == (1, 1)


def test_an_address_moves_on_a_switch_that_has_no_room(lab: Lab) -> None:
    for port in "ab":
        lab.set_port("lab", port, **learns(limit=9))
    limit_switch(lab, 2)
    one, other = Sender(lab, "a"), Sender(lab, "b")
    here = one.rows(address(1)) + one.rows(address(2))
    there = other.rows(address(1))
    refused = other.refused_rows(address(3))
    dropped = {"pktsInDropped": refused, "noLearningDroppedPkts": refused}
    one.tells(InBroadcast=here, OutBroadcast=there)
    other.tells(InBroadcast=there, OutBroadcast=here, numMACsMoved=1, **dropped)


def test_an_address_that_is_put_somewhere_takes_no_room(lab: Lab) -> None:
    fixed = {"mac": address(9), "type": "static"}
    lab.set_port("lab", "a", addresses=[fixed], **learns(limit=1))
    one, other = Sender(lab, "a"), Sender(lab, "b")
    let_in = sum(one.rows(address(number)) for number in (9, 1, 9))
    refused = one.refused_rows(address(2))
    let_in += one.rows(address(9))
    dropped = {"pktsInDropped": refused, "noLearningDroppedPkts": refused}
    one.tells(InBroadcast=let_in, **dropped)
    other.tells(OutBroadcast=let_in)


def test_an_address_that_ages_leaves_its_room(idle: Lab, clock: LastingOpenVSwitch) -> None:
    idle.apply({"switches": [{"alias": "lab", "mac_learning": {"aging_time": 60, "limit": 1}}]})
    for port in "ab":
        idle.set_port("lab", port, **learns(limit=1))
    one, other = Sender(idle, "a", clock_stands=True), Sender(idle, "b", clock_stands=True)
    clock.stop_clock()
    here = one.rows(address(1))
    clock.warp(40)
    refused = one.refused_rows(address(2))
    refused_there = other.refused_rows(address(3))
    clock.warp(40)
    there = other.rows(address(3))
    refused += one.refused_rows(address(1))
    clock.warp(80)
    here += one.rows(address(2))
    dropped = {"pktsInDropped": refused, "noLearningDroppedPkts": refused}
    one.tells(InBroadcast=here, OutBroadcast=there, **dropped)
    dropped = {"pktsInDropped": refused_there, "noLearningDroppedPkts": refused_there}
    other.tells(InBroadcast=there, OutBroadcast=here, **dropped)


def test_an_address_that_goes_on_has_the_room_that_comes(lab: Lab) -> None:
    """Although Open vSwitch drops its frames by itself: each of them counts as one or the other."""
    lab.apply({"switches": [{"alias": "lab", "mac_learning": {"aging_time": 1}}]})
    lab.set_port("lab", "a", **learns(limit=1))
    one, _ = Sender(lab, "a"), Sender(lab, "b")
    sent = let_in = one.rows(address(1))

    def is_let_in() -> bool:
        nonlocal sent
        send(one.client, 1, BROADCAST, source=address(2))
        sent += 1
        is_out = counters(lab, "b").get("pktsOutBroadcast", 0) > let_in
        return is_out and address(2) in learned_ages(lab, "a")

    assert comes_true(is_let_in)

    def frames() -> int:
        found = counters(lab, "a")
        return found["pktsInBroadcast"] + found.get("pktsInDropped", 0)

    come_to(frames, sent)


def gained(lab: Lab, before: Dict[str, Dict[str, int]], port: str) -> Dict[str, int]:
    """Of what was counted before, some is lost with an Open vSwitch that is killed."""
    found = counters(lab, port)
    more = {name: number - before[port].get(name, 0) for name, number in found.items()}
    return {name: number for name, number in more.items() if number and "pkts" in name.lower()}


def test_the_limits_hold_for_an_open_vswitch_that_starts_anew(lab: Lab) -> None:
    lab.set_port("lab", "a", forbids=["forged_transmits"], **learns(limit=9))
    lab.set_port("lab", "b", **learns(limit=1))
    one, other = Sender(lab, "a"), Sender(lab, "b")
    one.rows(one.client.mac)
    other.rows(address(1))

    def go_on() -> None:
        count_often(lab)
        # Open vSwitch looks anew at what it remembers, and may not count what comes meanwhile.
        lab.have_counted()
        before = {port: counters(lab, port) for port in "ab"}
        forged, refused = one.rows(address(2)), other.refused_rows(address(3))
        first, there = one.rows(one.client.mac), other.rows(address(1))
        at_a = {"pktsInBroadcast": first, "pktsOutBroadcast": there, "pktsInDropped": forged}
        come_to(lambda: gained(lab, before, "a"), at_a)
        at_b = {"pktsInBroadcast": there, "pktsOutBroadcast": first, "pktsInDropped": refused}
        come_to(lambda: gained(lab, before, "b"), {**at_b, "noLearningDroppedPkts": refused})

    go_on()
    lab.stop()
    lab.start()
    go_on()
    killed = lab.processes()["ovs-vswitchd"]
    os.kill(killed, signal.SIGKILL)
    assert comes_true(lambda: lab.processes().get("ovs-vswitchd") not in (None, killed))
    lab.set_port("lab", "c", vlan=7)
    assert comes_true(lab.is_in_force)
    go_on()
