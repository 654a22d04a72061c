"""The table of calls is true: what it calls modelled was seen to do something, the rest was not."""

import json
import os
import re
import subprocess
import sys
from pathlib import Path
from typing import Any, Callable, Dict, List, Set

import pytest

from simulated_host import Host

HERE = Path(__file__).parent
ROOT = HERE.parents[2]
SIMHOST = Path(os.environ["BUILD_DIR"]) / "simhost"
SURFACE = ROOT / "tests" / "surface" / "functions.txt"
Table = List[Dict[str, str]]


@pytest.fixture(scope="module")
def table() -> Table:
    """The table as the build made it."""
    rows: Table = json.loads((SIMHOST / "calls.json").read_text(encoding="utf-8"))
    return rows


def seen_with(environment: Dict[str, str]) -> Any:
    """What every call is seen to do, in a process of its own."""
    done = subprocess.run(
        [sys.executable, str(HERE / "every_call.py")],
        env=environment,
        capture_output=True,
        text=True,
    )
    assert done.returncode == 0, done.stderr
    return json.loads(done.stdout)


@pytest.fixture(scope="module")
def seen() -> Any:
    """What it is seen to do on a host in memory."""
    return seen_with(
        {name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")}
    )


def calls(table: Table, answer: str) -> Set[str]:
    return {row["call"] for row in table if row["answer"] == answer}


def test_the_table_has_every_call_that_the_module_binds_and_no_other(table: Table) -> None:
    bound = set(re.findall(r"^call +(\w+)\(", SURFACE.read_text(encoding="ascii"), re.MULTILINE))
    assert len(bound) == 146
    assert sorted(row["call"] for row in table) == sorted(bound)


def test_what_is_modelled_does_something(table: Table, seen: Any) -> None:
    assert sorted(calls(table, "modelled") - set(seen["modelled"])) == []


def test_what_is_not_modelled_does_nothing(table: Table, seen: Any) -> None:
    assert sorted(set(seen["modelled"]) - calls(table, "modelled")) == []


def test_a_call_that_stopped_doing_anything_would_be_noticed(table: Table, host: Host) -> None:
    idle = {"DVSQEX_SwitchSetMaxPorts", "VSQEX_GetRARPStats", "VSQEX_PortGetTeamUplinkHint"}
    for call in idle:
        host.ctl("fault", "add", call, "--times", "0", "--status", "QEX_NOT_SUPPORTED")
    modelled = set(seen_with(host.environment)["modelled"])
    assert calls(table, "modelled") - modelled == idle


def test_only_one_call_answers_a_fixed_status(table: Table) -> None:
    rest = [row for row in table if row["answer"] != "modelled"]
    assert rest == [
        {
            "call": "DVSQEX_CmdExec",
            "family": "DVSQEX_*",
            "library": "libnebPublic.so",
            "answer": "fixed",
            "status": "QEX_NOT_SUPPORTED",
        }
    ]


def test_a_fixed_answer_is_the_one_in_the_table(table: Table, run: Callable[[str], str]) -> None:
    status = next(row["status"] for row in table if row["answer"] == "fixed")
    output = run(
        f"""
vs.VSDVS_CreateVSwitch("lab", "lab-id", None, 0, 1, 0, 0, 0)
for command in ("show", "reset", "com.example.anything"):
    print(vs.DVSQEX_CmdExec("lab-id", command, None, 0, None, None) == vs.{status})
"""
    )
    assert output.split() == ["True"] * 3


def test_simhostctl_shows_the_same_table(table: Table, host: Host) -> None:
    del host.environment["SIMHOST_STATE"]
    assert json.loads(host.ctl("calls", "--json")) == table
    lines = [line.split(maxsplit=2) for line in host.ctl("calls").splitlines()]
    assert [line[:2] for line in lines] == [[row["call"], row["library"]] for row in table]
    markdown = (SIMHOST / "calls.md").read_text(encoding="utf-8").splitlines()[2:]
    assert [line.split("`")[1] for line in markdown] == [row["call"] for row in table]


LIBRARY = """
int VSDVS_One(void) { return 0; }
__attribute__((weak)) int VSDVS_Two(void) { return 1; }
int DVSQEX_Three(void) { return 2; }
"""
FIXED = """
extern "C" QEX_ReturnStatus DVSQEX_Three(char const *) {
  return answer(__func__, [&](Call &call) {
    simhost::refuse(QEX_BUSY);
  });
}
"""


def made(folder: Path, fixed: str) -> "subprocess.CompletedProcess[str]":
    """The maker of the table, over a library of three functions."""
    (folder / "fixed.cpp").write_text(fixed, encoding="ascii")
    (folder / "three.c").write_text(LIBRARY, encoding="ascii")
    library = folder / "libthree.so"
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, folder / "three.c"], check=True)
    script = ROOT / "simhost" / "make_call_table.py"
    outputs = [str(folder / "calls.json"), str(folder / "calls.md")]
    return subprocess.run(
        [sys.executable, str(script), *outputs, "nm", str(folder / "fixed.cpp"), str(library)],
        capture_output=True,
        text=True,
    )


def test_the_table_tells_what_a_library_lacks(tmp_path: Path) -> None:
    assert made(tmp_path, FIXED).returncode == 0
    rows = json.loads((tmp_path / "calls.json").read_text(encoding="utf-8"))
    assert {row["call"]: (row["answer"], row.get("status")) for row in rows} == {
        "VSDVS_One": ("modelled", None),
        "VSDVS_Two": ("not modelled", None),
        "DVSQEX_Three": ("fixed", "QEX_BUSY"),
    }


def test_a_fixed_answer_must_be_one_and_of_a_call(tmp_path: Path) -> None:
    unknown = made(tmp_path, FIXED.replace("Three", "Four"))
    assert (unknown.returncode, unknown.stderr) == (1, "no library exports DVSQEX_Four\n")
    endless = made(tmp_path, FIXED.replace("simhost::refuse(QEX_BUSY);", "work();"))
    assert (endless.returncode, endless.stderr) == (
        1,
        "DVSQEX_Three does not end by refusing with a status\n",
    )
