#!/usr/bin/env python3
"""Rows of frames of addresses for which there may be no room, most of which Open vSwitch adds up
later.

    added_up_by_chance.py [--seconds N] [--seed N]

Holds what flows count, and where addresses are known, to the rules for as long as it is told;
prints what differs, and at the end how many frames there were.
"""

import random
import sys
import tempfile
import time
from collections import Counter as Counts
from pathlib import Path as FilePath
from typing import Any, Callable, Counter, Dict, List, Mapping, Optional, Tuple

sys.path.insert(0, str(FilePath(__file__).parents[2] / "support"))

import seeds  # noqa: E402  (after the path is set)

from bench import Bench  # noqa: E402
from compiler import Compiler  # noqa: E402
from frames import Frame  # noqa: E402
from learning_rules import BROADCAST, COUNTED, PORTS, Learner, Place  # noqa: E402
from open_vswitch import PATIENCE, OpenVSwitch  # noqa: E402

UNKNOWN = {"02:00:00:00:bb:01", "02:00:00:00:bb:02"}

Change = Callable[[str], Optional[str]]


class Path(Bench):
    """Frames that pass the data path of a bridge."""

    def __init__(self, open_vswitch: OpenVSwitch, compiler: Compiler) -> None:
        super().__init__(open_vswitch, compiler, "path", len(PORTS))
        self._path = open_vswitch
        self._passed = 0
        # It adds up when it is told to: by itself, it may do so too late to know of a move.
        self.ask("time/stop")

    def begin(
        self, ports: Mapping[int, Mapping[str, Any]], limit: int, change: Change = str
    ) -> None:
        said = [{"id": f"p{port}", **settings} for port, settings in ports.items()]
        switch = {"ports": said, "mac_learning": {"limit": limit}}
        self._path.limit_learned("path", limit)
        self.load(switch, [{"port": port["id"]} for port in said], change)
        self._path.forget("path")

    def add_up(self) -> None:
        # What is asked for may be the end of what began before the last frame.
        for _ in range(2):
            self.ask("revalidator/wait")

    def pass_by(self, port: int, source: str, frames: int, to: str = BROADCAST) -> None:
        """What Open vSwitch is told to receive, it does not receive at once."""
        sent = Frame(to, source).to_bytes().hex()
        for _ in range(frames):
            self.ask("netdev-dummy/receive", f"path{port}", sent)
        self._passed += frames
        deadline = time.monotonic() + PATIENCE
        while (passed := self._path.frames_received()) < self._passed:
            assert time.monotonic() < deadline, f"{passed} of {self._passed}"
        assert passed == self._passed

    def known_places(self) -> Dict[str, int]:
        self.add_up()
        return self._path.known_places("path")

    def counted(self) -> Counter[Place]:
        self.add_up()
        found: Counter[Place] = Counts()
        for cookie, frames in self._path.counted("path").items():
            if cookie >> 56 in COUNTED:
                found[cookie >> 56, cookie & 0xFFFFFFFF] = frames
        return found


def drawn_port(chance: random.Random) -> Dict[str, Any]:
    learns = {
        "learning": True,
        "flooding": True,
        "limit": chance.choice((1, 2, 3, 9)),
        "limit_policy": chance.choice(("drop", "allow")),
    }
    forbids = ["forged_transmits"] if chance.random() < 0.3 else []
    return {"mac_learning": learns, "forbids": forbids}


def run_limits(path: Path, number: int, change: Change = str) -> seeds.Outcome:
    """How many frames counted as what became of them, whatever that was; and what was wrong."""
    chance = random.Random(number)
    ports = {port: drawn_port(chance) for port in PORTS}
    limit = chance.choice((2, 3, 100))
    path.begin(ports, limit, change)
    rules = Learner(ports, limit)
    before = path.counted()
    sent: List[Tuple[int, str, int]] = []
    for _ in range(10):
        port, frames = chance.choice(PORTS), chance.choice((1, 1, 2, 5))
        source = f"02:00:00:00:aa:{chance.randrange(1, 6):02x}"
        if rules.is_elsewhere_first(source, port):
            continue
        # An address that moves may leave room to others, of which all frames are to be known.
        moves = rules.moves(source, port)
        if moves:
            path.add_up()
        path.pass_by(port, source, frames)
        rules.send(port, source, frames)
        sent.append((port, source, frames))
        if moves or chance.random() < 0.4:
            path.add_up()
    found = path.counted() - before
    wrong = f"{found} instead of {rules.counted}: {ports}, {limit} of the switch, {sent}"
    return sum(frames for _, _, frames in sent), [] if found == rules.counted else [wrong]


def run_moves(path: Path, number: int, change: Change = str) -> seeds.Outcome:
    """Likewise of addresses that move, which nothing that came before moves back: however soon they
    do, and to however many addresses they sent before."""
    chance = random.Random(number)
    ports: Dict[int, Dict[str, Any]] = {
        port: {"mac_learning": {"learning": True, "flooding": True, "limit": 3}} for port in PORTS
    }
    path.begin(ports, 3, change)
    rules = Learner({port: {**said, "forbids": []} for port, said in ports.items()}, 3)
    before = path.counted()
    sources = [f"02:00:00:00:aa:{index:02x}" for index in range(3)]
    passed = 0
    for _ in range(8):
        port, source = chance.choice(PORTS), chance.choice(sources)
        for receiver in chance.sample([BROADCAST, *sorted(UNKNOWN)], 2):
            frames = chance.choice((1, 2, 4))
            path.pass_by(port, source, frames, receiver)
            rules.send(port, source, frames, receiver)
            passed += frames
        if chance.random() < 0.5 and (places := path.known_places()) != rules.places:
            return passed, [f"known at {places} instead of {rules.places}"]
    found = path.counted() - before
    return passed, [] if found == rules.counted else [f"{found} instead of {rules.counted}"]


def main() -> int:
    """Send frames of one seed after the other."""
    with tempfile.TemporaryDirectory() as folder:
        compiler, open_vswitch = Compiler(), OpenVSwitch(FilePath(folder))
        try:
            path = Path(open_vswitch, compiler)

            def of_seed(number: int) -> seeds.Outcome:
                limited, wrong = run_limits(path, number)
                moved, also_wrong = run_moves(path, number)
                return limited + moved, wrong + also_wrong

            return seeds.main(of_seed)
        finally:
            open_vswitch.close()
            compiler.close()


if __name__ == "__main__":
    sys.exit(main())
