#!/usr/bin/env python3
"""Records sequences of calls that chance makes, and replays them, for as long as it is told.

    recorded_sequences.py [--seconds N] [--seed N]

Prints what differs, and at the end how many sequences there were.
"""

import sys
import tempfile
from pathlib import Path
from typing import Any, Callable, Dict, List, Tuple, Type

import libvswitch as vs

sys.path.append(str(Path(__file__).parents[1] / "sequences"))

import host_machine  # noqa: E402  (after the path is set)
import seeds  # noqa: E402
import sequences  # noqa: E402
from recordings import record_made  # noqa: E402
from saying import say  # noqa: E402
from simhost import Host  # noqa: E402
from steering import SteeredHost, differences, replayed  # noqa: E402


class RecordedMachine(host_machine.HostMachine):
    """On a host of which the trace says what is done to it."""

    def __init__(self) -> None:
        super().__init__()
        say("begin")
        # It is a host to whoever uses it.
        self.host = SteeredHost(self.host)  # type: ignore[assignment]

    def _described(self, alias: str) -> Dict[str, Any]:
        # What the host has chosen is to be in the trace, too.
        vs.DVS_SwitchId(vs.DVSState_SwitchFindByAlias(alias))
        return super()._described(alias)


def make(seed: int, count: int, machine: Type[host_machine.HostMachine] = RecordedMachine) -> None:
    """Makes so many sequences."""
    _, wrong = sequences.run(machine, seed, count, shrink=False)
    if wrong:
        raise RuntimeError(wrong[0])


def begun() -> Host:
    return Host(host_machine.SCENARIO, Path())


def found_in(trace: Path, begin: Callable[[], Host] = begun) -> Tuple[int, List[str]]:
    """Replays what was recorded; how many sequences there were, and what differed."""
    # What comes before the first one is nothing.
    _, *reports = replayed(trace, begin)
    return len(reports), [one for report in reports for one in differences(report)]


def run(seed: int, count: int = 20) -> Tuple[int, List[str]]:
    """Records so many sequences, and replays them."""
    with tempfile.TemporaryDirectory() as folder:
        trace = Path(folder, "trace.jsonl")
        record_made("recorded_sequences.make", seed, count, trace)
        return found_in(trace)


if __name__ == "__main__":
    sys.exit(seeds.main(run))
