"""Every call is modelled, or is on the reviewed list of those that answer a fixed status."""

import os
import re
import subprocess
from pathlib import Path
from typing import Callable, Dict, Set

HERE = Path(__file__).parent
LIBRARIES = Path(os.environ["BUILD_DIR"]) / "simhost"
SURFACE = HERE.parent.parent / "surface" / "functions.txt"


def bound_calls() -> Set[str]:
    """The calls of the two libraries that the module binds."""
    return set(re.findall(r"^call +(\w+)\(", SURFACE.read_text(encoding="ascii"), re.MULTILINE))


def exported() -> Dict[str, str]:
    """The kind of each function that the two libraries export: W for one with no model behind."""
    kinds = {}
    for name in ("libvswitch.so", "libnebPublic.so"):
        output = subprocess.run(
            ["nm", "-D", "--defined-only", str(LIBRARIES / name)],
            stdout=subprocess.PIPE,
            encoding="ascii",
            check=True,
        ).stdout
        for kind, symbol in re.findall(r"^\S+ ([TWV]) (\w+)$", output, re.MULTILINE):
            kinds[symbol] = kind
    return kinds


def fixed_answers() -> Dict[str, str]:
    """The reviewed list."""
    lines = (HERE / "fixed_answers.txt").read_text(encoding="ascii").splitlines()
    pairs = [line.split() for line in lines if not line.startswith("#")]
    return {name: status for name, status in pairs}


def test_the_libraries_have_every_call_and_no_other() -> None:
    calls = bound_calls()
    assert len(calls) == 146
    assert set(exported()) == calls


def test_no_call_is_without_a_model() -> None:
    assert [name for name, kind in exported().items() if kind != "T"] == []


def test_only_one_call_answers_a_fixed_status() -> None:
    assert set(fixed_answers()) == {"DVSQEX_CmdExec"}


def test_a_fixed_answer_is_the_one_that_is_listed(run: Callable[[str], str]) -> None:
    output = run(
        """
vs.VSDVS_CreateVSwitch("lab", "lab-id", None, 0, 1, 0, 0, 0)
for command in ("show", "reset", "com.example.anything"):
    print(vs.DVSQEX_CmdExec("lab-id", command, None, 0, None, None) == vs.%s)
"""
        % fixed_answers()["DVSQEX_CmdExec"]
    )
    assert output.split() == ["True"] * 3
