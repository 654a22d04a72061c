"""What the host sees of the arguments of every checked call, over the recording host."""

import json
import os
import subprocess
import sys
from pathlib import Path
from typing import Any, Dict

import functions
import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ["BUILD_DIR"])
NAMES = sorted({one.name for one in functions.read() if one.kind == "call"})

# Parameters of C that the checked calls do not take: how many of what they stand for.
LENGTHS = {
    "VSDVS_SetPortVLANPolicy": ("numRanges", 2),
    "VSDVS_SetPrivateVLANMap": ("count", 2),
    "VSQEX_GetRuntimeOptions": ("count", 2),
    "DVSData_Update": ("length", len("bytes 3")),
    "DVSState_ConfigDeserialize": ("length", len("bytes 1")),
    "DVSQEX_StateInit": ("length", len("bytes 1")),
    "DVSQEX_CmdExec": ("inputLength", len("bytes 3")),
    "DVSQEX_GlobalPropSet": ("length", len("bytes 3")),
    "DVSQEX_HostPropSet": ("length", len("bytes 3")),
    "DVSQEX_PortAdd": ("stateLength", len("bytes 3")),
    "DVSQEX_PortDataSet": ("length", len("bytes 4")),
    "DVSQEX_UplinkDataSet": ("length", len("bytes 4")),
}

# What arrays and frozen values are in memory.
MEMORY = {
    ("VSDVS_SetPortVLANPolicy", "ranges"): "0100020000000000",
    ("VSDVS_SetPrivateVLANMap", "entries"): "01000200000000000000000000000000",
    ("VSQEX_GetRuntimeOptions", "ids"): "34127856",
    ("VSQEX_SetPortMACTable", "entry"): "020000000007",
    ("VSQEX_ClearPortMACTable", "entry"): "020000000007",
}

HANDLES = {"list": 0x4001, "item": 0x1000, "memory": 0x1000}
HANDLES_OF_PORTS = {"DVS_PortId", "DVS_PortAlias", "DVSState_PortDataForEach"}


@pytest.fixture(scope="module", name="recorded")
def fixture_recorded() -> Dict[str, Any]:
    folders = [ROOT / "tests" / one for one in ("contract", "surface", "support")]
    program, tree = ROOT / "tests/classes/recorded_calls.py", BUILD / "classes/made/tree.xml"
    done = subprocess.run(
        list(map(str, [sys.executable, program, tree, *folders, ROOT / "python"])),
        env={**os.environ, "LD_LIBRARY_PATH": str(BUILD / "tests/recording_host")},
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    )
    assert done.returncode == 0, done.stderr
    found: Dict[str, Any] = json.loads(done.stdout)
    return found


def expected_handle(call: str, name: str) -> int:
    if call.endswith("Free") or call == "DVSQEX_DataFree" or call == "VSQEX_FreeMemory":
        return 0x1000
    if name == "handle":
        return 0x3001 if call in HANDLES_OF_PORTS else 0x2001
    return HANDLES[name]


def test_every_call_was_made(recorded: Dict[str, Any]) -> None:
    assert sorted(recorded) == NAMES and len(NAMES) == 146


@pytest.mark.parametrize("call", NAMES)
def test_what_the_host_sees(recorded: Dict[str, Any], call: str) -> None:
    given, seen, memory = (recorded[call][part] for part in ("given", "seen", "memory"))
    for name, value in given.items():
        if isinstance(value, str):
            assert bytes.fromhex(seen[name]["bytes"]).decode() == value
        elif isinstance(value, int):
            assert seen[name] == value
        elif isinstance(value, dict):
            assert memory[name].startswith(value["bytes"])
        elif name in ("alloc", "release"):
            assert seen[name] is None
        elif name in ("handle", "list", "item", "memory") or call == "DVSQEX_DataFree":
            assert seen[name] == expected_handle(call, name)
        else:
            assert seen[name], name
    for (of, name), held in MEMORY.items():
        assert of != call or memory[name].startswith(held)
    if call in LENGTHS:
        name, length = LENGTHS[call]
        assert name not in given and seen[name] == length


@pytest.mark.parametrize("call", NAMES)
def test_what_is_said_of_a_failure(recorded: Dict[str, Any], call: str) -> None:
    """The recording host fails each call that has a status, and gives nulls for what has none."""
    status = call.startswith(("VSDVS_", "VSQEX_", "DVSQEX_")) and not call.endswith(
        ("FreeMemory", "DataFree")
    )
    if status:
        assert recorded[call]["raised"].startswith(f"HostError: {call}(")
        assert "QEX_FAILURE" in recorded[call]["raised"]
    else:
        assert not recorded[call]["raised"] or recorded[call]["raised"].startswith("HostError: ")
