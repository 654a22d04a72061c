#!/usr/bin/env python3
"""Replays what was recorded on a host without frames on one whose frames simhostd moves: examples,
the tour, and sequences and hosts that chance makes, for as long as it is told.

    replayed_on_frames.py [--seconds N] [--seed N]

Prints what differs and is not in other_plane.yaml, and at the end how many hosts there were. Takes
Open vSwitch, and root or namespaces of users.
"""

import os
import sys
import tempfile
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Tuple

import yaml

sys.path.append(str(Path(__file__).parents[1] / "support"))

import corpus  # noqa: E402  (after the path is set)
import seeds  # noqa: E402
import recorded_sequences  # noqa: E402,F401  (which knows where the next is)
import host_machine  # noqa: E402
from recordings import record_made  # noqa: E402
from simhost import SimulatedHost  # noqa: E402
from steering import differences, replayed, steer  # noqa: E402
from vswitch import allowing  # noqa: E402
from vswitch.replay import Report  # noqa: E402
from wired_host import PresentWiredHost, WiredHost, Wiring, lab_in  # noqa: E402

ALLOWED = Path(__file__).with_name("other_plane.yaml")
COUNT = 20
"""Of sequences, and of hosts, between two looks at the time."""

Found = Tuple[int, List[str]]
"""How many hosts there were, and what differed on them."""


class OnFrames:
    """The host of this process, which has made no call yet, and all that leads to it."""

    def __init__(self, folder: Path) -> None:
        self.allowances = allowing.read(yaml.safe_load(ALLOWED.read_text(encoding="utf-8")))
        self.lab = lab_in(folder)
        self._folder = folder
        self._present = PresentWiredHost()

    def __enter__(self) -> "OnFrames":
        self.lab.start()
        self._wiring = Wiring(self.lab)
        return self

    def __exit__(self, *error: object) -> None:
        self._wiring.close()
        self.lab.__exit__(*error)

    @property
    def connected(self) -> int:
        """How many ports had a device, all in all."""
        return self._wiring.connected

    def begin(self, scenario: Optional[Dict[str, Any]] = None) -> WiredHost:
        # Read at the first call.
        os.environ["SIMHOST_STATE"] = str(self.lab.state)
        self._present.host = WiredHost(self._wiring, scenario)
        return self._present.host

    def found_in(self, trace: Path, begin: Optional[Callable[..., WiredHost]] = None) -> Found:
        """Replays all of a trace."""
        return _found(self._reports(trace, begin or self.begin))

    def examples(self) -> Found:
        all_: List[Found] = []
        for name in corpus.EXAMPLE:
            trace = self._folder / f"{name}.jsonl"
            corpus.record_example(name, trace)
            all_.append(self.found_in(trace))
        tour = self._folder / "tour.jsonl"
        corpus.record_tour(tour)
        all_.append(self.found_in(tour))
        return _sum(all_)

    def sequences(self, seed: int, count: int) -> Found:
        trace = self._folder / "sequences.jsonl"
        record_made("wired_programs.sequences", seed, count, trace)
        # What comes before the first one is nothing.
        return _found(self._reports(trace, lambda: self.begin(host_machine.SCENARIO))[1:])

    def clones(self, seed: int, count: int) -> Found:
        trace = self._folder / "clones.jsonl"
        record_made("wired_programs.clones", seed, count, trace)
        # Before each there is the host that it is a clone of.
        return _found(self._reports(trace, self.begin)[2::2])

    def _reports(self, trace: Path, begin: Callable[..., WiredHost]) -> List[Report]:
        return list(replayed(trace, begin, _steer, self._present, self.allowances.allows))

    def by_chance(self, seed: int) -> Found:
        return _sum([self.sequences(seed, COUNT), self.clones(seed, COUNT)])


def _steer(host: SimulatedHost, what: str, arguments: List[Any], more: Dict[str, Any]) -> None:
    """As any host is steered; what happens to its wires does so here."""
    assert isinstance(host, WiredHost)
    if what == "simhostctl":
        _control(host, arguments)
    else:
        steer(host, what, arguments, more)


def _control(host: WiredHost, words: List[str]) -> None:
    command, *arguments = words
    if command == "link":
        host.cable(*arguments)
    elif command == "learn":
        switch, mac, *option = arguments
        host.learn(switch, mac, option[1] if option else None)
    elif command == "restart":
        host.restart()
    else:
        # What is counted is not compared, and frames count for themselves.
        assert command == "counter", command


def _found(reports: List[Report]) -> Found:
    return len(reports), [one for report in reports for one in differences(report)]


def _sum(all_: List[Found]) -> Found:
    return sum(count for count, _ in all_), [one for _, found in all_ for one in found]


def main() -> int:
    with tempfile.TemporaryDirectory() as folder, OnFrames(Path(folder)) as frames:
        first = frames.examples()
        wrong = first[1]

        def run(seed: int) -> Found:
            return _sum([frames.by_chance(seed), (0, wrong)])

        return seeds.main(run)


if __name__ == "__main__":
    sys.exit(main())
