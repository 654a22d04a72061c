#!/usr/bin/env python3
"""What it costs that many hosts share a switch, and how that grows with hosts and ports.

    fabric.py [--quick] [--hosts N] [--busy N] [--ports N] [--configured N] [--minutes N]

BUILD_DIR names what was built. Each host is a network namespace with a simhostd and an Open vSwitch
of its own; three servers have what the hosts share. Prints tables, and leaves fabric.json and
fabric.svg in bench/ of the build folder. What the machine cannot bear ends the run in order: what
was measured until then is told. It takes root's rights or user namespaces, and leaves nothing.
"""

import argparse
import json
import os
import signal
import subprocess
import sys
import tempfile
import time
from pathlib import Path
from types import FrameType
from typing import Callable, Dict, Iterator, List, NamedTuple, NoReturn, Optional

from costs import available_memory, cost, reading
from fabric_figures import Sample, Spent
from fabric_report import drawing, tables
from many_hosts import DATABASES, ManyHosts
from progress import Progress
from simhost._namespaces import CommandFailed

# What a machine that has no more room makes of any step.
_FAILURES = (
    AssertionError,
    CommandFailed,
    OSError,
    RuntimeError,
    ValueError,
    subprocess.SubprocessError,
)

# MB that stay free for everything else on the machine.
_RESERVE = 2_048


class Effort(NamedTuple):
    """How much is measured."""

    hosts: int
    busy: int  # hosts with connected ports
    ports: int  # connected at each of them
    configured: int
    minutes: float  # after which nothing more is begun
    idle: float  # seconds
    changes: int
    missed: int  # ports changed while a host is away


FULL = Effort(16, 4, 1_000, 10_000, 30, 10, 7, 1_000)
QUICK = Effort(2, 1, 10, 20, 5, 0.3, 3, 10)


class Stopped(Exception):
    """The machine does not bear more; the text says what was left out, and why."""


def _doubled(first: int, last: int, factor: int) -> Iterator[int]:
    """Sizes up to the last one."""
    size = first
    while size < last:
        yield size
        size *= factor
    yield last


class Run:
    """The measurement, whose samples are there however it ends."""

    def __init__(self, effort: Effort, say: Callable[[str], None]) -> None:
        self._effort = effort
        self._say = say
        self._deadline = time.monotonic() + effort.minutes * 60
        self.samples: List[Sample] = []
        self.caught_up: Optional[float] = None

    def measure(self) -> None:
        """Raises Stopped."""
        effort = self._effort
        with tempfile.TemporaryDirectory() as folder:
            with ManyHosts(Path(folder), effort.configured, effort.ports) as many:
                try:
                    self._measure(many)
                except _FAILURES as error:
                    raise Stopped(f"{self._said}: {error}") from error

    def _measure(self, many: ManyHosts) -> None:
        effort = self._effort
        self._begin("the first host")
        many.add_host()
        self._take_sample(many)
        for done in many.configure(effort.configured):
            self._begin(f"{done:,} ports configured")
        for hosts in _doubled(1, effort.hosts, 2):
            while len(many.hosts) < hosts:
                self._begin(f"host {len(many.hosts) + 1}")
                many.add_host()
            self._take_sample(many)
        for ports in _doubled(min(10, effort.ports), effort.ports, 10):
            self._connect(many, 0, ports)
            self._take_sample(many)
        for host in range(1, effort.busy):
            self._connect(many, host, effort.ports)
        if effort.busy > 1:
            self._take_sample(many)
        if effort.hosts > 1:
            self._begin("a host that was away")
            self.caught_up = many.catch_up(effort.missed)

    def _connect(self, many: ManyHosts, host: int, ports: int) -> None:
        for done in many.connect(host, ports):
            self._begin(f"host {host + 1}: {done:,} ports connected")

    def _begin(self, what: str) -> None:
        self._said = what
        self._say(what)
        if time.monotonic() > self._deadline:
            raise Stopped(f"{what}: {self._effort.minutes:g} minutes are over")
        if available_memory() < _RESERVE:
            raise Stopped(f"{what}: less than {_RESERVE:,} MB of memory are free")

    def _take_sample(self, many: ManyHosts) -> None:
        size = f"{len(many.hosts)} hosts, {sum(many.connected.values()):,} ports connected"
        programs = many.programs()
        self._begin(f"{size}: idle")
        idle = {
            (place, program): reading(processes)
            for place, running in programs.items()
            for program, processes in running.items()
        }
        time.sleep(self._effort.idle)
        rested = {at: cost(programs[at[0]][at[1]], since) for at, since in idle.items()}
        self._begin(f"{size}: changing")
        before = {at: reading(programs[at[0]][at[1]]) for at in idle}
        changes = many.changes(self._effort.changes) if many.configured else []
        spent: Dict[str, Dict[str, Spent]] = {}
        for place, program in idle:
            at = place, program
            changing = cost(programs[place][program], before[at])
            spent.setdefault(place, {})[program] = Spent(rested[at], self._effort.idle, changing)
        self.samples.append(
            Sample(
                many.configured,
                [many.connected.get(host.name, 0) for host in many.hosts],
                [change.caller for change in changes],
                [change.everywhere for change in changes],
                [spent[host.name] for host in many.hosts],
                spent[DATABASES]["ovsdb-server"],
                many.disk(),
            )
        )


