#!/usr/bin/env python3
"""A process that measures one peer, told what and when by lines of JSON on its standard input.

    worker.py PEER CORE SEED FOLDER...

The modules of the peer are in the FOLDERs, the process stays on CORE, and SEED
decides which of the varied values each evaluation takes. It replies to each line
with a line of JSON:

    {"form": W, "figure": F}               the peer's value for the figure
    {"form": W, "figure": F, "loops": N}   the nanoseconds of one evaluation, from N loops

Time is the processor's time of this thread: a process that has to wait for the core is not slower.
"""

import gc
import itertools
import json
import os
import random
import re
import sys
from pathlib import Path
from time import thread_time_ns
from typing import Any, Callable, Dict, List

from figures import FORMS, Figure, Varied, figures_of

UNROLLED = 50
"""Evaluations in the body of a loop, so that the loop itself is next to nothing."""

Loop = Callable[[int], int]


def compiled(figure: Figure, order: random.Random) -> Loop:
    """A function that evaluates a figure UNROLLED times in each of so many loops; nanoseconds.

    All names are arguments of the function, which makes them its fast locals.
    """
    constants = {n: value for n, value in figure.names.items() if not isinstance(value, Varied)}
    varied = {n: value.values for n, value in figure.names.items() if isinstance(value, Varied)}
    for name, values in varied.items():
        constants.update({f"{name}_{number}": value for number, value in enumerate(values)})
    body = ""
    for _ in range(UNROLLED):
        line = figure.expression
        for name, values in varied.items():
            line = re.sub(rf"\b{name}\b", f"{name}_{order.randrange(len(values))}", line)
        body += f"        {line}\n"
    parameters = ", ".join(["_loops", "_clock", "_repeat", *constants])
    source = (
        f"def loop({parameters}):\n"
        "    started = _clock()\n"
        "    for _ in _repeat(None, _loops):\n"
        f"{body}"
        "    return _clock() - started\n"
    )
    namespace: Dict[str, Any] = {}
    exec(source, namespace)
    loop, values = namespace["loop"], tuple(constants.values())
    return lambda loops: int(loop(loops, thread_time_ns, itertools.repeat, *values))


def shuffled_memory() -> List[object]:
    """Objects of many sizes, to be kept: what is allocated after them lies elsewhere each time.

    Whether the processor takes two addresses for one depends on their low bits. Without this, every
    process of a peer would have the same luck.
    """
    kept: List[object] = []
    for size in range(16, 1024, 16):
        made = [bytes(size) for _ in range(random.randrange(64))]
        kept += random.sample(made, len(made) // 2)
    return kept


EMPTY = compiled(Figure("pass", {}, lambda: None), random.Random(0))


def hosts() -> Dict[str, str]:
    """The files of the host's libraries that this process has loaded, by name."""
    with open("/proc/self/maps", encoding="utf-8") as maps:
        paths = {line.rstrip("\n").split(maxsplit=5)[5] for line in maps if "/" in line}
    names = ("libvswitch.so", "libnebPublic.so")
    return {Path(path).name: path for path in paths if Path(path).name in names}


def main() -> None:
    """Serve one peer until the input ends."""
    key, core, seed, *folders = sys.argv[1:]
    os.sched_setaffinity(0, {int(core)})
    sys.path[:0] = folders
    memory = shuffled_memory()
    forms = [form for form, peers in FORMS.items() if key in peers]
    figures = {
        (form, name): figure for form in forms for name, figure in figures_of(key, form).items()
    }
    loops = {which: compiled(figure, random.Random(seed)) for which, figure in figures.items()}
    print(json.dumps(hosts()), flush=True)
    gc.collect()
    gc.disable()
    for line in sys.stdin:
        request = json.loads(line)
        which = request["form"], request["figure"]
        if "loops" in request:
            count = request["loops"]
            answer = (loops[which](count) - EMPTY(count)) / (count * UNROLLED)
        else:
            answer = figures[which].observe()
        print(json.dumps(answer), flush=True)
    memory.clear()


if __name__ == "__main__":
    main()
