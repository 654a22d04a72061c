#!/usr/bin/env python3
"""What the recorder adds to a call, and how long a trace takes to read.

    recorder.py [--quick]

The host is the null host, which LD_LIBRARY_PATH names. Each call is made in processes with and
without the recorder, which take turns; of each the fastest round counts. What is added to a call of
texts and numbers may be at most 3 microseconds, and a million calls are to be read within 20 s, in
memory that does not grow with them.
"""

import os
import subprocess
import sys
import tempfile
from pathlib import Path
from typing import Dict

from targets import NOISE
from vswitch.recording import recorded

MOST_MICROSECONDS, MOST_SECONDS, MOST_GROWTH = 3.0, 20.0, 8192
SCALAR = ("a number", "two texts")
CALLS = {
    "a number": "flat.VSDVS_SetMTU('vswitch0', 9000)",
    "two texts": "flat.VSDVS_DvPortIDToPortID('vswitch0', 'web-1')",
    "a record": "flat.VSQEX_GetVSInfo('vswitch0', record)",
    "a list": "flat.VSQEX_GetUplinks('vswitch0')",
}

# In processor time, for the write of a line is a part of it, and other work is not.
MEASURING = """
import itertools, sys, time
import _libvswitch as flat
record = flat.new_VSInfo()
best = float("inf")
for _ in range({rounds}):
    started = time.process_time_ns()
    for _ in itertools.repeat(None, {loops}):
        {call}
    best = min(best, time.process_time_ns() - started)
flat.delete_VSInfo(record)
print(best / {loops} / 1e3)
"""

READING = """
import resource, sys, time
from vswitch.trace import Trace
started = time.process_time()
count, at_first = 0, 0
with Trace(sys.argv[1]) as trace:
    for call in trace:
        count += 1
        if count == 1000:
            at_first = resource.getrusage(resource.RUSAGE_SELF).ru_maxrss
grown = resource.getrusage(resource.RUSAGE_SELF).ru_maxrss - at_first
print(count, time.process_time() - started, grown)
"""


def run(program: str, *words: str, environment: Dict[str, str]) -> str:
    command = [sys.executable, "-c", program, *words]
    done = subprocess.run(command, env=environment, stdout=subprocess.PIPE, check=True, text=True)
    return done.stdout


def added(trace: Path, call: str, rounds: int, loops: int, turns: int) -> Dict[str, float]:
    """Microseconds of a call, without the recorder and with it."""
    program = MEASURING.format(call=call, rounds=rounds, loops=loops)
    with recorded(trace, ["bench"]) as environment:
        environments = {"without": dict(os.environ), "with": environment}
        best = dict.fromkeys(environments, float("inf"))
        for _ in range(turns):
            for name, one in environments.items():
                best[name] = min(best[name], float(run(program, environment=one)))
    return best


def main() -> int:
    is_quick = "--quick" in sys.argv[1:]
    rounds, loops, turns = (2, 2_000, 1) if is_quick else (9, 20_000, 5)
    missed = []
    with tempfile.TemporaryDirectory() as folder:
        trace = Path(folder, "trace.jsonl")
        print(f"{'microseconds of a call':24}{'without':>10}{'recorded':>10}{'added':>8}")
        for name, call in CALLS.items():
            best = added(trace, call, rounds, loops, turns)
            more = best["with"] - best["without"]
            print(f"{name:24}{best['without']:>10.2f}{best['with']:>10.2f}{more:>8.2f}")
            if name in SCALAR and more > MOST_MICROSECONDS * (1 + NOISE):
                missed.append(name)
        wanted = 10_000 if is_quick else 1_000_000
        program = MEASURING.format(call=CALLS["a number"], rounds=1, loops=wanted)
        with recorded(trace, ["bench"]) as environment:
            run(program, environment=environment)
        count, seconds, grown = run(READING, str(trace), environment=dict(os.environ)).split()
        size = trace.stat().st_size / 1e6
        told = f"{int(count):,} calls of {size:.0f} MB read in {float(seconds):.1f} s"
        print(f"{told}, {grown} KiB more than after the first thousand")
        if int(count) != wanted:
            raise SystemExit(f"{count} calls are in a trace of {wanted}")
        if float(seconds) > MOST_SECONDS * (1 + NOISE) or int(grown) > MOST_GROWTH:
            missed.append("reading")
    print(f"missed by: {', '.join(missed) or 'none'}")
    return 1 if missed and not is_quick else 0


if __name__ == "__main__":
    sys.exit(main())
