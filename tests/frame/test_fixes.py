"""A module whose fixes did not take hold is not imported, and says which did not."""

import os
import re
import subprocess
import sys
import sysconfig
from pathlib import Path
from typing import Dict, Tuple

import pytest

HERE = Path(__file__).resolve().parent
ROOT = HERE.parents[1]
BUILD = Path(os.environ["BUILD_DIR"])
CHECKS = ROOT / "interface" / "frame" / "fixes" / "checks.i"
PAGE = ROOT / "docs" / "development" / "overrides.md"

# For each fix, what of the generated module is changed into what: as if the runtime had other
# names for what the fix replaces.
FAULTS: Dict[str, Tuple[str, str]] = {
    "module creation": (
        "  m = PyModule_Create(&SWIG_module);",
        "  m = PyModule_Create2(&SWIG_module, PYTHON_API_VERSION);",
    ),
    "variables once": ("SWIG_addvarlink(globals,", "SWIG_Python_addvarlink(globals,"),
    "failing variables": (
        "    type->tp_setattr = set_variable_or_fail;",
        "    (void)set_variable_or_fail;",
    ),
    "runtime lifetime": ("  Swig_Capsule_global = NULL;\n  \n", "  \n"),
    "overloads": (
        '  SWIG_Python_RaiseOrModifyTypeError("Wrong',
        '  PyErr_SetString(PyExc_TypeError, "Wrong',
    ),
    "pointer comparison": ("  type->tp_richcompare = compare_pointers;", ""),
    "pointer representation": (
        'strcmp(method->ml_name, "__repr__")',
        'strcmp(method->ml_name, "")',
    ),
    "pointer deallocation": ("  type->tp_dealloc = drop_pointer;", ""),
    "pointer append": ('strcmp(method->ml_name, "append")', 'strcmp(method->ml_name, "")'),
    "pointer ownership": ('strcmp(method->ml_name, "own")', 'strcmp(method->ml_name, "")'),
    # The interpreter's own macro stays, or inline function, whichever it has.
    "destructors": ("#undef PyCFunction_GET_FLAGS\n", "#if 0\n"),
}
_AFTER_DESTRUCTORS = "#define PyCFunction_GET_FLAGS(function) METH_VARARGS\n"


def generator() -> str:
    cache = (BUILD / "CMakeCache.txt").read_text(encoding="utf-8")
    found = re.search(r"^SWIG_EXECUTABLE:\w+=(.+)$", cache, re.MULTILINE)
    assert found is not None
    return found[1]


@pytest.fixture(name="generated", scope="module")
def fixture_generated(tmp_path_factory: pytest.TempPathFactory) -> str:
    folder = tmp_path_factory.mktemp("generated")
    interface, include = ROOT / "interface", ROOT / "include"
    subprocess.run(
        [generator(), "-python", "-noproxy", "-nofastunpack", "-Wall", "-Werror"]
        + [f"-I{interface / 'frame'}", f"-I{interface}", f"-I{include}", f"-I{ROOT}"]
        + ["-outdir", str(folder), "-o", str(folder / "sample_wrap.c"), str(HERE / "sample.i")],
        check=True,
    )
    return (folder / "sample_wrap.c").read_text(encoding="utf-8")


def imported(source: str, folder: Path) -> "subprocess.CompletedProcess[str]":
    """Compile a module and import it in a process of its own."""
    (folder / "sample_wrap.c").write_text(source, encoding="utf-8")
    cache = (BUILD / "CMakeCache.txt").read_text(encoding="utf-8")
    sanitize = re.search(r"^SANITIZE:\w+=(.+)$", cache, re.MULTILINE)
    subprocess.run(
        ["cc", "-shared", "-fPIC", "-w", *([f"-fsanitize={sanitize[1]}"] if sanitize else [])]
        + [f"-I{sysconfig.get_path('include')}", f"-I{ROOT / 'include'}", f"-I{ROOT}"]
        + [str(folder / "sample_wrap.c"), str(BUILD / "helpers" / "libhelpers.a")]
        + ["-o", str(folder / "sample.so")],
        check=True,
    )
    program = (
        "import sample; sample.delete_Sample(sample.new_Sample()); print(sample.take_form(''))"
    )
    return subprocess.run(
        [sys.executable, "-c", program],
        env={**os.environ, "PYTHONPATH": str(folder)},
        capture_output=True,
        text=True,
        check=False,
    )


def test_with_all_fixes_the_module_is_imported(generated: str, tmp_path: Path) -> None:
    done = imported(generated, tmp_path)
    assert (done.returncode, done.stdout) == (0, "1\n"), done.stderr


@pytest.mark.parametrize("fix", FAULTS)
def test_a_fix_that_does_not_take_hold_is_named(fix: str, generated: str, tmp_path: Path) -> None:
    good, bad = FAULTS[fix]
    assert good in generated
    source = generated.replace(good, bad)
    if fix == "destructors":
        source = source.replace(_AFTER_DESTRUCTORS, _AFTER_DESTRUCTORS + "#endif\n")
    done = imported(source, tmp_path)
    assert done.returncode == 1
    last = done.stderr.splitlines()[-1]
    assert re.fullmatch(
        rf'ImportError: sample: the fix "{fix}" did not take hold in the runtime of SWIG \d+, with '
        r"which this module was generated",
        last,
    ), done.stderr


def test_every_fix_has_a_fault_and_a_place_on_the_page() -> None:
    fixes = re.findall(r'^  \{"([a-z ]+)", \w+\},$', CHECKS.read_text(encoding="utf-8"), re.M)
    assert sorted(fixes) == sorted(FAULTS)
    rows = re.findall(r"^\| ([a-z ]+?) +\|", PAGE.read_text(encoding="utf-8"), re.M)
    assert set(fixes) <= set(rows)
