"""`vswitch play`: a tool over a trace. What was not recorded is told with the nearest that was."""

import json
import shutil
import subprocess
import sys
from pathlib import Path
from typing import Any, Callable, Dict, List

import pytest
from command_line import PROGRAM, Done, Vswitch
from vswitch.playing import Ledger, played
from vswitch.recording import recorded
from vswitch.trace import TraceError

TOOL = """
import _libvswitch as flat, sys
changes = sys.argv[1:]
if "exit" in changes:
    sys.exit(7)
if "first" in changes:
    print(flat.VSDVS_DestroyVSwitch("vswitch0"))
for mtu in (9000, 1500, 9000 if "input" not in changes else 1280):
    if "left out" not in changes or mtu != 1500:
        print(flat.VSDVS_SetMTU("vswitch0", mtu))
if "more" in changes:
    print(flat.VSDVS_SetMTU("vswitch0", 9000))
"""


@pytest.fixture(name="recorded_trace", scope="module")
def fixture_recorded_trace(tmp_path_factory: pytest.TempPathFactory) -> Path:
    trace = tmp_path_factory.mktemp("recorded") / "trace.jsonl"
    command = [sys.executable, "-c", TOOL]
    with recorded(trace, command) as environment:
        environment.pop("SIMHOST_STATE", None)
        assert subprocess.run(command, env=environment, capture_output=True).stdout == b"0\n0\n0\n"
    return trace


@pytest.fixture(name="trace")
def fixture_trace(recorded_trace: Path, tmp_path: Path) -> Path:
    return Path(shutil.copy(recorded_trace, tmp_path))


@pytest.fixture(name="play")
def fixture_play(vswitch: Vswitch, trace: Path) -> Callable[..., Done]:
    def run(*changes: str, options: List[str] = []) -> Done:
        command = [sys.executable, "-c", TOOL, *changes]
        return vswitch("play", str(trace), *options, "--", *command)

    return run


def raised(words: str) -> str:
    """What the interpreter says of a trap, at the end of what a tool writes."""
    return f"RuntimeError: {words}\n"


def test_a_tool_does_the_same(play: Callable[..., Done]) -> None:
    done = play()
    assert (done.status, done.stdout) == (0, "0\n0\n0\n")
    assert done.stderr == "vswitch: 3 of 3 recorded calls were made\n"


@pytest.mark.parametrize(
    "change, words",
    [
        (
            "input",
            [
                'VSDVS_SetMTU(switchName="vswitch0", mtu=1280) was not recorded at this place',
                "trace.jsonl: line 7: mtu: 9000 was recorded, and 1280 asked",
            ],
        ),
        (
            "left out",
            [
                'VSDVS_SetMTU(switchName="vswitch0", mtu=9000) was not recorded at this place',
                "trace.jsonl: line 7: the same call, which is not the next",
                'trace.jsonl: line 5: next would be VSDVS_SetMTU(switchName="vswitch0", mtu=1500)',
            ],
        ),
        (
            "more",
            [
                'VSDVS_SetMTU(switchName="vswitch0", mtu=9000) was not recorded at this place',
                "trace.jsonl: line 3: the same call, which is not the next",
                "trace.jsonl: nothing more was recorded of this thread",
            ],
        ),
        (
            "first",
            [
                'VSDVS_DestroyVSwitch(switchName="vswitch0") was not recorded at this place',
                "trace.jsonl: no call of VSDVS_DestroyVSwitch was recorded",
                'trace.jsonl: line 3: next would be VSDVS_SetMTU(switchName="vswitch0", mtu=9000)',
            ],
        ),
    ],
)
def test_a_call_that_was_not_recorded_is_told_and_traps(
    play: Callable[..., Done], change: str, words: List[str]
) -> None:
    done = play(change)
    assert done.status == 125
    assert done.stderr.startswith("vswitch play: " + "\n  ".join(words) + "\nTraceback")
    assert raised("; ".join(words)) in done.stderr


