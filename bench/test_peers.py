"""The comparison is one of equals: every peer returns the same and keeps what it claims to keep."""

import json
import os
import re
import subprocess
import sys
import sysconfig
from pathlib import Path
from typing import Any, Dict

import functions
import pytest
import targets
from figures import EXPECTED, FIGURES, FORMS

HERE = Path(__file__).resolve().parent
ROOT = HERE.parent

FAILURES = """
import json, sys
module = __import__(sys.argv[1])
info, name = module.new_VSInfo(), module.new_qex_Name()
status, uplinks = module.VSQEX_GetUplinks("dvs0")
calls = [
    (module.new_VSInfo, 1),
    (module.delete_VSInfo,),
    (module.delete_VSInfo, name),
    (module.delete_VSInfo, None),
    (module.VSInfo_mtu_get,),
    (module.VSInfo_mtu_get, info, info),
    (module.VSInfo_mtu_get, name),
    (module.VSInfo_mtu_get, None),
    (module.VSInfo_mtu_get, 5),
    (module.VSInfo_mtu_set, info),
    (module.VSInfo_mtu_set, name, 1),
    (module.VSInfo_mtu_set, None, 1),
    (module.VSInfo_mtu_set, info, "1"),
    (module.VSInfo_mtu_set, info, 1.0),
    (module.VSInfo_mtu_set, info, True),
    (module.VSInfo_mtu_set, info, -1),
    (module.VSInfo_mtu_set, info, 2**32 - 1),
    (module.VSInfo_mtu_set, info, 2**32),
    (module.VSInfo_mtu_set, info, 2**64 - 1),
    (module.VSInfo_mtu_set, info, 2**64),
    (module.VSInfo_mtu_set, info, -(2**64)),
    (module.qex_Name_string_get, info),
    (module.qex_Name_string_get, None),
    (module.qex_Name_string_set, name, "a" * 31),
    (module.qex_Name_string_set, name, "a" * 32),
    (module.qex_Name_string_set, name, b"a"),
    (module.qex_Name_string_set, name, "\\udc80"),
    (module.qex_Name_string_set, name, None),
    (module.qex_Name_string_set, None, "a"),
    (module.VSDVS_SetMTU,),
    (module.VSDVS_SetMTU, "dvs0", 1, 2),
    (module.VSDVS_SetMTU, b"dvs0", 1500),
    (module.VSDVS_SetMTU, None, 1500),
    (module.VSDVS_SetMTU, "\\udc80", 1500),
    (module.VSDVS_SetMTU, "dvs0", -1),
    (module.VSDVS_SetMTU, "dvs0", None),
    (module.VSDVS_DvPortIDToPortID, "dvs0"),
    (module.VSDVS_DvPortIDToPortID, 1, "1"),
    (module.VSDVS_DvPortIDToPortID, "dvs0", 1),
    (module.VSQEX_GetVSInfo, "dvs0", name),
    (module.VSQEX_GetVSInfo, 0, info),
    (module.VSQEX_GetVSInfo, "dvs0"),
    (module.VSUplinks___len__, info),
    (module.VSUplinks___len__, None),
    (module.VSUplinks___getitem__, uplinks, 2),
    (module.VSUplinks___getitem__, uplinks, -1),
    (module.VSUplinks___getitem__, uplinks, "1"),
    (module.VSUplinks___getitem__, uplinks, 2**31),
    (module.VSUplinks___getitem__, uplinks),
]
outcomes = []
for function, *arguments in calls:
    try:
        outcomes.append(repr(function(*arguments)))
    except Exception as error:
        outcomes.append(f"{type(error).__name__}: {error}")
module.delete_VSInfo(info)
sys.stderr.write(json.dumps([module.qex_Name_string_get(name), *outcomes]))
"""

TRAP = """
import sys
module = __import__(sys.argv[1])
from recording_host import RecordingHost
host = RecordingHost()
host.spring("VSDVS_SetMTU", LookupError, "the call traps", nth=1)
try:
    module.VSDVS_SetMTU("dvs0", 1500)
except LookupError as error:
    sys.stderr.write(f"{error}; ")
sys.stderr.write(f"{module.VSDVS_SetMTU('dvs0', 1500)} {host.exception_status}")
"""


