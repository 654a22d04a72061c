"""`vswitch record`: the tool is run as it is, and what it asks is in the trace."""

import os
import signal
import sys
from pathlib import Path

import pytest
from command_line import PROGRAM, Refused, Vswitch, started
from simhost import SharedHost
from vswitch.command import recording
from vswitch.trace import Trace


def test_the_tool_does_what_it_does_alone(vswitch: Vswitch, tmp_path: Path) -> None:
    trace = tmp_path / "trace.jsonl"
    plain = vswitch("show", "lab", "--json")
    done = vswitch("record", "-o", str(trace), "--", PROGRAM, "show", "lab", "--json")
    assert (done.status, done.stdout) == (plain.status, plain.stdout)
    with Trace(trace) as read:
        calls = list(read)
        header = read.header
    assert "VSQEX_GetVSInfo" in {one.function for one in calls}
    assert header["command"] == [PROGRAM, "show", "lab", "--json"]
    (process,) = read.processes.values()
    assert {name: one["path"] for name, one in header["libraries"].items()} == process.libraries
    assert all(len(one["sha256"]) == 64 for one in header["libraries"].values())


def test_the_status_is_that_of_the_tool(vswitch: Vswitch, tmp_path: Path) -> None:
    trace = str(tmp_path / "trace.jsonl")
    done = vswitch("record", "-o", trace, "--", "sh", "-c", "exit 5")
    assert (done.status, done.stdout) == (5, "")
    assert done.stderr.endswith("vswitch: the tool made no call of the host\n")
    done = vswitch("record", "-o", trace, "--", "/nowhere/tool")
    assert done.status == 127
    assert "vswitch: /nowhere/tool: No such file or directory\n" in done.stderr


@pytest.mark.parametrize(
    "damage, said",
    [
        ("printf x >> {}", "{}: line 2: the trace is cut off in the middle of a line"),
        ("rm {}", "[Errno 2] No such file or directory: '{}'"),
    ],
)
def test_a_tool_that_damages_its_trace(
    vswitch: Vswitch, tmp_path: Path, damage: str, said: str
) -> None:
    trace = str(tmp_path / "trace.jsonl")
    tool = f"{damage.format(trace)}; exit 5"
    done = vswitch("record", "-o", trace, "--", "sh", "-c", tool)
    assert (done.status, done.stderr.splitlines()[-1]) == (5, f"vswitch: {said.format(trace)}")


def test_the_status_says_how_else_a_tool_ends(
    tmp_path: Path, capsys: pytest.CaptureFixture[str]
) -> None:
    environment = dict(os.environ)
    killed = recording.run(["sh", "-c", "kill -9 $$"], environment)
    assert killed == 128 + signal.SIGKILL
    assert recording.run([str(tmp_path)], environment) == 126
    assert f"vswitch: {tmp_path}: Permission denied\n" in capsys.readouterr().err


def test_a_signal_goes_on_to_the_tool(lab: SharedHost, tmp_path: Path) -> None:
    trace = tmp_path / "trace.jsonl"
    tool = "import signal, sys; signal.signal(15, lambda *_: sys.exit(9)); print(1, flush=True)"
    words = ["record", "-o", str(trace), "--", sys.executable, "-c", f"{tool}; signal.pause()"]
    with started(lab, *words) as (program, output):
        assert output.readline() == "1\n"
        program.send_signal(signal.SIGTERM)
        assert program.wait(30) == 9


def test_a_trace_that_cannot_be_written_is_refused(refused: Refused, tmp_path: Path) -> None:
    said = refused("record", "-o", str(tmp_path / "no" / "trace"), "--", "true")
    assert "No such file or directory" in said
