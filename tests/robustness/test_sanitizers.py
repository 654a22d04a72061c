"""Each sanitizer ends a program with the fault that it is for."""

import os
import subprocess

import processes
import pytest

PROGRAM = processes.BUILD / "tests" / "canaries" / "leaking"
FAULTS = {
    "past the end": "AddressSanitizer: heap-buffer-overflow",
    "overflow": "runtime error: signed integer overflow",
    "leak": "LeakSanitizer: detected memory leaks",
}


def ended(fault: str) -> "subprocess.CompletedProcess[str]":
    # The options under which the tests run are for a process with an interpreter in it.
    kept = {name: value for name, value in os.environ.items() if name not in UNSET}
    return subprocess.run([PROGRAM, fault], env=kept, capture_output=True, text=True, check=False)


UNSET = ("ASAN_OPTIONS", "LD_PRELOAD")


@pytest.mark.parametrize("fault", FAULTS)
def test_a_program_with_a_fault_is_ended(fault: str) -> None:
    done = ended(fault)
    assert done.returncode != 0
    assert FAULTS[fault] in done.stderr


def test_a_program_without_one_is_not() -> None:
    done = ended("")
    assert (done.returncode, done.stderr) == (0, "")


@pytest.mark.parametrize(
    "function, report",
    [("write_past_a_block", FAULTS["past the end"]), ("overflow_an_integer", FAULTS["overflow"])],
)
def test_a_module_with_a_fault_is_ended_where_modules_are_instrumented(
    function: str, report: str
) -> None:
    done = processes.run("-c", f"import faulty; faulty.{function}()")
    assert (report in done.stderr) == processes.SANITIZED
    assert (done.returncode != 0) == processes.SANITIZED
