#!/usr/bin/env python3
"""Makes sequences of calls for as long as it is told, and shows the shortest that goes wrong.

    sequences.py [--seconds N] [--seed N]

Prints what is wrong, and at the end how many sequences there were.
"""

import argparse
import os
import sys
import time
from typing import Any, List, Tuple, Type

import host_machine
from hypothesis import HealthCheck, Phase, seed, settings
from hypothesis.stateful import RuleBasedStateMachine, run_state_machine_as_test

STEPS = 50


def options(sequences: int, shrink: bool) -> settings:
    """Without a time limit for a step, and without a memory of former runs."""
    return settings(
        max_examples=sequences,
        stateful_step_count=STEPS,
        deadline=None,
        database=None,
        phases=[Phase.generate, *[Phase.shrink] * shrink],
        report_multiple_bugs=False,
        suppress_health_check=list(HealthCheck),
    )


def counting(machine: Type[RuleBasedStateMachine]) -> Any:
    """The machine, with a count of how many have been made of it."""

    # A base that is only known at run time.
    class Counting(machine):  # type: ignore[misc, valid-type]
        made = 0

        def __init__(self) -> None:
            Counting.made += 1
            super().__init__()

    Counting.__name__ = Counting.__qualname__ = machine.__name__
    return Counting


def run(
    machine: Type[RuleBasedStateMachine], number: int, sequences: int, shrink: bool = True
) -> Tuple[int, List[str]]:
    """Run so many sequences, which the number chooses; how many there were, and what is wrong."""
    counted = seed(number)(counting(machine))
    try:
        # Hypothesis has no types for this one.
        run_state_machine_as_test(  # type: ignore[no-untyped-call]
            counted, settings=options(sequences, shrink)
        )
    except Exception as error:
        return counted.made, [told(error)]
    return counted.made, []


def told(error: Exception) -> str:
    """The sequence that goes wrong, without what is looked at after each step, and the reason."""
    lines = [line for note in getattr(error, "__notes__", []) for line in note.splitlines()]
    shown = [line for line in lines if not line.startswith("state.the_")]
    return "\n".join([*shown, f"{type(error).__name__}: {error}"])


def main() -> int:
    """Run sequences of one seed after the other."""
    parser = argparse.ArgumentParser()
    parser.add_argument("--seconds", type=float, default=60.0)
    parser.add_argument("--seed", type=int, default=int(time.time()))
    given = parser.parse_args()
    os.environ.pop("SIMHOST_STATE", None)
    end, total, number = time.monotonic() + given.seconds, 0, given.seed
    wrong: List[str] = []
    while not wrong and (number == given.seed or time.monotonic() < end):
        made, wrong = run(host_machine.HostMachine, number, 50)
        total += made
        number += 1
    for text in wrong:
        print(f"seed {number - 1}", text, sep="\n")
    print(total)
    return 0


if __name__ == "__main__":
    sys.exit(main())
