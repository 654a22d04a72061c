"""Hosts that share switches while all that can fail does, and the model that tells what must have
come of it."""

import copy
from pathlib import Path
from typing import List, Sequence

import pytest

import fabric_by_chance
from fabric_by_chance import begun_and_made, found_wrong
from fabric_calls import CTL, Call, Calls, Wanted, join, put_port, remove_port, set_switch, wrong
from fabric_history import Port, Switch, Transaction
from fabric_lab import FabricLab, started

FIRST = Transaction("0", "h0", 1, {"lab": Switch({"h0", "h1"}, {"mtu": 1500}, {"p": Port()})})
MADE = Call("h0", set_switch([], "lab", mtu=1600), "made")
ADDED = Call("h1", put_port([], "lab", "n"), "made")
REFUSED = Call("h1", set_switch([], "lab", mtu=1700), "refused")
UNKNOWN = Call("h1", remove_port("lab", "p"))
DECIDED = Call("h0", set_switch([], "lab", mtu=1800), change="that")
CALLS = (MADE, ADDED, REFUSED, UNKNOWN, DECIDED)
JOIN = join("h2", "lab")
JOINED = Call("h2", JOIN, "refused")
assert JOIN.taken_back
TAKEN_BACK = Call("h2", Wanted("", [], JOIN.taken_back))


def changes(*calls: Call) -> List[Transaction]:
    """What becomes of the first if they are made."""
    made = [FIRST]
    for call in calls:
        switches = copy.deepcopy(made[-1].switches)
        call.wanted.effect(switches)
        number = made[-1].revision + 1
        made.append(Transaction(call.change or str(number), call.host, number, switches))
    return made[1:]


def test_whatever_fails_all_hosts_end_alike() -> None:
    calls, found = fabric_by_chance.run(5, steps=15, hosts=2)
    assert found == []
    assert calls >= 15


@pytest.mark.parametrize(
    "made",
    [(MADE, ADDED), (ADDED, MADE), (UNKNOWN, MADE, ADDED), (MADE, ADDED, DECIDED, UNKNOWN)],
)
def test_what_nobody_knows_of_may_be_made_or_not(made: Sequence[Call]) -> None:
    assert wrong(CALLS, changes(*made), FIRST) == []


@pytest.mark.parametrize(
    ("made", "found"),
    [
        ((MADE,), "made, and lost: h1: lab/n {}"),
        ((MADE, ADDED, REFUSED), "of h1 is no call's, as was refused to h1: lab {'mtu': 1700}"),
        ((MADE, DECIDED, MADE, ADDED), "revision 4 of h0 is no call's"),
        ((MADE, ADDED, Call("h1", MADE.wanted)), "revision 4 of h1 is no call's"),
        ((MADE, ADDED, Call("h0", DECIDED.wanted)), "revision 4 of h0 is no call's"),
    ],
    ids=["lost", "refused", "doubled", "of another host", "of another change"],
)
def test_what_cannot_be_is_found(made: Sequence[Call], found: str) -> None:
    (said,) = wrong(CALLS, changes(*made), FIRST)
    assert found in said


@pytest.mark.parametrize("outcome", ["refused", "unknown"])
def test_a_switch_that_a_host_cannot_bear_is_joined_and_left_again(outcome: str) -> None:
    calls = [MADE, Call("h2", JOIN, outcome)]
    assert wrong(calls, changes(JOINED, MADE, TAKEN_BACK), FIRST) == []
    (said,) = wrong(calls, changes(MADE, TAKEN_BACK), FIRST)
    assert "revision 3 of h2 is no call's" in said
    is_refused = outcome == "refused"
    stays = ["refused, and made: h2: join lab"] * is_refused
    assert wrong(calls, changes(JOINED, MADE), FIRST) == stays


def test_a_change_that_undoes_another_is_found() -> None:
    first, second = changes(MADE, ADDED)
    second.switches["lab"].settings["mtu"] = 1500
    said, lost = wrong(CALLS, [first, second], FIRST)
    assert "revision 3 of h1 is no call's" in said
    assert lost == "made, and lost: h1: lab/n {}"


def test_what_no_call_did_is_found(tmp_path: Path) -> None:
    """In a fabric as it is."""
    with FabricLab(tmp_path) as lab:
        host = started(lab.host("h0", {"switches": [{"alias": "lab"}]}))
        host.ctl("share", "lab")
        calls = Calls()
        calls.on(host, set_switch([CTL], "lab", mtu=1600))
        calls.end()
        assert begun_and_made(calls, host, put_port([CTL], "lab", "last"))
        assert found_wrong(lab, calls, []) == []
        lab.databases.set("Switch", "mtu", 1500)
        assert "the fabric has other than its log" in found_wrong(lab, calls, [])
        assert begun_and_made(calls, host, put_port([CTL], "lab", "n"))
        said, lost = found_wrong(lab, calls, [])
        assert "of h0 is no call's: lab was" in said
        assert lost == "made, and lost: h0: lab/n {}"
