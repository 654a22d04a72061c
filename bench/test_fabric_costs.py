"""Whether the bench of hosts that share a switch runs, sees what is there, and ends in order."""

import json
import os
import subprocess
import sys
import tempfile
from pathlib import Path
from typing import Any, Dict, List

import pytest

import costs
import fabric

PROGRAM = Path(fabric.__file__)


def run(*words: str, build: Path, **environment: str) -> "subprocess.CompletedProcess[str]":
    """With what was built, and a folder of its own for what it leaves."""
    built = Path(os.environ["BUILD_DIR"]).resolve()
    for name in "python", "simhost":
        (build / name).symlink_to(built / name)
    tools = os.pathsep.join([str(built / "python"), str(PROGRAM.parents[1] / "tests/simhostd")])
    return subprocess.run(
        [sys.executable, str(PROGRAM), *words],
        env={**os.environ, "BUILD_DIR": str(build), "PYTHONPATH": tools, **environment},
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        text=True,
        check=False,
    )


def results(build: Path) -> Dict[str, Any]:
    said: Dict[str, Any] = json.loads((build / "bench/fabric.json").read_text(encoding="utf-8"))
    return said


def processes_with(folder: str) -> List[str]:
    """Commands that name it."""
    named = []
    for entry in Path("/proc").glob("[0-9]*/cmdline"):
        try:
            words = entry.read_text(encoding="utf-8").replace("\0", " ")
        except OSError:
            continue
        if folder in words:
            named.append(words)
    return named


def test_it_measures_hosts_ports_and_databases(tmp_path: Path) -> None:
    done = run("--quick", build=tmp_path)
    assert done.returncode == 0, done.stdout
    said = results(tmp_path)
    assert said["stopped"] == "" and said["caught_up"] > 0
    assert [one["connected"] for one in said["samples"]] == [[0], [0], [0, 0], [10, 0]]
    for one in said["samples"]:
        for host in one["hosts"]:
            assert sorted(host) == ["ovs-vswitchd", "ovsdb-server", "simhostd"]
            assert all(spent["idle"]["memory"] > 1 for spent in host.values())
    last = said["samples"][-1]
    assert 0 < min(last["callers"]) and last["hosts"][1]["simhostd"]["changing"]["milliseconds"] > 0
    assert (tmp_path / "bench/fabric.svg").exists()
    for line in said["report"]:
        assert line in done.stdout


def test_what_the_machine_cannot_bear_ends_it_in_order(tmp_path: Path) -> None:
    # A short name, for sockets are in it.
    with tempfile.TemporaryDirectory() as folder:
        done = run("--quick", "--minutes", "0.005", build=tmp_path, TMPDIR=folder)
        assert done.returncode == 1, done.stdout
        assert "0.005 minutes are over" in results(tmp_path)["stopped"]
        assert "stopped at" in done.stdout
        assert processes_with(folder) == [] and os.listdir(folder) == []


@pytest.mark.parametrize("words", ["--busy 3", "--configured 5", "--hosts 0"])
def test_what_cannot_be_is_refused(words: str) -> None:
    given = fabric.parser().parse_args(["--quick", *words.split()])
    with pytest.raises(ValueError):
        fabric.effort_of(given)


def test_processor_time_and_wake_ups_are_seen_beside_threads_that_end() -> None:
    program = """
import threading, time
ends = threading.Event()
thread = threading.Thread(target=lambda: [time.sleep(.001) for _ in range(40)] and ends.wait())
thread.start()
time.sleep(.2)
input(print("begin", flush=True))
ends.set()
thread.join()
for _ in range(20): time.sleep(.001)
input(print("end", flush=True))
"""
    with subprocess.Popen(
        [sys.executable, "-c", program], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True
    ) as process:
        assert process.stdin is not None and process.stdout is not None
        process.stdout.readline()
        before = costs.reading([process.pid])
        print(file=process.stdin, flush=True)
        process.stdout.readline()
        spent = costs.cost([process.pid], before)
        process.communicate("\n")
    # The one that ended had woken up more often than the other one has since.
    assert spent.wakeups >= 20 and spent.milliseconds > 0 and spent.memory > 1
