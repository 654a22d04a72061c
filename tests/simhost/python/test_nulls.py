"""Null for any pointer of any call ends in an answer: a status that says so where there is one."""

import os
import re
import subprocess
import sys
from pathlib import Path
from typing import Dict, Tuple

import pytest

import _libvswitch as vs

SCRIPT = Path(__file__).with_name("every_null.py")

#: Where null has a meaning, and so another answer: the host chooses a name, which the call goes on
#: with; null for both functions is the host's own memory; a command has no input or output.
MEANT = {
    ("VSDVS_CreateVSwitch", "switchId"): vs.QEX_EXISTS,
    ("VSDVS_CreateVSwitch", "portsetName"): vs.QEX_EXISTS,
    ("DVSData_Alloc", "alloc"): vs.QEX_OK,
    ("DVSData_Alloc", "release"): vs.QEX_OK,
    ("DVSQEX_CmdExec", "input"): vs.QEX_NOT_SUPPORTED,
    ("DVSQEX_CmdExec", "output"): vs.QEX_NOT_SUPPORTED,
    ("DVSQEX_CmdExec", "outputLength"): vs.QEX_NOT_SUPPORTED,
}


@pytest.fixture(scope="module")
def results() -> Dict[Tuple[str, str], str]:
    clean = {name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")}
    done = subprocess.run([sys.executable, str(SCRIPT)], env=clean, capture_output=True, text=True)
    assert (done.returncode, done.stderr) == (0, "")
    rows = [line.split() for line in done.stdout.splitlines() if not line.startswith("swig/")]
    return {(call, parameter): answer for call, parameter, answer in rows}


def test_a_status_says_that_null_is_no_argument(results: Dict[Tuple[str, str], str]) -> None:
    statuses = {key: int(answer) for key, answer in results.items() if answer[0] != "("}
    wrong = {
        key: vs.QEX_ReturnStatusToString(status)
        for key, status in statuses.items()
        if status != MEANT.get(key, vs.QEX_BAD_PARAM)
    }
    assert wrong == {}


def test_calls_without_a_status_return_nothing(results: Dict[Tuple[str, str], str]) -> None:
    others = {key: answer for key, answer in results.items() if answer[0] == "("}
    assert {key: answer for key, answer in others.items() if answer.lower() != "(none)"} == {}
    assert ("DVS_SwitchId", "handle") in others


def test_every_call_with_a_pointer_was_made(results: Dict[Tuple[str, str], str]) -> None:
    surface = SCRIPT.parents[2] / "surface" / "functions.txt"
    bound = set(re.findall(r"^call +(\w+)\(", surface.read_text(encoding="ascii"), re.MULTILINE))
    without = {
        "DVSState_ConfigReset",
        "DVSQEX_StateSanitize",
        "DVSQEX_StateCleanup",
        "QEX_ReturnStatusToString",
        "Panic",
    }
    assert {call for call, _ in results} == bound - without
