"""`vswitch replay`: the calls of a trace are made again, and what differs is told."""

import json
import os
import subprocess
import sys
from pathlib import Path

import pytest
from command_line import LAB, PROGRAM, SIMULATED, Done, Refused, Vswitch
from libvswitch.errors import NotRestored
from simhost import SharedHost
from vswitch import replay
from vswitch.allowing import Allowances
from vswitch.command import replaying
from vswitch.recording import recorded
from vswitch.trace import TraceError


# Where there are these two switches, too.
TOOL = f"""
from pathlib import Path
from simhost import Host
from vswitch.command.program import main

Host(None, Path()).apply({LAB!r})
main(["set", "lab", "mtu=1600"])
"""


@pytest.fixture(name="recording", scope="module")
def fixture_recording(tmp_path_factory: pytest.TempPathFactory) -> bytes:
    path = tmp_path_factory.mktemp("recording") / "trace.jsonl"
    with recorded(path, ["set"]) as environment:
        environment.pop("SIMHOST_STATE", None)
        subprocess.run([sys.executable, "-c", TOOL], env=environment, check=True)
    return path.read_bytes()


@pytest.fixture(name="trace")
def fixture_trace(recording: bytes, tmp_path: Path) -> str:
    path = tmp_path / "trace.jsonl"
    path.write_bytes(recording)
    return str(path)


def test_no_difference(vswitch: Vswitch, trace: str) -> None:
    done = vswitch("replay", trace)
    assert (done.status, done.stderr) == (0, SIMULATED)
    heads = ["FUNCTION", "CALLS", "ALIKE", "ALLOWED", "DIFFERENT", "NOT", "MADE", "LEFT", "OUT"]
    assert done.lines[0].split() == heads
    rows = {line.split()[0]: line.split()[1:] for line in done.lines[1:]}
    assert rows["VSDVS_SetMTU"] == ["1", "1", "0", "0", "0", "0"]
    assert all(row[0] == row[1] for row in rows.values())


def test_the_first_difference_is_told_in_words(
    vswitch: Vswitch, lab: SharedHost, trace: str
) -> None:
    lab.fault("VSDVS_SetMTU", status="QEX_BUSY")
    done = vswitch("replay", trace)
    assert done.status == 1
    (told,) = [line for line in done.lines if line.startswith("VSDVS_SetMTU:")]
    assert told.startswith("VSDVS_SetMTU: status: QEX_OK -> QEX_BUSY [call ")
    assert "VSDVS_GetMTU: out.mtu: 1600 -> 9000" in done.stdout


def test_what_else_differs_is_counted(vswitch: Vswitch, lab: SharedHost, trace: str) -> None:
    lab.apply({"switches": [{"alias": "lab", "mtu": 1700, "ports": [{"id": "x"}]}]})
    done = vswitch("replay", trace)
    told = [line for line in done.lines if line.startswith("VSQEX_GetVSInfo: ")]
    assert told[0].startswith("VSQEX_GetVSInfo: out.info.mtu: 9000 -> 1700 [call ")
    assert told[1] == "VSQEX_GetVSInfo: out.info.activePorts in 6"


def test_json(vswitch: Vswitch, lab: SharedHost, trace: str) -> None:
    lab.fault("VSDVS_SetMTU", status="QEX_BUSY")
    done = vswitch("replay", trace, "--json")
    assert done.status == 1 and done.json["alike"] is False and done.json["unused"] == []
    of = done.json["functions"]["VSDVS_SetMTU"]
    assert (of["calls"], of["alike"], of["different"], of["paths"]) == (1, 0, 1, {"status": 1})
    first = of["first"]
    assert (first["path"], first["recorded"], first["present"]) == ("status", "QEX_OK", "QEX_BUSY")


def test_what_is_allowed_does_not_count(
    vswitch: Vswitch, lab: SharedHost, trace: str, tmp_path: Path
) -> None:
    lab.fault("VSDVS_SetMTU", status="QEX_BUSY")
    known = tmp_path / "known.yaml"
    known.write_text(
        "allowed:\n"
        "- {function: VSDVS_SetMTU, path: status, present: QEX_BUSY, reason: it is busy}\n"
        "- {function: VSDVS_GetMTU, path: out.mtu, reason: and so remains as it was}\n"
        "- {function: VSQEX_GetVSInfo, path: out.info.mtu, reason: here as well}\n"
        "- {function: DVSData_Data, path: out.data, reason: as do its bytes}\n"
        "- {path: out.nothing, reason: this went long ago}\n"
    )
    done = vswitch("replay", trace, "--allow", str(known))
    assert done.status == 0, done.stdout
    assert done.lines[-1] == (
        "allowed, but not found: any function: out.nothing (this went long ago)"
    )
    done = vswitch("replay", trace, "--allow", str(known), "--json")
    assert done.json["unused"] == [
        "VSDVS_SetMTU: status: any -> QEX_BUSY",
        "VSDVS_GetMTU: out.mtu",
        "VSQEX_GetVSInfo: out.info.mtu",
        "DVSData_Data: out.data",
        "any function: out.nothing",
    ]


