"""What was measured of hosts that share a switch, and what follows from it.

A sample is what all hosts cost at one size. The figures of a host are means over hosts that are
alike; what one host or port more costs is the difference of two samples, divided."""

from statistics import median
from typing import Dict, Iterator, List, Mapping, NamedTuple, Sequence, Tuple

from costs import Cost

PROGRAMS = ("simhostd", "ovs-vswitchd", "ovsdb-server")


class Spent(NamedTuple):
    """By one program of a host, or by the databases."""

    idle: Cost
    seconds: float  # of idleness
    changing: Cost  # by all changes


class Sample(NamedTuple):
    """At one size."""

    configured: int
    connected: Sequence[int]  # for each host
    callers: Sequence[float]  # milliseconds, one for each change
    everywhere: Sequence[float]
    hosts: Sequence[Mapping[str, Spent]]  # by program
    databases: Spent  # all of them
    disk: float  # MB

    @property
    def size(self) -> int:
        return len(self.hosts)


Figures = Dict[str, float]

MEMORY = "memory of a host, MB"
IDLE = "idle, ms of a processor in a second"
WAKEUPS = "idle, wake-ups in a second"
CHANGING = "processor's time of a change, ms"
CALLER = "a change at the caller, ms"
EVERYWHERE = "a change on the last host, ms"
DATABASE_MEMORY = "memory of the databases, MB"
DATABASE_IDLE = "databases: idle, ms of a processor in a second"
DATABASE_CHANGING = "databases: processor's time of a change, ms"
DISK = "files of the databases, MB"


def part(program: str, unit: str) -> str:
    """Of a figure."""
    return f"  {program}, {unit}"


def _sum(costs: Sequence[Cost]) -> Cost:
    total = Cost()
    for one in costs:
        total = total + one
    return total


def of_hosts(sample: Sample, numbers: Sequence[int]) -> Figures:
    """Of one of these hosts, in the mean."""
    changes, count = max(len(sample.callers), 1), len(numbers)
    memory, rest = {}, {}
    for program in PROGRAMS:
        costs = [sample.hosts[number][program] for number in numbers]
        idle = _sum([one.idle for one in costs])
        memory[part(program, "MB")] = idle.memory / count
        rest[part(program, "ms")] = idle.milliseconds / costs[0].seconds / count
    some = [spent for number in numbers for spent in sample.hosts[number].values()]
    idle, changing = _sum([one.idle for one in some]), _sum([one.changing for one in some])
    seconds = some[0].seconds * count
    return {
        MEMORY: idle.memory / count,
        **memory,
        IDLE: idle.milliseconds / seconds,
        **rest,
        WAKEUPS: idle.wakeups / seconds,
        CHANGING: changing.milliseconds / count / changes,
    }


def of_all(sample: Sample) -> Figures:
    """Of what there is once."""
    idle, changes = sample.databases.idle, max(len(sample.callers), 1)
    return {
        CALLER: median(sample.callers),
        EVERYWHERE: median(sample.everywhere),
        DATABASE_MEMORY: idle.memory,
        DATABASE_IDLE: idle.milliseconds / sample.databases.seconds,
        DATABASE_CHANGING: sample.databases.changing.milliseconds / changes,
        DISK: sample.disk,
    }


def _memory(sample: Sample) -> float:
    return sample.size * of_hosts(sample, range(sample.size))[MEMORY]


def _per(what: str, unit: str, values: Sequence[float], sizes: Sequence[int]) -> str:
    (least, most), (few, many) = values, sizes
    each = (most - least) / (many - few)
    return f"{what}: ({most:.1f} - {least:.1f}) / ({many:,} - {few:,}) = {each:.3g} {unit}"


def derived(samples: Sequence[Sample]) -> Iterator[str]:
    """What one more of something costs: differences of what was measured, with the arithmetic."""
    empty = [one for one in samples if one.configured == 0]
    idle = [one for one in samples if one.configured and not any(one.connected)]
    busy = [one for one in samples if any(one.connected[:1])]
    if empty and idle:
        pair = [empty[0], idle[0]]
        sizes = [one.configured for one in pair]
        hosts = [of_hosts(one, [0])[MEMORY] * 1024 for one in pair]
        yield _per("a configured port on a host, memory", "kB", hosts, sizes)
        databases = [one.databases.idle.memory * 1024 for one in pair]
        yield _per("a configured port in all databases, memory", "kB", databases, sizes)
    if len(idle) > 1:
        pair = idle[-2:]
        sizes = [one.size for one in pair]
        yield _per("a host more, memory of hosts", "MB", [_memory(one) for one in pair], sizes)
        databases = [one.databases.idle.memory for one in pair]
        yield _per("a host more, memory of databases", "MB", databases, sizes)
    if len(busy) > 1 and busy[-1].connected[0] > busy[0].connected[0]:
        last = next(one for one in busy if one.connected[0] == busy[-1].connected[0])
        pair = [busy[0], last]
        sizes = [one.connected[0] for one in pair]
        first = [of_hosts(one, [0]) for one in pair]
        memory = [one[MEMORY] * 1024 for one in first]
        yield _per("a connected port, memory of its host", "kB", memory, sizes)
        spent = [one[IDLE] * 1000 for one in first]
        yield _per("a connected port, idle", "us of a processor in a second", spent, sizes)


def curves(samples: Sequence[Sample]) -> Tuple[Dict[int, Figures], Dict[int, Figures]]:
    """Over the number of hosts, none of which has a connected port; and, of the first host, over
    the number of those that it has, with as many hosts as there are."""
    over_hosts: Dict[int, Figures] = {}
    over_ports: Dict[int, Figures] = {}
    idle: List[Sample] = [one for one in samples if one.configured and not any(one.connected)]
    for one in idle:
        over_hosts[one.size] = {**of_hosts(one, range(one.size)), **of_all(one)}
    for one in idle[-1:] + [one for one in samples if any(one.connected[:1])]:
        # Later ones differ in other hosts' ports.
        over_ports.setdefault(one.connected[0], {**of_hosts(one, [0]), **of_all(one)})
    return over_hosts, over_ports
