"""What chance makes, of one seed after the other: for programs that look for as long as they are
told, and for tests that take one seed."""

import argparse
import os
import time
from typing import Any, Callable, List, Tuple

from hypothesis import HealthCheck, Phase, settings

Outcome = Tuple[int, List[str]]
"""How much was made, and what is wrong."""


def options(examples: int, shrink: bool = True, **more: Any) -> settings:
    """Without a time limit, and without a memory of former runs."""
    return settings(
        max_examples=examples,
        deadline=None,
        database=None,
        phases=[Phase.generate, *[Phase.shrink] * shrink],
        suppress_health_check=list(HealthCheck),
        **more,
    )


def main(run: Callable[[int], Outcome]) -> int:
    """Runs seeds until one is wrong or the time is over; prints what is wrong, and last how much
    there was."""
    parser = argparse.ArgumentParser()
    parser.add_argument("--seconds", type=float, default=60.0)
    parser.add_argument("--seed", type=int, default=int(time.time()))
    asked = parser.parse_args()
    os.environ.pop("SIMHOST_STATE", None)
    end, total, number = time.monotonic() + asked.seconds, 0, asked.seed
    wrong: List[str] = []
    while not wrong and (number == asked.seed or time.monotonic() < end):
        made, wrong = run(number)
        total += made
        number += 1
    for text in wrong:
        print(f"seed {number - 1}", text, sep="\n")
    print(total)
    return 0