def test_by_arguments_the_order_is_the_tools(play: Callable[..., Done]) -> None:
    by = ["--by", "arguments"]
    assert play("more", "left out", options=by).status == 0
    done = play("input", options=by)
    words = 'VSDVS_SetMTU(switchName="vswitch0", mtu=1280) was not recorded'
    assert (done.status, done.stderr.splitlines()[:2]) == (
        125,
        [
            f"vswitch play: {words}",
            "  trace.jsonl: line 7: mtu: 9000 was recorded, and 1280 asked",
        ],
    )
    done = play("first", options=by)
    assert done.stderr.splitlines()[:3] == [
        'vswitch play: VSDVS_DestroyVSwitch(switchName="vswitch0") was not recorded',
        "  trace.jsonl: no call of VSDVS_DestroyVSwitch was recorded",
        '  trace.jsonl: line 3: next would be VSDVS_SetMTU(switchName="vswitch0", mtu=9000)',
    ]


def test_no_other_word_for_which_call_a_call_is(trace: Path) -> None:
    with pytest.raises(ValueError, match="^by is one of order, arguments$"):
        with played(trace, "chance"):
            pass


def test_calls_that_nobody_made(play: Callable[..., Done]) -> None:
    made = "vswitch: 2 of 3 recorded calls were made"
    said = f"{made}; the first that was not is VSDVS_SetMTU in line 5\n"
    by = ["--by", "arguments"]
    done = play("left out", options=by)
    assert (done.status, done.stderr) == (0, said)
    assert play("left out", options=[*by, "--all-used"]).status == 1
    assert play("exit", options=["--all-used"]).status == 7
    assert play(options=["--all-used"]).status == 0


def test_a_failure_counts_even_when_the_tool_hides_it(vswitch: Vswitch, trace: Path) -> None:
    tool = "import _libvswitch as flat\ntry: flat.VSDVS_SetMTU('x', 1)\nexcept RuntimeError: pass"
    done = vswitch("play", str(trace), "--", sys.executable, "-c", tool)
    assert (done.status, done.stdout) == (125, "")


def test_without_a_trap_the_process_ends(vswitch: Vswitch, trace: Path) -> None:
    tool = "import ctypes; ctypes.CDLL('libvswitch.so').VSDVS_SetMTU(b'x', 1); print('on')"
    done = vswitch("play", str(trace), "--", sys.executable, "-c", tool)
    assert (done.status, done.stdout) == (125, "")
    assert 'switchName: "vswitch0" was recorded, and "x" asked\n' in done.stderr


def test_a_second_process_has_no_part(vswitch: Vswitch, trace: Path) -> None:
    one = (
        f"{sys.executable} -c 'import _libvswitch as v; print(v.VSDVS_SetMTU(\"vswitch0\", 9000))'"
    )
    done = vswitch("play", str(trace), "--", "sh", "-c", f"{one}; {one}")
    assert (done.status, done.stdout) == (125, "0\n")
    assert done.stderr.splitlines()[:2] == [
        'vswitch play: VSDVS_SetMTU(switchName="vswitch0", mtu=9000) was not recorded',
        "  trace.jsonl: calls of 1 processes were recorded, and this is one more",
    ]


def test_once_records_what_is_not_there_and_then_plays(vswitch: Vswitch, tmp_path: Path) -> None:
    trace = tmp_path / "trace.jsonl"
    words = ["play", str(trace), "--mode", "once", "--", PROGRAM, "list"]
    first, second = vswitch(*words), vswitch(*words)
    assert (first.status, second.status) == (0, 0)
    assert first.stdout == second.stdout != ""
    assert second.stderr.endswith(" recorded calls were made\n")
    assert sorted(one.name for one in tmp_path.iterdir() if "trace" in one.name) == ["trace.jsonl"]


def test_all_records_anew(vswitch: Vswitch, trace: Path) -> None:
    before = trace.read_text()
    words = ["play", str(trace), "--mode", "all", "--"]
    assert vswitch(*words, PROGRAM, "list").status == 0
    assert trace.read_text() != before and "DVSState_SwitchForEach" in trace.read_text()


def test_what_is_not_whole_replaces_nothing(vswitch: Vswitch, trace: Path) -> None:
    before = trace.read_text()
    tool = (
        "import os, libvswitch as vs\n"
        "vs.DVSState_SwitchForEach(lambda *_: os.kill(os.getpid(), 9), None)"
    )
    done = vswitch("play", str(trace), "--mode", "all", "--", sys.executable, "-c", tool)
    assert done.status == 137
    assert done.stderr.splitlines()[-1] == (
        f"vswitch: {trace} is left as it was: the tool ended during the call DVSState_SwitchForEach"
    )
    assert trace.read_text() == before
    assert [one.name for one in trace.parent.iterdir() if "jsonl" in one.name] == ["trace.jsonl"]


