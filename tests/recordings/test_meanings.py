"""The paths whose meaning is known are those that traces have."""

import json
from pathlib import Path
from typing import Any, Dict, Iterator, List, Set, Tuple

from recordings import RECORDING, SIMULATED, record
from test_recorded_calls import EVERY_CALL
from test_recorded_shapes import SCENARIO, TOOL
from test_replaying import WALKS
from vswitch._meanings import CALLS
from vswitch.trace import Trace

SNAPSHOT = """
import vswitch
vswitch.Host().snapshot()
"""

MORE = """
from libvswitch import checked
checked.VSQEX_GetPromiscSessionActiveDsts("lab")
checked.DVSQEX_PersistentStateGet()
checked.DVSQEX_PortStateGet("lab-1", "web-1")
checked.DVSQEX_PersistentPortStateGet("lab-1", "web-1", 1)
made = checked.DVSData_Alloc(None, None)
checked.DVSData_Serialize(made, 1)
checked.DVSData_Free(made)
"""


def paths(path: str, value: Any) -> Iterator[str]:
    """Those of a value, and of all in it."""
    yield path
    if isinstance(value, dict):
        for name, one in value.items():
            yield from paths(f"{path}.{name}", one)
    elif isinstance(value, list):
        for one in value:
            yield from paths(path, one)


def test_every_path_that_means_something_is_there(tmp_path: Path) -> None:
    scenario = tmp_path / "host.json"
    scenario.write_text(json.dumps(SCENARIO))
    trace = tmp_path / "trace.jsonl"
    found: Set[Tuple[str, str]] = set()
    runs: List[Tuple[str, Path, Dict[str, str]]] = [
        (EVERY_CALL, RECORDING, {}),
        (SNAPSHOT, SIMULATED, {}),
        (MORE + TOOL + WALKS, SIMULATED, {"SIMHOST_SCENARIO": str(scenario)}),
    ]
    for tool, host, more in runs:
        made = record(tool, trace, host, **more)
        assert made.status == 0, made.stderr
        found |= paths_of(trace)
    known = {
        (function, path)
        for function, meaning in CALLS.items()
        for path in (*meaning["volatile"], *meaning["families"])
    }
    assert len(known) > 150
    assert known - found == set()


def paths_of(trace: Path) -> Set[Tuple[str, str]]:
    with Trace(trace) as read:
        return {
            (call.function, path)
            for call in read
            for part, value in (("in", call.inputs), ("out", call.outputs), ("result", call.result))
            for path in paths(part, value)
        }
