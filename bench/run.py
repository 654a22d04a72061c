#!/usr/bin/env python3
"""Compares the module's cost with that of its peers: run.py [--quick] BUILD.

BUILD is a build folder with the module and the peers. The tables go to standard output, and
results.json and calls.svg to bench/ in the build folder. README.md says what the figures mean.
"""

import argparse
import json
import operator
import os
import platform
import shutil
import statistics
import sys
from pathlib import Path
from typing import Any, Dict, Iterator, List, Mapping

import calls
import modules
import report
import targets
from figures import EXPECTED, FIGURES, FORMS, MEASURED, PEERS
from progress import Progress


def make_twin(build: Path) -> None:
    """Copy the module, to be measured as a peer: how far the two differ is noise."""
    twin = build / "bench" / "twin"
    shutil.rmtree(twin, ignore_errors=True)
    twin.mkdir(parents=True)
    (module,) = (build / "python").glob("_libvswitch.*.so")
    shutil.copy(module, twin)


Results = Dict[str, Dict[str, Dict[str, Any]]]
"""For each form, peer and figure, the peer's results."""


def ask_all(build: Path, core: int) -> Results:
    """Ask every peer for every figure."""
    results: Results = {form: {} for form in FORMS}
    for peer in PEERS:
        with calls.Worker(peer, build, core, seed=0) as worker:
            for form, peers in FORMS.items():
                if peer in peers:
                    results[form][peer] = {figure: worker.ask(form, figure) for figure in FIGURES}
    return results


def wrong(results: Results) -> Iterator[str]:
    """The results that differ from what is expected, a line each."""
    for form, peers in results.items():
        for peer, figures in peers.items():
            for figure, answer in figures.items():
                if answer != EXPECTED[figure]:
                    yield f"{peer}, {form}, {figure}: {answer!r}"


def middle_of(rows: Mapping[str, Mapping[str, List[float]]]) -> Dict[str, Dict[str, float]]:
    """The median of what was measured, for each figure and peer."""
    return {
        figure: {peer: statistics.median(values) for peer, values in row.items()}
        for figure, row in rows.items()
    }


def ratios_to(
    rows: Mapping[str, Mapping[str, List[float]]], measured: str = "ours"
) -> Dict[str, Dict[str, float]]:
    """Our value to that of each peer: the median of the ratios of what stood side by side."""
    return {
        figure: {
            peer: statistics.median(map(operator.truediv, row[measured], values))
            for peer, values in row.items()
            if peer != measured
        }
        for figure, row in rows.items()
    }


def verdicts(
    table: str, ratios: Mapping[str, Mapping[str, float]], goals: Mapping[str, Mapping[str, float]]
) -> List[Dict[str, Any]]:
    """How each target fares."""
    return [
        {
            "table": table,
            "figure": figure,
            "peer": peer,
            "ratio": ratios[figure][peer],
            "target": target,
            "met": targets.met(ratios[figure][peer], target),
        }
        for figure, peers in goals.items()
        for peer, target in peers.items()
    ]


def machine() -> Dict[str, str]:
    """What was measured on."""
    with open("/proc/cpuinfo", encoding="utf-8") as information:
        names = [line.split(":")[1].strip() for line in information if "model name" in line]
    return {
        "processor": names[0] if names else platform.machine(),
        "system": platform.platform(),
        "python": platform.python_version(),
    }


TABLES = {
    "functions": "As functions",
    "own": "In the peer's own form",
    "classes": "Classes",
}


def main() -> None:
    """Measure, and report."""
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("build", type=Path, help="the build folder")
    parser.add_argument("--quick", action="store_true", help="a short run, whose figures are rough")
    parser.add_argument("--core", type=int, help="the processor's core to stay on")
    arguments = parser.parse_args()
    build = arguments.build.resolve()
    core = arguments.core if arguments.core is not None else max(os.sched_getaffinity(0))
    os.sched_setaffinity(0, {core})
    settings: Dict[str, Any] = (
        {"processes": 1, "rounds": 2, "milliseconds": 0.5}
        if arguments.quick
        else {"processes": 9, "rounds": 9, "milliseconds": 4}
    )

    make_twin(build)
    returned = ask_all(build, core)
    if mistakes := list(wrong(returned)):
        sys.exit("bench: these peers return something else:\n" + "\n".join(mistakes))
    progress = Progress()
    times = calls.measure(build, core, **settings, progress=progress)
    middle = {form: middle_of(rows) for form, rows in times.items()}
    ratios = {form: ratios_to(rows, MEASURED[form]) for form, rows in times.items()}
    judged = verdicts("functions", ratios["functions"], targets.CALLS)
    judged += verdicts("classes", ratios["classes"], targets.CLASSES)
    whole: modules.Values = {}
    if not arguments.quick:
        whole = modules.measure(build, processes=21, compilations=5, progress=progress)
        judged += verdicts("modules", ratios_to(whole), targets.MODULES)
    progress.clear()

    print("\n".join(report.legend()), end="\n\n")
    for form, title in TABLES.items():
        goals = {"functions": targets.CALLS, "classes": targets.CLASSES}.get(form, {})
        ours = MEASURED[form]
        lines = report.table(title, "ns", FIGURES, middle[form], ratios[form], goals, ours)
        print("\n".join(lines), end="\n\n")
    if whole:
        titles, goals = modules.TITLES, targets.MODULES
        lines = report.table("Whole modules", "", titles, middle_of(whole), ratios_to(whole), goals)
        print("\n".join(lines), end="\n\n")
    missed = [verdict for verdict in judged if not verdict["met"]]
    print(f"{len(judged) - len(missed)} of {len(judged)} targets met")

    results = {
        "machine": machine(),
        "settings": {**settings, "core": core, "quick": arguments.quick},
        "calls": {"results": returned, "times": times, "medians": middle, "ratios": ratios},
        "modules": {"values": whole, "medians": middle_of(whole), "ratios": ratios_to(whole)},
        "targets": judged,
    }
    (build / "bench" / "results.json").write_text(json.dumps(results, indent=1), encoding="utf-8")
    (build / "bench" / "calls.svg").write_text(report.picture(FIGURES, middle), encoding="utf-8")


if __name__ == "__main__":
    try:
        main()
    except calls.PeerMissing as error:
        sys.exit(f"bench: {error}")
