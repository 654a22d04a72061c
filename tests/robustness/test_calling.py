"""However a function is called, the same comes of it; the same as where all calls go by tuple."""

import os
import sys
import sysconfig
from pathlib import Path
from typing import List

import _libvswitch as vs
import processes
import pytest

BUILD = Path(os.environ["BUILD_DIR"])
NO_FAST_PATHS = BUILD / "tests" / "no_fast_paths"
FUNCTIONS = 1374
"""Those that say METH_VARARGS."""


def observations(*options: str, **environment: str) -> List[str]:
    done = processes.run(str(processes.HERE / "calling.py"), *options, **environment)
    assert done.returncode == 0, done.stderr
    return done.stdout.splitlines()


@pytest.fixture(name="seen", scope="module")
def fixture_seen() -> List[str]:
    return observations()


def without_fast_paths() -> List[str]:
    path = os.pathsep.join([str(NO_FAST_PATHS), processes.environment()["PYTHONPATH"]])
    return observations(PYTHONPATH=path)


def has_fast_paths() -> bool:
    cache = (BUILD / "CMakeCache.txt").read_text(encoding="utf-8")
    return "FAST_PATHS:BOOL=ON" in cache and not sysconfig.get_config_var("Py_GIL_DISABLED")


def test_the_interpreter_calls_by_array_where_it_can(seen: List[str]) -> None:
    is_known = (3, 8) <= sys.version_info[:2] <= (3, 13) and has_fast_paths()
    by_tuple = "2, among them ['DVSAliasToPortsetName', 'Panic']"
    assert seen[0].startswith(f"called by tuple: {by_tuple if is_known else FUNCTIONS}")


def test_all_ways_to_call_agree(seen: List[str]) -> None:
    assert [line for line in seen if line.startswith("differs")] == []
    assert len(seen) > 25 * FUNCTIONS


def test_nothing_else_comes_of_a_call_by_tuple(seen: List[str]) -> None:
    by_tuple = without_fast_paths()
    assert by_tuple[0].startswith(f"called by tuple: {FUNCTIONS}")
    assert by_tuple[1:] == seen[1:]


def test_a_slot_that_is_not_as_expected_is_left_alone(seen: List[str]) -> None:
    left_alone = observations("--without-vectorcall")
    assert left_alone[0].startswith(f"called by tuple: {FUNCTIONS}")
    assert left_alone[1:] == seen[1:]


def test_keywords_that_are_no_texts_are_refused() -> None:
    """In the words of whichever way the interpreter takes: it looks at them first, or never."""
    with pytest.raises(TypeError, match="keywords must be strings|takes no keyword arguments"):
        vs.VSInfo_mtu_get(**{1: 2})
