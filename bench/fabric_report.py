"""The figures of hosts that share a switch: tables for people, and a picture."""

from typing import Dict, Iterator, List, Mapping, Sequence

from curves import Panel, picture
from fabric_figures import (
    CALLER,
    CHANGING,
    EVERYWHERE,
    IDLE,
    MEMORY,
    PROGRAMS,
    Figures,
    Sample,
    curves,
    derived,
    of_all,
    of_hosts,
    part,
)

Columns = Mapping[int, Figures]


def _table(title: str, columns: Columns) -> Iterator[str]:
    names = list(next(iter(columns.values())))
    width = max(len(name) for name in names)
    yield f"{title:{width}}" + "".join(f"{size:>12,}" for size in columns)
    for name in names:
        yield f"{name:{width}}" + "".join(f"{column[name]:>12,.1f}" for column in columns.values())


def _last(sample: Sample) -> Iterator[str]:
    """Those hosts that have connected ports beside those that have none."""
    kinds: Dict[str, List[int]] = {"with ports": [], "without": []}
    for number, ports in enumerate(sample.connected):
        kinds["with ports" if ports else "without"].append(number)
    columns = {
        f"{len(numbers)} {kind}": of_hosts(sample, numbers)
        for kind, numbers in kinds.items()
        if numbers
    }
    names = list(next(iter(columns.values())))
    width = max(len(name) for name in names)
    ports = max(sample.connected)
    yield f"{sample.size} hosts; {ports:,} connected ports each on those with ports"
    yield " " * width + "".join(f"{title:>16}" for title in columns)
    for name in names:
        yield f"{name:{width}}" + "".join(f"{one[name]:>16,.1f}" for one in columns.values())
    for name, value in of_all(sample).items():
        yield f"{name:{width}}{value:>16,.1f}"


def tables(samples: Sequence[Sample]) -> Iterator[str]:
    """For as much as there is."""
    over_hosts, over_ports = curves(samples)
    if over_hosts:
        configured = next(one.configured for one in samples if one.configured)
        yield from _table(f"hosts, {configured:,} ports, none connected", over_hosts)
    if len(over_ports) > 1:
        yield ""
        yield from _table("connected ports of the first host", over_ports)
    if sum(1 for ports in samples[-1].connected if ports) > 1:
        yield ""
        yield from _last(samples[-1])
    yield ""
    yield from derived(samples)


_CAPTION = (
    "Of one host: memory, and milliseconds of a processor in a second of idleness and for a change"
    " that all hosts follow; and how long that takes."
)
_SHOWN = {
    "MB": (MEMORY, *(part(program, "MB") for program in PROGRAMS)),
    "ms": (IDLE, CHANGING, CALLER, EVERYWHERE),
}


def drawing(samples: Sequence[Sample]) -> str:
    """An SVG picture of the curves. A size of nothing has no place on it."""
    over_hosts, over_ports = curves(samples)
    panels = []
    for title, columns in ("hosts", over_hosts), ("connected ports", over_ports):
        for unit, names in _SHOWN.items():
            rows = {
                name.split(",")[0].strip(): {
                    size: max(figures[name], 0.01) for size, figures in columns.items() if size
                }
                for name in names
            }
            if any(rows.values()):
                panels.append(Panel(f"{unit}, over {title}", unit, rows))
    return picture(_CAPTION, panels)
