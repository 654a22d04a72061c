"""Traces are read back, and what is wrong with one is said with its line."""

import json
import random
from pathlib import Path
from typing import Any, Dict, List

import pytest
from vswitch.trace import Trace, TraceError

HEADER: Dict[str, Any] = {
    "vswitch trace": 1,
    "module": "1.0",
    "time": "",
    "command": ["x"],
    "libraries": {},
}
PROCESS: Dict[str, Any] = {"process": 7, "parent": 1, "time": "", "program": "/x", "libraries": {}}


def begin(number: int, **more: Any) -> Dict[str, Any]:
    event = {"call": number, "process": 7, "thread": 1, "function": "VSDVS_SetMTU", "at": 5}
    return {**event, "in": {"switchName": "lab", "mtu": 9000}, **more}


def end(number: int, **more: Any) -> Dict[str, Any]:
    return {"end": number, "process": 7, "took": 800, "status": 0, **more}


def callback(number: int, **more: Any) -> Dict[str, Any]:
    event = {"callback": number, "process": 7, "thread": 1, "argument": "callback", "at": 6}
    return {**event, "in": {"reached": {"at": 1}}, **more}


WHOLE: List[Any] = [
    HEADER,
    PROCESS,
    begin(1),
    end(1),
    begin(2, function="DVSState_SwitchForEach"),
    callback(3, within=2),
    begin(4, within=3),
    end(4, status=5),
    {"end": 3, "process": 7, "result": 1},
    {"end": 2, "process": 7, "took": 1, "trap": {"type": "E", "text": "late", "value": 1}},
    begin(5),
]


def written(path: Path, lines: List[Any]) -> Path:
    texts = (one if isinstance(one, str) else json.dumps(one) for one in lines)
    path.write_text("".join(f"{one}\n" for one in texts))
    return path


@pytest.fixture(name="path")
def fixture_path(tmp_path: Path) -> Path:
    return tmp_path / "trace.jsonl"


def test_a_process_that_runs_another_program_counts_anew(path: Path) -> None:
    lines = [HEADER, PROCESS, begin(1), begin(2, thread=2), PROCESS, begin(1), end(1), begin(2)]
    with Trace(written(path, lines)) as trace:
        calls = list(trace)
    assert [(one.number, one.thread, one.has_ended) for one in calls] == [
        (1, 1, True),
        (1, 1, False),
        (2, 2, False),
        (2, 1, False),
    ]


def test_calls_come_as_they_end_and_last_those_that_did_not(path: Path) -> None:
    with Trace(written(path, WHOLE)) as trace:
        calls = list(trace)
        assert trace.header["command"] == ["x"] and list(trace.processes) == [7]
    assert [one.number for one in calls] == [1, 4, 2, 5]
    first, inner, walk, left = calls
    assert (first.inputs, first.status, first.took) == ({"switchName": "lab", "mtu": 9000}, 0, 800)
    assert (inner.within, inner.status) == (3, 5)
    assert walk.trap is not None and walk.trap.text == "late" and walk.status is None
    assert [(one.number, one.result, one.calls) for one in walk.callbacks] == [(3, 1, [4])]
    assert not left.has_ended


@pytest.mark.parametrize(
    "line, wrong, said",
    [
        (1, "", "this is no trace: one begins with what made it"),
        (1, "# Title", "this is no trace: one begins with what made it"),
        (1, {"openapi": "3"}, "this is no trace: one begins with what made it"),
        (1, {**HEADER, "vswitch trace": "1"}, "this is no trace: one begins with what made it"),
        (
            1,
            {**HEADER, "vswitch trace": 2},
            "a trace of version 2, and this program reads those up to 1",
        ),
        (1, {**HEADER, "vswitch trace": 0}, "the head of the trace is damaged"),
        (3, "", "no JSON: Expecting value: line 2 column 1 (char 1)"),
        (3, '{"call": 1', "no JSON: Expecting ',' delimiter: line 2 column 1 (char 11)"),
        (3, "[1]", "no event: a line is an object"),
        (3, {"x": 1}, "no event that a trace has"),
        (3, {"call": 1, "process": 7}, "the event lacks 'thread'"),
        (3, begin(1, at="now"), "at is no whole number: 'now'"),
        (3, begin(1, function=None), "function is no text: None"),
        (3, {**begin(1), "in": []}, "in is no object: []"),
        (4, end(9), "the end of 9, which did not begin"),
        (4, end(1, status="OK"), "status is no whole number: 'OK'"),
        (4, end(1, trap={"type": None}), "the event lacks 'text'"),
        (5, begin(1), "the number 1 begins a second time"),
        (6, callback(3, within=9), "nothing is in progress that could have the number 9"),
        (7, begin(4, within=2), "nothing is in progress that could have the number 2"),
    ],
)
def test_what_is_wrong_is_said_with_its_line(path: Path, line: int, wrong: Any, said: str) -> None:
    lines = list(WHOLE)
    lines[line - 1] = wrong
    if said.endswith("a second time"):
        lines[3] = begin(8)
    with pytest.raises(TraceError) as caught:
        with Trace(written(path, lines)) as trace:
            list(trace)
    assert (caught.value.line, caught.value.what) == (line, said)
    assert str(caught.value) == f"{path}: line {line}: {said}"


def test_a_cut_is_told_from_a_tool_that_ended(path: Path) -> None:
    whole = written(path, WHOLE).read_bytes()
    path.write_bytes(whole[:-20])
    with Trace(path) as trace:
        found = iter(trace)
        assert [next(found).number for _ in range(3)] == [1, 4, 2]
        with pytest.raises(TraceError, match="line 11: the trace is cut off in the middle"):
            next(found)


def test_a_deeply_nested_line_is_no_json(path: Path) -> None:
    lines = [HEADER, "[" * 100_000 + "]" * 100_000]
    with Trace(written(path, lines)) as trace, pytest.raises(TraceError, match="line 2: no JSON"):
        list(trace)


def test_whatever_is_damaged_is_read_or_refused(path: Path) -> None:
    whole = written(path, WHOLE).read_bytes()
    chance = random.Random(16)
    refused = 0
    for _ in range(1_000):
        damaged = bytearray(whole)
        for _ in range(chance.randrange(1, 4)):
            at = chance.randrange(len(damaged))
            damaged[at : at + chance.randrange(3)] = bytes(chance.choices(range(256), k=1))
        path.write_bytes(damaged)
        try:
            with Trace(path) as trace:
                list(trace)
        except TraceError:
            refused += 1
    assert 500 < refused < 1_000
