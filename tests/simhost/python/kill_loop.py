#!/usr/bin/env python3
"""Kills a process that changes a host, again and again, and looks at what is left of the host.

usage: kill_loop.py [--minutes N | --rounds N] [--seed N]     (20 rounds unless given)

After each kill the state must open, be sound, have every change in it whose call had returned, and
nothing of a change by half: it must be what the same changes make of a host in memory. Run it with
BUILD_DIR in the environment, and build/python in PYTHONPATH.
"""

import argparse
import json
import os
import random
import signal
import sqlite3
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Counter, Dict, Optional

CHURN = Path(__file__).with_name("churn.py")
# A new host now and then: what is compared with is made from the beginning each time.
ROUNDS_OF_A_HOST = 12


def churn(state: Optional[Path], *words: str) -> "subprocess.Popen[str]":
    clean = {name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")}
    if state:
        clean["SIMHOST_STATE"] = str(state)
    return subprocess.Popen(
        [sys.executable, str(CHURN), *words], env=clean, stdout=subprocess.PIPE, text=True
    )


def answer(state: Optional[Path], *words: str) -> str:
    process = churn(state, *words)
    output, _ = process.communicate()
    if process.returncode != 0:
        raise AssertionError(f"churn.py {' '.join(words)} ended with {process.returncode}")
    return output


def replayed(seed: str, before: int, after: int) -> Any:
    """What changes make of a host in memory: before the last ones and after them."""
    return json.loads(answer(None, "replay", seed, str(before), str(after)))


def killed_run(state: Path, seed: str, first: int, chance: random.Random) -> int:
    """Lets changes be made for a while, and kills; the number of the first not known to be made."""
    with churn(state, "run", seed, str(first)) as process:
        assert process.stdout
        told = process.stdout.readline()
        # By time and not by number, so that the kill comes at any moment of a call.
        time.sleep(chance.random() * 0.25)
        process.send_signal(signal.SIGKILL)
        told += process.stdout.read()
    assert process.returncode == -signal.SIGKILL, "it ended before it was killed"
    return first + told.count("\n")


class Hosts:
    """One host after the other, each killed some times."""

    def __init__(self, folder: Path, seed: int) -> None:
        self._folder = folder
        self._chance = random.Random(seed)
        self._seed = ""
        self._next = 0
        self.rounds = 0
        self.changes = 0
        self.in_flight = 0
        self.succeeded: Counter[str] = Counter()
        self._of_this_host: Dict[str, int] = {}

    @property
    def state(self) -> Path:
        return self._folder / f"host-{self._seed}.db"

    def round(self) -> None:
        """One kill, and a look at what is left. Raises AssertionError."""
        if self.rounds % ROUNDS_OF_A_HOST == 0:
            self._succeed_to()
        self.rounds += 1
        first = self._next
        done = killed_run(self.state, self._seed, first, self._chance)
        found = answer(self.state, "show").strip()
        told = replayed(self._seed, done, done + 1)
        where = f"seed {self._seed}, killed after change {done - 1}"
        assert found in told["digests"], f"{where}: the state is neither before nor after the next"
        with sqlite3.connect(self.state) as database:
            sound = database.execute("PRAGMA integrity_check").fetchone()[0]
        assert sound == "ok", f"{where}: {sound}"
        made_it = found == told["digests"][1] and found != told["digests"][0]
        self.in_flight += made_it
        self._next = done + made_it
        self.changes += self._next - first
        self._of_this_host = told["succeeded"]

    def all_succeeded(self) -> Counter[str]:
        """How often each kind of change was made with success on all hosts."""
        return self.succeeded + Counter(self._of_this_host)

    def _succeed_to(self) -> None:
        self.succeeded = self.all_succeeded()
        self._of_this_host = {}
        self._seed, self._next = str(self._chance.randrange(1 << 32)), 0


def main() -> None:
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawTextHelpFormatter
    )
    parser.add_argument("--minutes", type=float, help="go on for so long")
    parser.add_argument("--rounds", type=int, default=20, help="kills, unless --minutes is given")
    parser.add_argument("--seed", type=int, default=random.randrange(1 << 32))
    given = parser.parse_args()
    print(f"seed {given.seed}", flush=True)
    end = time.monotonic() + (given.minutes or 0) * 60
    with tempfile.TemporaryDirectory() as folder:
        hosts = Hosts(Path(folder), given.seed)
        while hosts.rounds < given.rounds if given.minutes is None else time.monotonic() < end:
            hosts.round()
    kinds = sum(1 for count in hosts.all_succeeded().values() if count)
    print(
        f"{hosts.rounds} kills, {hosts.changes} changes of {kinds} kinds, all there; "
        f"{hosts.in_flight} more were made and could not be told any more"
    )


if __name__ == "__main__":
    main()
