#!/usr/bin/env python3
"""Makes sequences of calls for as long as it is told, and shows the shortest that goes wrong.

    sequences.py [--seconds N] [--seed N]

Prints what is wrong, and at the end how many sequences there were.
"""

import sys
from typing import Any, List, Tuple, Type

import host_machine
import seeds
from hypothesis import seed
from hypothesis.stateful import RuleBasedStateMachine, run_state_machine_as_test

STEPS = 50


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
            counted,
            settings=seeds.options(
                sequences, shrink, stateful_step_count=STEPS, report_multiple_bugs=False
            ),
        )
    except Exception as error:
        return counted.made, [told(error)]
    return counted.made, []


def told(error: Exception) -> str:
    """The sequence that goes wrong, without what is looked at after each step, and the reason."""
    lines = [line for note in getattr(error, "__notes__", []) for line in note.splitlines()]
    shown = [line for line in lines if not line.startswith("state.the_")]
    return "\n".join([*shown, f"{type(error).__name__}: {error}"])


if __name__ == "__main__":
    sys.exit(seeds.main(lambda number: run(host_machine.HostMachine, number, 50)))