def test_a_recording_without_a_call_replaces_nothing(
    vswitch: Vswitch, trace: Path, tmp_path: Path
) -> None:
    before = trace.read_text()
    done = vswitch("play", str(trace), "--mode", "all", "--", "./is-not-there")
    assert (done.status, trace.read_text()) == (127, before)
    words = ["play", str(tmp_path / "new.jsonl"), "--mode", "once", "--", "true"]
    assert [vswitch(*words).status for _ in range(2)] == [0, 0]
    assert not (tmp_path / "new.jsonl").exists()


def test_where_no_trace_can_be_is_told_before_the_tool_runs(
    vswitch: Vswitch, tmp_path: Path
) -> None:
    words = ["--mode", "all", "--", "touch", str(tmp_path / "ran")]
    for place, what in [
        (tmp_path, "[Errno 21] Is a directory"),
        (tmp_path / "none" / "trace.jsonl", "[Errno 2] No such file or directory"),
    ]:
        done = vswitch("play", str(place), *words)
        assert (done.status, done.stderr) == (1, f"vswitch: {what}: '{place}'\n")
    assert not (tmp_path / "ran").exists()


def damaged(change: Callable[[List[Dict[str, Any]]], object]) -> Callable[[List[str]], str]:
    def apply(lines: List[str]) -> str:
        events = [json.loads(line) for line in lines]
        change(events)
        return "".join(f"{json.dumps(event)}\n" for event in events)

    return apply


@pytest.mark.parametrize(
    "change, said",
    [
        (
            damaged(lambda all: all[2].update(function="VSDVS_Sing")),
            "line 3: no call of the host is named VSDVS_Sing",
        ),
        (
            damaged(lambda all: all[2]["in"].update(mtu=2**40)),
            "line 3: in.mtu: 1099511627776 is not from 0 to 4294967295",
        ),
        (damaged(lambda all: all[2]["in"].pop("mtu")), "line 3: in: lacks mtu"),
        (damaged(lambda all: all[3].update(out={"x": 1})), 'line 3: out: there is no "x"'),
        (
            damaged(lambda all: all[0].update({"vswitch trace": 2})),
            "line 1: a trace of version 2, and this program reads those up to 1",
        ),
        (
            damaged(lambda all: all[1].update(process=1)),
            "line 3: an event of the process {process}, which did not begin",
        ),
        (
            damaged(
                lambda all: all.insert(
                    2,
                    {
                        "callback": 9,
                        "process": all[1]["process"],
                        "thread": 1,
                        "argument": "callback",
                        "at": 1,
                        "in": {},
                    },
                )
            ),
            "line 3: the host called back outside a call, which cannot be played",
        ),
        (lambda lines: "".join(lines)[:-9], "line 8: the trace is cut off in the middle of a line"),
        (
            damaged(lambda all: all[2]["in"].update(mtu=json.loads("[" * 70 + "]" * 70))),
            "line 3: values are nested too deep",
        ),
    ],
)
def test_what_is_wrong_with_a_trace_is_told_with_its_line(
    trace: Path, change: Callable[[List[str]], str], said: str
) -> None:
    lines = trace.read_text().splitlines(keepends=True)
    trace.write_text(change(lines))
    said = said.replace("{process}", str(json.loads(lines[2])["process"]))
    with pytest.raises(TraceError) as caught:
        Ledger(trace, trace.with_name("ledger"))
    assert str(caught.value) == f"{trace}: {said}"
    assert not trace.with_name("ledger").exists()


def test_it_is_told_before_the_tool_starts(vswitch: Vswitch, trace: Path) -> None:
    trace.write_text(trace.read_text()[:-9])
    done = vswitch("play", str(trace), "--", "echo", "started")
    said = "line 8: the trace is cut off in the middle of a line"
    assert (done.status, done.stdout, done.stderr) == (1, "", f"vswitch: {trace}: {said}\n")


def test_a_trace_that_is_not_there(vswitch: Vswitch, tmp_path: Path) -> None:
    done = vswitch("play", str(tmp_path / "none"), "--", "echo", "started")
    assert (done.status, done.stdout) == (1, "")
    assert done.stderr == f"vswitch: [Errno 2] No such file or directory: '{tmp_path / 'none'}'\n"
