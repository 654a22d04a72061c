"""Traces that are damaged, or written by somebody who means harm: what is not refused is replayed,
and neither ends the process."""

import copy
import json
import random
from pathlib import Path
from typing import Any, Dict, Iterator, List, Tuple

import pytest
from recordings import record
from simhost import Host
from test_recorded_shapes import SCENARIO, TOOL
from test_replaying import WALKS
from vswitch._replayer import PresentHost
from vswitch.replay import check, replay
from vswitch.trace import TraceError

SEED = 16
PARTS = ("in", "out", "status", "result")
WRONG: List[Any] = [
    None, -1, 0, 1, 2**31, 2**32, 2**63, 2**64, 10**30, 1.5, True, "", "x", "é\0", "\ud800",
    "00", "lab", [], [0], {}, {"at": 1}, {"at": 2**64}, {"bytes": "0"}, {"bytes": "00ff"},
    {"hex": "ff"}, {"hex": "zz"}, {"unread": "x"}, {"unread": 7},
]  # fmt: skip


@pytest.fixture(name="traces", scope="module")
def fixture_traces(tmp_path_factory: pytest.TempPathFactory) -> List[bytes]:
    folder = tmp_path_factory.mktemp("traces")
    (folder / "host.json").write_text(json.dumps(SCENARIO))
    found = []
    for tool in (TOOL, WALKS):
        made = record(tool, folder / "trace", SIMHOST_SCENARIO=str(folder / "host.json"))
        assert made.status == 0, made.stderr
        found.append(made.trace.read_bytes())
    return found


def tried(path: Path, present: PresentHost) -> bool:
    """Whether it is replayed; it is refused otherwise."""
    try:
        check(path, present)
    except TraceError:
        return False
    replay(path, present)
    return True


def places(value: Any) -> Iterator[Tuple[Any, Any]]:
    """All places in a value: what holds it, and its key there."""
    if isinstance(value, (dict, list)):
        for key in value if isinstance(value, dict) else range(len(value)):
            yield value, key
            yield from places(value[key])


def with_wrong_values(chance: random.Random, lines: List[Dict[str, Any]]) -> List[Dict[str, Any]]:
    """Some values of some events are others; the numbers that hold events together stay."""
    made = copy.deepcopy(lines)
    for _ in range(chance.randrange(1, 4)):
        event = chance.choice([one for one in made if any(part in one for part in PARTS)])
        part = chance.choice([one for one in PARTS if one in event])
        found = list(places({part: event[part]}))[1:]
        held, key = chance.choice(found) if found else (event, part)
        held[key] = copy.deepcopy(chance.choice(WRONG))
    return made


@pytest.mark.scenario(SCENARIO)
@pytest.mark.leaves_host_memory("what is not released in a trace, a replay does not release")
def test_wrong_values(host: Host, tmp_path: Path, traces: List[bytes]) -> None:
    chance, present, path = random.Random(SEED), PresentHost(), tmp_path / "trace.jsonl"
    print("seed", SEED)
    whole = [[json.loads(line) for line in one.splitlines()] for one in traces]
    replayed = 0
    for _ in range(150):
        host.reset()
        made = with_wrong_values(chance, chance.choice(whole))
        path.write_text("".join(f"{json.dumps(one)}\n" for one in made))
        replayed += tried(path, present)
    assert 25 < replayed < 125


@pytest.mark.scenario(SCENARIO)
@pytest.mark.leaves_host_memory("what is not released in a trace, a replay does not release")
def test_damaged_bytes(host: Host, tmp_path: Path, traces: List[bytes]) -> None:
    chance, present, path = random.Random(SEED), PresentHost(), tmp_path / "trace.jsonl"
    replayed = 0
    for _ in range(150):
        host.reset()
        damaged = bytearray(chance.choice(traces))
        for _ in range(chance.randrange(1, 4)):
            at = chance.randrange(len(damaged))
            damaged[at : at + chance.randrange(3)] = bytes(chance.choices(range(256), k=1))
        path.write_bytes(damaged)
        replayed += tried(path, present)
    assert 2 < replayed < 125
