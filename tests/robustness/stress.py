#!/usr/bin/env python3
"""Runs the robustness programs for as long as it is told, and reports what they find.

    stress.py [--minutes N] [--seed N]

First every batch of the sweep, then a million calls of every kind and a million panics in the same
memory; what is left of the time goes to random pairs of values, a seed after the other.
"""

import argparse
import sys
import tempfile
import time
from pathlib import Path
from typing import Iterator, List, Tuple

import processes
import test_repeat
import test_sweep

MILLION = 1_000_000
SLICE = 60.0

Part = Tuple[str, int, List[str]]
"""What ran, how many calls it made, and what was wrong."""


def program(name: str, *arguments: str) -> Tuple[int, List[str]]:
    """Run one of the programs that print what is wrong and, last, how often they called."""
    done = processes.run(str(processes.HERE / name), *arguments)
    *wrong, count = done.stdout.splitlines() or ["0"]
    if done.returncode != 0:
        return 0, [f"status {done.returncode}: {done.stdout[-500:]} {done.stderr[-2000:]}"]
    return int(count), wrong


def parts(seed: int, end: float, folder: Path) -> Iterator[Part]:
    """Everything once, then pairs until the end."""
    for batch in test_sweep.BATCHES:
        if batch != "pairs":
            calls, wrong = processes.sweep(batch, folder)
            yield f"sweep of {batch}", calls, wrong
    for kind in test_repeat.KINDS:
        calls, wrong = program("repeat.py", "memory", kind, str(MILLION))
        yield f"memory of {kind}", calls, wrong
    calls, wrong = program("panics.py", str(MILLION))
    yield "panics", calls, wrong
    while time.monotonic() < end:
        seconds = min(SLICE, end - time.monotonic())
        calls, wrong = processes.sweep("pairs", folder, seed, seconds)
        yield f"pairs, seed {seed}", calls, wrong
        seed += 1


def main() -> int:
    """Run all parts, a line for each."""
    parser = argparse.ArgumentParser()
    parser.add_argument("--minutes", type=float, default=20.0)
    parser.add_argument("--seed", type=int, default=int(time.time()))
    options = parser.parse_args()
    print(f"seed {options.seed}, {options.minutes:g} minutes", flush=True)
    end = time.monotonic() + options.minutes * 60
    total, problems = 0, 0
    with tempfile.TemporaryDirectory() as folder:
        for name, calls, wrong in parts(options.seed, end, Path(folder)):
            total, problems = total + calls, problems + len(wrong)
            print(f"{name:<24} {calls:>12,} calls  {len(wrong) or 'nothing'} wrong", flush=True)
            for line in wrong:
                print(f"  {line}", flush=True)
    print(f"{total:,} calls, {problems} wrong")
    return 1 if problems else 0


if __name__ == "__main__":
    sys.exit(main())
