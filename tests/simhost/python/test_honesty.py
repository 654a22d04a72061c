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


def test_only_one_call_returns_a_fixed_status(table: Table) -> None:
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


def test_a_fixed_status_is_the_one_in_the_table(table: Table, run: Callable[[str], str]) -> None:
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


HEADER = """
#ifndef THREE_H
int VSDVS_One(void);
/** Not int DVSQEX_Four(void); */
typedef int (*Function)(void);
QEX_ReturnStatus DVSQEX_Two(char const *, int
                            *);
#endif
"""
LIBRARY = "int VSDVS_One(void) { return 0; } int DVSQEX_Two(char *a, int *b) { return a && b; }"
MADE = ["calls.json", "calls.md"]


def made(
    folder: Path, library: str = LIBRARY, fixed: str = '{"DVSQEX_Two": "QEX_BUSY"}'
) -> "subprocess.CompletedProcess[str]":
    """The maker of the table, over a library of two functions."""
    (folder / "fixed.json").write_text(fixed, encoding="ascii")
    (folder / "two.h").write_text(HEADER, encoding="ascii")
    (folder / "two.c").write_text(library, encoding="ascii")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", "libtwo.so", "two.c"], cwd=folder, check=True)
    script = ROOT / "simhost" / "make_call_table.py"
    options = ["--json", MADE[0], "--markdown", MADE[1], "--nm", "nm", "--fixed", "fixed.json"]
    return subprocess.run(
        [sys.executable, str(script), *options, "--library", "libtwo.so", "two.h"],
        cwd=folder,
        capture_output=True,
        text=True,
    )


def test_the_table_tells_what_is_fixed(tmp_path: Path) -> None:
    assert made(tmp_path).returncode == 0
    rows = json.loads((tmp_path / "calls.json").read_text(encoding="utf-8"))
    assert {row["call"]: (row["answer"], row.get("status")) for row in rows} == {
        "VSDVS_One": ("modelled", None),
        "DVSQEX_Two": ("fixed", "QEX_BUSY"),
    }


@pytest.mark.parametrize(
    "library, complaint",
    [
        (LIBRARY.replace("VSDVS_One", "VSDVS_Won"), "libtwo.so does not export VSDVS_One"),
        (LIBRARY.replace("int VSDVS", "static int VSDVS"), "libtwo.so does not export VSDVS_One"),
        ("__attribute__((weak)) " + LIBRARY, "libtwo.so does not export VSDVS_One"),
        (
            LIBRARY + "int VSDVS_Three(void) { return 0; }",
            "libtwo.so exports VSDVS_Three, which no header declares",
        ),
    ],
    ids=["misspelt", "hidden", "weak", "undeclared"],
)
def test_a_library_exports_what_its_headers_declare(
    tmp_path: Path, library: str, complaint: str
) -> None:
    done = made(tmp_path, library)
    assert (done.returncode, done.stderr) == (1, complaint + "\n")
    assert not any((tmp_path / name).exists() for name in MADE)


def test_a_fixed_call_must_be_a_call(tmp_path: Path) -> None:
    done = made(tmp_path, fixed='{"DVSQEX_Four": "QEX_BUSY"}')
    assert (done.returncode, done.stderr) == (1, "fixed.json: no header declares DVSQEX_Four\n")
