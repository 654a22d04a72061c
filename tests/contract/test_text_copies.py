"""Copies of text arguments: counted, and released on every way but that of the sprung trap."""

import json
import os
from typing import Dict, List

import calls
import children
import pytest
from arguments import TextKind
from calls import Call

Copies = Dict[str, Dict[str, List[int]]]

WITH_TEXTS = [call for call in calls.ALL if call.positions(TextKind)]


@pytest.fixture(name="copies", scope="module")
def fixture_copies() -> Copies:
    """For each call and way through it, how many copies of each text were left behind."""
    counter = str(children.BUILD / "tests" / "allocations" / "liballocations.so")
    preloaded = " ".join(filter(None, [os.environ.get("LD_PRELOAD"), counter]))
    done = children.run(str(children.HERE / "count_text_copies.py"), LD_PRELOAD=preloaded)
    assert done.returncode == 0, done.stderr
    counted: Copies = json.loads(done.stdout)
    return counted


@calls.each(WITH_TEXTS)
def test_copies_are_released(copies: Copies, call: Call) -> None:
    ways = dict(copies[str(call)])
    ways.pop("sprung", None)
    assert {"success"} < set(ways)
    assert {name for name, left in ways.items() if any(left)} == set()


@calls.each(call for call in WITH_TEXTS if call.name != "Panic")
def test_a_sprung_trap_leaves_one_copy_of_each_text(copies: Copies, call: Call) -> None:
    assert copies[str(call)]["sprung"] == [1] * len(call.positions(TextKind))
