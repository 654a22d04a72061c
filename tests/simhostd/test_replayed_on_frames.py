"""What was recorded of tools on a host without frames goes likewise on one whose frames simhostd
moves, but for what is known; a cable that is pulled is found."""

import json
import os
import subprocess
import sys
from pathlib import Path
from typing import Any

RECORDINGS = Path(__file__).parents[1] / "recordings"
SEED = 16

# In a process of its own, whose state it is.
_PROGRAM = """
import json, sys
from pathlib import Path
sys.path[:0] = {path!r}
import corpus
from replayed_on_frames import OnFrames

def told(frames, folder):
{body}

folder = Path(sys.argv[1])
with OnFrames(folder) as frames:
    print(json.dumps(told(frames, folder)))
"""

_ALL = """
    found, connected = [], []
    sequences, clones = (lambda: frames.sequences({seed}, 4)), (lambda: frames.clones({seed}, 6))
    for made in frames.examples, sequences, clones:
        found.append(made())
        connected.append(frames.connected)
    unused = [one.reason for one in frames.allowances.unused]
    return [found, connected, unused, frames.lab.plane()]
"""

_PULLED = """
    def pulled():
        host = frames.begin()
        host.cable("nic4", "down")
        return host

    trace = folder / "inventory.jsonl"
    corpus.record_example("inventory", trace)
    return frames.found_in(trace, pulled)
"""

_COMMAND = """
    import os, subprocess
    trace = folder / "find_mac.jsonl"
    corpus.record_example("find_mac", trace)
    program = os.environ["BUILD_DIR"] + "/bin/vswitch"
    statuses = []
    for options in [], ["--allow", {allowed!r}]:
        frames.begin()
        done = subprocess.run([program, "replay", str(trace), *options], capture_output=True)
        statuses.append(done.returncode)
    return statuses
"""


def run(body: str, folder: Path) -> Any:
    program = _PROGRAM.format(path=[str(RECORDINGS), *sys.path], body=body)
    done = subprocess.run(
        [sys.executable, "-c", program, str(folder)],
        env={**os.environ, "PYTHONPATH": os.pathsep.join([p for p in sys.path if p])},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    )
    assert done.returncode == 0, done.stderr
    return json.loads(done.stdout)


def test_nothing_differs_but_what_is_known(tmp_path: Path) -> None:
    print("seed", SEED)
    found, connected, unused, plane = run(_ALL.format(seed=SEED), tmp_path)
    assert [wrong for _, wrong in found] == [[], [], []]
    examples, sequences, clones = (count for count, _ in found)
    assert examples == 8 and sequences >= 4 and clones > 0
    # Open vSwitch adds up what it counted every half a second.
    assert [reason for reason in unused if "sooner or later" not in reason] == []
    # It was simhostd's plane, and in each part there were ports with devices.
    assert 0 < connected[0] < connected[1] < connected[2]
    assert plane["change"] == plane["in_force"] > 50


def test_a_cable_that_is_pulled_is_found(tmp_path: Path) -> None:
    count, (found,) = run(_PULLED, tmp_path)
    assert count == 1
    assert found.startswith("VSQEX_GetUplinkLinkState: out.state: up -> down ")


def test_the_command_replays_with_what_is_known(tmp_path: Path) -> None:
    allowed = str(RECORDINGS / "other_plane.yaml")
    assert run(_COMMAND.format(allowed=allowed), tmp_path) == [1, 0]
