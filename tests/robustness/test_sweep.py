"""Wrong and extreme values in every argument: an exception or a result, and nothing else."""

import sys
from pathlib import Path

import processes
import pytest

# How many calls a batch makes at least, or it did not do what it is for.
BATCHES = {
    "reader": 100_000,
    "writer": 200_000,
    "call": 80_000,
    "other": 40_000,
    "registration": 300,
    "pointers": 5_000,
    "counts": 15_000,
    "pairs": 1_000,
}
DEBUG_INTERPRETER = hasattr(sys, "gettotalrefcount")
SEED = 20
SECONDS = 8.0


@pytest.mark.parametrize("batch", BATCHES)
def test_no_value_crashes_hangs_or_leaves_an_error(batch: str, tmp_path: Path) -> None:
    print("seed", SEED)
    calls, problems = processes.sweep(batch, tmp_path, SEED, SECONDS)
    assert problems == []
    assert calls > BATCHES[batch]


def test_what_is_planted_is_found(tmp_path: Path) -> None:
    calls, problems = processes.sweep("planted", tmp_path, patience=10.0)
    ends = [problem.split("\n")[0] for problem in problems if "status" in problem]
    # A sanitizer reports a signal and ends the process itself.
    crashed = "faulty.crash(): status " + ("1" if processes.SANITIZED else "-11")
    left = "faulty.leave_an_error()"
    # To a debug interpreter this too is the end.
    fatal = [f"{left}: status -6"] if DEBUG_INTERPRETER else []
    assert ends == [*fatal, crashed, "faulty.end_by_abort(): status -6"]
    assert "faulty.hang(): hangs" in problems
    assert any(problem.startswith(left) for problem in problems)
    assert calls == 7
