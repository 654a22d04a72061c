"""Every call is made with what it was recorded with: the replay is recorded, too, and both traces
say the same. What the second one says was read in memory, whichever way it came there."""

import json
import subprocess
import sys
from pathlib import Path
from typing import Any, List, Tuple

import pytest
from recordings import RECORDING, record
from test_recorded_calls import EVERY_CALL
from test_meanings import SNAPSHOT
from test_recorded_shapes import SCENARIO, TOOL
from test_replaying import WALKS
from tools import DATA_LISTS
from vswitch.likeness import unread_in
from vswitch.playing import played
from vswitch.trace import Call, Trace

# Over the recording host, for which an address is a number like any other.
ONE_BY_ONE = """
from vswitch._replayer import PresentHost
from vswitch.likeness import unread_in
from vswitch.playing import played
from vswitch.trace import Trace

host = PresentHost()
with Trace({trace!r}) as trace:
    for call in trace:
        if call.function != "Panic" and not any(unread_in("in", call.inputs)):
            host.make(call.function, call.inputs, lambda argument, inputs: 0)
"""

WHOLE = """
from vswitch._replayer import PresentHost
from vswitch.replay import replay

assert replay({trace!r}, PresentHost()).is_alike
"""

STOPPED = {"clock": {"stopped": True, "now": 1000}}

SUMMED_UP = """
import json
from vswitch._replayer import PresentHost
from vswitch.replay import replay

functions = replay({trace!r}, PresentHost()).functions.values()
alike = sum(of.alike for of in functions)
print(json.dumps([alike, sorted({{path for of in functions for path in of.paths}})]))
"""

LISTS = f"""{DATA_LISTS}
host.DVSData_Alloc(ctypes.byref(made), libc.malloc, libc.free)
host.DVSData_Update(made, b"a", b"xy", 2, 16)
host.DVSData_Update(made, b"a", b"xyz", 3, 16)
host.DVSData_Free(made)
"""


def without_addresses(value: Any) -> Any:
    if isinstance(value, dict):
        return {
            name: "an address" if name == "at" else without_addresses(one)
            for name, one in value.items()
        }
    return [without_addresses(one) for one in value] if isinstance(value, list) else value


def said(call: Call) -> Tuple[Any, ...]:
    visits = [(one.argument, one.result is None) for one in call.callbacks]
    values = [call.inputs, call.outputs, call.result]
    return call.function, call.status, without_addresses(values), visits


def calls_of(trace: Path) -> List[Tuple[Any, ...]]:
    with Trace(trace) as read:
        return [said(call) for call in read]


def test_every_call_is_given_what_it_was_recorded_with(tmp_path: Path) -> None:
    first, second = tmp_path / "first.jsonl", tmp_path / "second.jsonl"
    assert record(EVERY_CALL, first, RECORDING).status == 0
    made = record(ONE_BY_ONE.format(trace=str(first)), second, RECORDING)
    assert made.status == 0, made.stderr
    all_ = [(function, values[0]) for function, _, values, _ in calls_of(first)]
    given = [one for one in all_ if one[0] != "Panic" and not any(unread_in("in", one[1]))]
    assert len({name for name, _ in all_}) == 146 and len({name for name, _ in given}) > 135
    assert [(function, values[0]) for function, _, values, _ in calls_of(second)] == given
    # Nobody told the host what to return, and what it returns are zeros and nulls.
    again = record(SUMMED_UP.format(trace=str(second)), tmp_path / "third.jsonl", RECORDING)
    assert again.status == 0, again.stderr
    alike, differing = json.loads(again.stdout)
    assert alike > 90 and differing == []


@pytest.mark.parametrize("tool", [TOOL, LISTS], ids=["shapes", "lists"])
def test_the_trace_of_a_replay_is_the_trace(tool: str, tmp_path: Path) -> None:
    scenario = tmp_path / "host.json"
    scenario.write_text(json.dumps({**SCENARIO, **STOPPED}))
    first, second = tmp_path / "first.jsonl", tmp_path / "second.jsonl"
    assert record(tool, first, SIMHOST_SCENARIO=str(scenario)).status == 0
    again = WHOLE.format(trace=str(first))
    made = record(again, second, SIMHOST_SCENARIO=str(scenario))
    assert made.status == 0, made.stderr
    assert calls_of(second) == calls_of(first) != []


def test_what_is_played_is_replayed(tmp_path: Path) -> None:
    scenario, trace = tmp_path / "host.json", tmp_path / "trace.jsonl"
    scenario.write_text(json.dumps(SCENARIO))
    made = record(TOOL + WALKS + SNAPSHOT, trace, SIMHOST_SCENARIO=str(scenario))
    assert made.status == 0, made.stderr
    with played(trace) as playing:
        replayed = subprocess.run(
            [sys.executable, "-c", WHOLE.format(trace=str(trace))],
            env=playing.environment,
            stderr=subprocess.PIPE,
            text=True,
        )
        assert replayed.returncode == 0, replayed.stderr
        assert playing.ledger.left == [] and not playing.ledger.has_failed
