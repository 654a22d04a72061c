"""Lists of differences that are known: what they cover, and what is wrong with one."""

import random
from typing import Any, Dict

import pytest
from vswitch import allowing
from vswitch.likeness import Difference
from vswitch.replay import NOT_MADE
from vswitch.words import DocumentError

ENTRY = "out.table.VSMACTable.macEntries[1].vid"


def covers(entry: Dict[str, Any], function: str, difference: Difference) -> bool:
    return allowing.read({"allowed": [{"reason": "known", **entry}]}).allows(function, difference)


@pytest.mark.parametrize(
    "entry, covered",
    [
        ({"function": "VSQEX_GetTeamMACTable"}, True),
        ({"function": "VSQEX_GetPortMACTable"}, False),
        ({"path": ENTRY}, True),
        ({"path": "out.table.VSMACTable.macEntries[].vid"}, True),
        ({"path": "out.table.VSMACTable.macEntries.vid"}, True),
        ({"path": "out.table.VSMACTable.macEntries[0].vid"}, False),
        ({"path": "out.table.VSMACTable.macEntries[1]"}, True),
        ({"path": "out.table.VSMACTable.macEntries[]"}, True),
        ({"path": "out.table.VSMACTable.macEntries[1]vid"}, False),
        ({"path": "out.tableXVSMACTable"}, False),
        ({"path": "out.table"}, True),
        ({"path": "out.tab"}, False),
        ({"path": "status"}, False),
        ({"path": "out.table", "recorded": 7}, True),
        ({"path": "out.table", "recorded": 7, "present": 8}, True),
        ({"path": "out.table", "recorded": 8}, False),
        ({"path": "out.table", "present": 7}, False),
        ({"present": None}, False),
    ],
)
def test_what_an_entry_covers(entry: Dict[str, Any], covered: bool) -> None:
    assert covers(entry, "VSQEX_GetTeamMACTable", Difference(ENTRY, 7, 8)) is covered


@pytest.mark.parametrize(
    "path, covered",
    [
        ("out.groups[].sources[1]", True),
        ("out.groups[2].sources[]", True),
        ("out.groups.sources[1].port", True),
        ("out.groups[2].sources", True),
        ("out.groups[].sources[0]", False),
        ("out.groups[0].sources[]", False),
        ("out.groups[].sources.address", False),
    ],
)
def test_places_in_a_list_of_lists(path: str, covered: bool) -> None:
    found = Difference("out.groups[2].sources[1].port", 7, 8)
    assert covers({"path": path}, "VSQEX_GetMcastFilters", found) is covered


def test_statuses_are_named() -> None:
    entry = {"path": "status", "recorded": "QEX_OK", "present": "QEX_BUSY"}
    assert covers(entry, "VSDVS_SetMTU", Difference("status", "QEX_OK", "QEX_BUSY"))


def test_a_call_that_was_not_made_is_allowed_by_its_reason() -> None:
    missing = Difference(NOT_MADE, "QEX_OK", "its process ended during it")
    entry = {"path": "not made", "present": "its process ended during it"}
    assert covers(entry, "VSDVS_SetMTU", missing)
    assert not covers({**entry, "present": "another"}, "VSDVS_SetMTU", missing)


def test_what_was_not_found_is_known() -> None:
    found = allowing.read(
        {
            "allowed": [
                {"function": "VSDVS_GetMTU", "path": "out.mtu", "present": 9000, "reason": "jumbo"},
                {"path": "status", "reason": "other"},
            ]
        }
    )
    assert [str(one) for one in found.unused] == [
        "VSDVS_GetMTU: out.mtu: any -> 9000",
        "any function: status",
    ]
    assert found.allows("VSDVS_GetMTU", Difference("out.mtu", 1500, 9000))
    assert [one.reason for one in found.unused] == ["other"]
    assert found.all[0].used == 1


@pytest.mark.parametrize(
    "document, said",
    [
        ([], "[] is not an object"),
        ({}, "'allowed' is missing"),
        ({"allow": []}, "allow: unknown key; there are allowed"),
        ({"allowed": 7}, "allowed: 7 is not a list"),
        ({"allowed": [7]}, "allowed[0]: 7 is not an object"),
        ({"allowed": [{"path": "status"}]}, "allowed[0]: 'reason' is missing"),
        (
            {"allowed": [{"path": "status", "reason": ""}]},
            "allowed[0].reason: '' is not a text of 1 bytes at least",
        ),
        (
            {"allowed": [{"reason": "all is well"}]},
            "allowed[0]: it would allow everything: what, of which function?",
        ),
        (
            {"allowed": [{"function": "VSDVS_GetMut", "reason": "x"}]},
            "allowed[0].function: 'VSDVS_GetMut' is not a call of the host",
        ),
        (
            {"allowed": [{"path": "", "reason": "x"}]},
            "allowed[0].path: '' is not a text of 1 bytes at least",
        ),
        (
            {"allowed": [{"function": "VSDVS_GetMTU", "why": "x", "reason": "x"}]},
            "allowed[0].why: unknown key; there are function, path, present, reason, recorded",
        ),
    ],
)
def test_what_is_wrong_with_a_list(document: Any, said: str) -> None:
    with pytest.raises(DocumentError) as caught:
        allowing.read(document)
    assert str(caught.value) == said


def test_whatever_a_list_is_it_is_read_or_refused() -> None:
    chance = random.Random(16)
    values: Any = [None, 7, "x", [], {}, "VSDVS_GetMTU", "out.mtu", "[", {"x": 1}]
    keys = ["function", "path", "recorded", "present", "reason", "x"]
    read = 0
    for _ in range(2_000):
        entry = {key: chance.choice(values) for key in chance.sample(keys, chance.randrange(1, 6))}
        try:
            found = allowing.read({"allowed": [entry]})
        except DocumentError:
            continue
        found.allows("VSDVS_GetMTU", Difference("out.mtu", 1500, 9000))
        read += 1
    assert 50 < read < 1_000