def report(run: Run, effort: Effort, stopped: str, build: Path) -> None:
    lines = list(tables(run.samples)) if run.samples else []
    if run.caught_up is not None:
        lines.append(
            f"a host that was away while {effort.missed:,} ports changed: all in force"
            f" {run.caught_up:.2f} s after its start"
        )
    if stopped:
        lines.append(f"stopped at {stopped}")
    print("\n".join(lines), flush=True)
    folder = build / "bench"
    folder.mkdir(exist_ok=True)
    results = {
        "effort": effort._asdict(),
        "stopped": stopped,
        "caught_up": run.caught_up,
        "report": lines,
        "samples": [_as_json(sample) for sample in run.samples],
    }
    (folder / "fabric.json").write_text(json.dumps(results, indent=2) + "\n", encoding="utf-8")
    (folder / "fabric.svg").write_text(drawing(run.samples), encoding="utf-8")
    print(f"\n{folder / 'fabric.json'}\n{folder / 'fabric.svg'}")


def _as_json(value: object) -> object:
    """Named tuples as objects."""
    if isinstance(value, tuple) and hasattr(value, "_asdict"):
        return {name: _as_json(one) for name, one in value._asdict().items()}
    if isinstance(value, dict):
        return {name: _as_json(one) for name, one in value.items()}
    if isinstance(value, (list, tuple)):
        return [_as_json(one) for one in value]
    return value


def _end(number: int, frame: Optional[FrameType]) -> NoReturn:
    del frame
    sys.exit(128 + number)


def parser() -> argparse.ArgumentParser:
    made = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter
    )
    made.add_argument("--quick", action="store_true", help="seconds, and rough figures")
    for name, said in {
        "hosts": "so many hosts at last",
        "busy": "so many of them have connected ports",
        "ports": "so many each",
        "configured": "so many ports are configured, on all hosts",
        "minutes": "after which nothing more is begun",
    }.items():
        usual = f"{getattr(FULL, name):,}, --quick {getattr(QUICK, name):,}"
        number = float if name == "minutes" else int
        made.add_argument(f"--{name}", type=number, metavar="N", help=f"{said} ({usual})")
    return made


def effort_of(given: argparse.Namespace) -> Effort:
    """Raises ValueError for one that cannot be."""
    usual = QUICK if given.quick else FULL
    named = {
        name: getattr(given, name)
        for name in ("hosts", "busy", "ports", "configured", "minutes")
        if getattr(given, name) is not None
    }
    effort = usual._replace(**named)
    if min(effort.hosts, effort.busy, effort.ports) < 1 or effort.busy > effort.hosts:
        raise ValueError("at least one host and one port, and no more busy hosts than hosts")
    if effort.configured < effort.busy * effort.ports:
        raise ValueError("ports that are connected are configured, too: --configured is too small")
    return effort


def main() -> int:
    words = parser()
    try:
        effort = effort_of(words.parse_args())
    except ValueError as error:
        words.error(str(error))
    signal.signal(signal.SIGTERM, _end)
    progress = Progress()
    run, stopped = Run(effort, progress), ""
    try:
        run.measure()
    except Stopped as why:
        stopped = str(why)
    finally:
        progress.clear()
    report(run, effort, stopped, Path(os.environ["BUILD_DIR"]))
    return 1 if stopped else 0


if __name__ == "__main__":
    sys.exit(main())