def test_questions_leave_the_host_as_it_is(vswitch: Vswitch, lab: SharedHost, trace: str) -> None:
    before = lab.describe()["switches"]
    done = vswitch("replay", trace, "--questions-only", "--json")
    assert lab.describe()["switches"] == before
    assert done.json["functions"]["VSDVS_SetMTU"]["left_out"] == 1


def test_what_is_wrong_with_a_trace(refused: Refused, tmp_path: Path) -> None:
    path = tmp_path / "trace.jsonl"
    path.write_text('{"vswitch trace": 99}\n')
    newer = "a trace of version 99, and this program reads those up to 1"
    assert refused("replay", str(path)) == f"vswitch: {path}: line 1: {newer}\n"
    gone = tmp_path / "gone"
    said = f"vswitch: [Errno 2] No such file or directory: '{gone}'\n"
    assert refused("replay", str(gone)) == said


def test_nothing_is_done_for_a_trace_that_is_cut(
    lab: SharedHost, refused: Refused, trace: str
) -> None:
    path = Path(trace)
    whole = path.read_bytes()
    path.write_bytes(whole[:-20])
    line = whole.count(b"\n")
    cut = "the trace is cut off in the middle of a line"
    assert refused("replay", trace) == f"vswitch: {trace}: line {line}: {cut}\n"


def test_nothing_is_done_for_a_hostile_call(refused: Refused, trace: str) -> None:
    path = Path(trace)
    lines = path.read_text().splitlines()
    at = next(at for at, line in enumerate(lines) if '"VSDVS_SetMTU"' in line)
    event = json.loads(lines[at])
    event["in"]["mtu"] = -1
    lines[at] = json.dumps(event)
    path.write_text("\n".join(lines) + "\n")
    said = refused("replay", trace)
    assert f"call {event['call']}: in.mtu: -1 is not from 0 to 4294967295\n" in said


def test_what_is_wrong_with_a_list(refused: Refused, trace: str, tmp_path: Path) -> None:
    known = tmp_path / "known.yaml"
    known.write_text("allowed:\n- {path: status}\n")
    told = refused("replay", trace, "--allow", str(known))
    assert told == f"vswitch: {known}: allowed[0]: 'reason' is missing\n"


def test_a_real_host_is_changed_only_by_consent(trace: str) -> None:
    # It is nobody's simulated host, and notes what it is asked.
    real = os.path.join(os.environ["BUILD_DIR"], "tests", "recording_host")

    def asked(*options: str) -> Done:
        done = subprocess.run(
            [PROGRAM, "replay", trace, *options],
            env={**os.environ, "LD_LIBRARY_PATH": real},
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            text=True,
        )
        return Done(done.returncode, done.stdout, done.stderr)

    refused = asked()
    assert (refused.status, refused.stdout) == (2, "")
    assert refused.stderr.startswith(
        "vswitch: this is a real host: --questions-only leaves out what may change it, "
        "--change-host does not\n"
    )
    of = asked("--questions-only", "--json").json["functions"]["VSDVS_SetMTU"]
    assert (of["left_out"], of["calls"]) == (1, 1)
    of = asked("--change-host", "--json").json["functions"]["VSDVS_SetMTU"]
    assert (of["alike"], of["calls"]) == (1, 1)


def test_a_trace_that_changes_while_it_is_replayed(
    monkeypatch: pytest.MonkeyPatch, trace: str
) -> None:
    def changed(*unused: object) -> None:
        raise TraceError(Path(trace), 7, "no JSON")

    monkeypatch.setattr(replay, "replay", changed)
    with pytest.raises(NotRestored) as caught:
        replaying.replayed(Path(trace), Allowances([]), True)
    assert str(caught.value) == (
        "the trace has changed meanwhile, and calls of it are made: " f"{trace}: line 7: no JSON"
    )


def test_usage(refused: Refused, trace: str) -> None:
    both = refused("replay", trace, "--questions-only", "--change-host", status=2)
    assert both.startswith("vswitch: --questions-only and --change-host exclude each other\n")
