"""What running processes cost: their memory, processor time, and how often they wake up."""

from pathlib import Path
from typing import Dict, Iterable, List, NamedTuple

_PROC = Path("/proc")


class Cost(NamedTuple):
    """Of some processes, from one moment to another."""

    memory: float = 0.0
    """MB at the second one. What several processes share each of them has a part of."""
    milliseconds: float = 0.0
    """Of a processor."""
    wakeups: int = 0

    def __add__(self, other: object) -> "Cost":
        assert isinstance(other, Cost)
        return Cost(
            self.memory + other.memory,
            self.milliseconds + other.milliseconds,
            self.wakeups + other.wakeups,
        )


class Reading(NamedTuple):
    """Of one thread, since its start."""

    nanoseconds: int
    wakeups: int


Readings = Dict[Path, Reading]
"""By thread: some end while others go on."""


def reading(processes: Iterable[int]) -> Readings:
    """Of all threads that there are."""
    threads = {}
    for process in processes:
        for thread in (_PROC / str(process) / "task").iterdir():
            try:
                nanoseconds = (thread / "schedstat").read_text(encoding="ascii").split()[0]
                wakeups = _field(thread / "status", "voluntary_ctxt_switches")
            except (FileNotFoundError, ProcessLookupError):
                continue  # it has ended meanwhile
            threads[thread] = Reading(int(nanoseconds), int(wakeups))
    return threads


def memory(processes: Iterable[int]) -> float:
    """MB, each page divided by the number of processes that have it."""
    return sum(int(_field(_PROC / str(one) / "smaps_rollup", "Pss")) for one in processes) / 1024


def cost(processes: List[int], before: Readings) -> Cost:
    """Since an earlier reading of the same processes; without what threads did that have ended."""
    nanoseconds = wakeups = 0
    for thread, now in reading(processes).items():
        then = before.get(thread, Reading(0, 0))
        nanoseconds += now.nanoseconds - then.nanoseconds
        wakeups += now.wakeups - then.wakeups
    return Cost(memory(processes), nanoseconds / 1e6, wakeups)


def available_memory() -> float:
    """MB that the machine can give to programs."""
    return int(_field(_PROC / "meminfo", "MemAvailable")) / 1024


def _field(file: Path, name: str) -> str:
    """The number that has this name."""
    for line in file.read_text(encoding="ascii").splitlines():
        found, _, value = line.partition(":")
        if found == name:
            return value.split()[0]
    raise KeyError(f"{file} tells no {name}")
