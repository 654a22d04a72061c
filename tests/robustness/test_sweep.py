"""Wrong and extreme values in every argument: an exception or a result, and nothing else."""

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
SEED = 20
SECONDS = 8.0


@pytest.mark.parametrize("batch", BATCHES)
def test_no_value_crashes_hangs_or_leaves_an_error(batch: str, tmp_path: Path) -> None:
    print("seed", SEED)
    calls, problems = processes.sweep(batch, tmp_path, SEED, SECONDS)
    assert problems == []
    assert calls > BATCHES[batch]


def test_what_is_planted_is_found(tmp_path: Path) -> None:
    calls, problems = processes.sweep("planted", tmp_path, patience=2.0)
    found = [problem.split("\n")[0] for problem in problems]
    # A sanitizer reports a signal and ends the process itself.
    signals = ("-11", "-6") if not processes.SANITIZED else ("1", "-6")
    assert found[:3] == [
        f"faulty.crash(): status {signals[0]}",
        "faulty.hang(): hangs",
        f"faulty.give_up(): status {signals[1]}",
    ]
    assert problems[3:] and all(
        text.startswith("faulty.leave_an_error(): <") for text in problems[3:]
    )
    assert calls == 7