def run(script: str, module: str, host: Path, *folders: Path) -> str:
    """Return what a script says of a module on its standard error, on one of the hosts."""
    path = os.pathsep.join(map(str, folders))
    environment = {**os.environ, "LD_LIBRARY_PATH": str(host), "PYTHONPATH": path}
    command = [sys.executable, "-c", script, module]
    done = subprocess.run(
        command, env=environment, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True
    )
    assert done.returncode == 0, done.stderr
    return done.stderr


@pytest.fixture(name="quick", scope="module")
def fixture_quick(build: Path) -> Dict[str, Any]:
    """Return the results of a short run. It has asked every peer for every figure."""
    done = subprocess.run(
        [sys.executable, HERE / "run.py", "--quick", build],
        env={name: value for name, value in os.environ.items() if name != "LD_LIBRARY_PATH"},
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        text=True,
    )
    assert done.returncode == 0, done.stdout
    results: Dict[str, Any] = json.loads((build / "bench" / "results.json").read_text())
    results["table"] = done.stdout
    return results


def test_every_peer_returns_the_same_for_every_figure(quick: Dict[str, Any]) -> None:
    expected = {form: {peer: EXPECTED for peer in peers} for form, peers in FORMS.items()}
    assert quick["calls"]["results"] == expected


def test_stock_frame_knows_the_vocabulary_of_the_definitions(tmp_path: Path) -> None:
    source = tmp_path / "stock.c"
    folders = [HERE / "surfaces" / "stock", ROOT / "interface", ROOT / "include", ROOT]
    command = ["swig", "-python", *(f"-I{folder}" for folder in folders)]
    output = ["-outdir", str(tmp_path), "-o", str(source)]
    subprocess.run([*command, *output, str(folders[0] / "stock_surface.i")], check=True)
    # What a body names and the frame lacks shows to the compiler alone.
    syntax = ["cc", "-fsyntax-only", "-std=gnu11", "-Werror=implicit-function-declaration"]
    includes = ["-isystem", sysconfig.get_path("include"), *(f"-I{folder}" for folder in folders)]
    subprocess.run([*syntax, *includes, str(source)], check=True)
    made = set(re.findall(r'^\t \{ "(\w+)", ', source.read_text(), flags=re.M))
    expected = {function.name for function in functions.read() if function.kind != "runtime"}
    assert expected <= made


def test_every_figure_of_every_peer_is_measured(quick: Dict[str, Any]) -> None:
    times = quick["calls"]["times"]
    assert {form: set(figures) for form, figures in times.items()} == {
        form: set(FIGURES) for form in FORMS
    }
    for form, peers in FORMS.items():
        for figure, measured in times[form].items():
            assert set(measured) == set(peers), figure
            assert all(value > 0 for values in measured.values() for value in values), figure


def test_every_target_is_judged(quick: Dict[str, Any]) -> None:
    judged = {(one["table"], one["figure"], one["peer"]) for one in quick["targets"]}
    goals = {"functions": targets.CALLS, "classes": targets.CLASSES}
    assert judged == {
        (table, row, peer)
        for table, rows in goals.items()
        for row, peers in rows.items()
        for peer in peers
    }
    assert f"of {len(judged)} targets met" in quick["table"]


def test_picture_is_written(build: Path, quick: Dict[str, Any]) -> None:
    picture = (build / "bench" / "calls.svg").read_text(encoding="utf-8")
    assert picture.startswith("<svg") and all(title in picture for title in FIGURES.values())


def test_peer_by_hand_fails_like_the_module(build: Path) -> None:
    host = build / "bench" / "null_host"
    ours = json.loads(run(FAILURES, "_libvswitch", host, build / "python").splitlines()[0])
    peer = json.loads(run(FAILURES, "handwritten", host, build / "bench" / "peers"))
    assert peer == ours


@pytest.mark.parametrize("module", ["_libvswitch", "handwritten"])
def test_call_trap_is_armed(build: Path, module: str) -> None:
    host = build / "tests" / "recording_host"
    contract = ROOT / "tests" / "contract"
    folders = build / "python", build / "bench" / "peers", contract
    assert run(TRAP, module, host, *folders) == "the call traps; 0 0"
