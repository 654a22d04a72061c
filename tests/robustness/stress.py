#!/usr/bin/env python3
"""Runs everything that looks for crashes, hangs and leaks for as long as it is told, and reports.

    stress.py [--minutes N] [--seed N] [--no-frames]

First what has an end: every batch of the sweep, then a million calls of every kind and a million
traps of each call, fewer in less than twenty minutes. What has none shares the time that is left:
fuzzers, real frames at random switches, sequences, replays of such, clones of random hosts, killed
processes, hosts that share a switch and random pairs of values.
"""

import argparse
import re
import subprocess
import sys
import tempfile
import threading
import time
from functools import partial
from pathlib import Path
from typing import Callable, Iterator, List, NamedTuple, Tuple

import fuzzing
import processes
import test_repeat
import test_sweep

MILLION = 1_000_000
WHOLE = 20
"""Minutes in which a million calls of every kind are no large part."""

ROUNDS = 20
"""Of killed processes, before one looks at the time."""

SHARES = {
    "fuzzing": 0.35,
    "frames": 0.05,
    "sequences": 0.1,
    "replays": 0.1,
    "clones": 0.05,
    "kills": 0.1,
    "fabric": 0.05,
    "pairs": 0.2,
}
"""Of the time that what has an end leaves."""

Outcome = Tuple[int, List[str]]
"""How much was done, and what was wrong."""


class Part(NamedTuple):
    """Something that runs until it is done, or until its time is over."""

    name: str
    unit: str
    run: Callable[[float], Outcome]
    """With the seconds that it has; only what has no end asks for them."""
    share: float = 0.0


class Result(NamedTuple):
    """What became of a part."""

    part: Part
    done: int
    wrong: List[str]


def program(name: str, *arguments: str) -> Outcome:
    """Run one of the programs over the recording host."""
    return printed(processes.run(str(processes.HERE / name), *arguments))


def program_of(place: str) -> Outcome:
    """Run a program of tests/ that has an end."""
    command = [sys.executable, str(processes.TESTS / place)]
    return printed(subprocess.run(command, capture_output=True, text=True, check=False))


def by_chance(place: str, seed: int, seconds: float) -> Outcome:
    """Run a program of tests/ on what chance makes, in a process of its own: the sweeps are of the
    module without classes, which some of them load."""
    command = [sys.executable, str(processes.TESTS / place)]
    options = [f"--seed={seed}", f"--seconds={max(1, int(seconds))}"]
    return printed(
        subprocess.run([*command, *options], capture_output=True, text=True, check=False)
    )


def printed(done: "subprocess.CompletedProcess[str]") -> Outcome:
    """What a program says that prints what is wrong and, last, how much it did."""
    lines = done.stdout.splitlines()
    if done.returncode != 0 or not lines:
        return 0, [f"status {done.returncode}: {done.stdout[-500:]} {done.stderr[-2000:]}"]
    return int(lines[-1]), ["\n".join(lines[:-1])] if lines[:-1] else []


def killed(seconds: float) -> Outcome:
    """Kill processes that write a state file, and look for what they had completed."""
    test = processes.BUILD / "tests" / "simhost" / "simhost_processes_test"
    command = [str(test), "--gtest_filter=*AKilledOneLosesNothing*", f"--gtest_repeat={ROUNDS}"]
    end, rounds = time.monotonic() + seconds, 0
    while rounds == 0 or time.monotonic() < end:
        done = subprocess.run(command, capture_output=True, text=True, check=False)
        rounds += ROUNDS
        if done.returncode != 0 or done.stdout.count("[  PASSED  ] 1 test.") != ROUNDS:
            return rounds, [done.stdout[-2000:] + done.stderr[-500:]]
    return rounds, []


def demonstrated(output: str) -> Outcome:
    """What the demo of a fabric showed: who reached whom, and what became of changes."""
    joined, parted, _, *others = re.findall(r"(\d+) received", output)
    wrong = [] if (joined, parted, *others) == ("3", "0", "3", "3", "3") else ["pings"]
    for shown in (
        "two    nic0  guest-1  nic1",
        "nic0 down, nic1 up",
        "connected at: three",
        "the change is made, and not in force on two after 1 s",
        "it has lost the majority of its cluster",
        "rack/guest-1/forbids: forged_transmits -> absent\n# in force on one, three, two",
    ):
        wrong += [shown] if shown not in output else []
    return 1, [f"not shown: {', '.join(wrong)}: {output}"] if wrong else []


def demo() -> Outcome:
    """Run the demo of a fabric."""
    command = [sys.executable, str(processes.TESTS / "simhostd" / "fabric_demo.py")]
    done = subprocess.run(command, capture_output=True, text=True, check=False)
    if done.returncode:
        return 0, [f"status {done.returncode}: {done.stdout[-500:]} {done.stderr[-2000:]}"]
    return demonstrated(done.stdout)


def fuzzed(name: str, seed: int, seconds: float) -> Outcome:
    corpus = fuzzing.BUILD / "corpus" / name
    inputs, wrong = fuzzing.run(name, corpus, seed, f"-max_total_time={max(1, int(seconds))}")
    return inputs, wrong


def whole(run: Callable[..., Outcome], *arguments: object) -> Callable[[float], Outcome]:
    """Something that has an end."""
    return lambda _: run(*arguments)


def parts(seed: int, minutes: float, folder: Path, frames: bool = True) -> Iterator[Part]:
    """All of them, what has an end first."""
    for batch in test_sweep.BATCHES:
        if batch != "pairs":
            yield Part(f"sweep, {batch}", "calls", whole(processes.sweep, batch, folder))
    calls = str(int(MILLION * min(1.0, minutes / WHOLE)))
    for kind in test_repeat.KINDS:
        repeat = whole(program, "repeat.py", "memory", kind, calls)
        yield Part(f"memory, {kind}", "calls", repeat)
    yield Part("traps, in turns", "calls", whole(program, "traps.py", "in-turns", calls))
    yield Part("traps, in a row", "calls", whole(program, "traps.py", "in-a-row", calls))
    if frames:
        yield Part("demo of a fabric", "demos", whole(demo))
        yield Part("what was never tried", "things", whole(program_of, "classes/untried.py"))
    share = SHARES["fuzzing"] / (len(fuzzing.NAMES) + 1)
    states = partial(by_chance, "fuzz/state_files.py", seed)
    yield Part("damaged states", "states", states, share)
    for name in fuzzing.NAMES:
        yield Part(f"fuzzing, {name}", "inputs", partial(fuzzed, name, seed), share)
    of_frames = [
        ("frames of any content", "frames"),
        ("frames of groups", "groups"),
        ("frames past limits", "added_up"),
    ]
    for what, name in of_frames:
        sent = partial(by_chance, f"simhost/openvswitch/{name}_by_chance.py", seed)
        yield Part(what, "frames", sent, SHARES["frames"] / len(of_frames))
    sequences = partial(by_chance, "sequences/sequences.py", seed)
    yield Part("sequences of calls", "sequences", sequences, SHARES["sequences"])
    replays = [
        ("sequences", "sequences", "recorded_sequences"),
        ("clones", "hosts", "recorded_clones"),
    ]
    replays += [("on frames", "hosts", "replayed_on_frames")] * frames
    for what, unit, name in replays:
        replay = partial(by_chance, f"recordings/{name}.py", seed)
        yield Part(f"replays, {what}", unit, replay, SHARES["replays"] / len(replays))
    if frames:
        shared = partial(by_chance, "simhostd/fabric_by_chance.py", seed)
        yield Part("shared switches", "calls", shared, SHARES["fabric"])
    clones = partial(by_chance, "vswitch/drawn_documents.py", seed)
    yield Part("clones of hosts", "documents", clones, SHARES["clones"])
    yield Part("killed processes", "rounds", killed, SHARES["kills"])
    yield Part(
        "random pairs",
        "calls",
        lambda seconds: processes.sweep("pairs", folder, seed, seconds),
        SHARES["pairs"] + (0 if frames else SHARES["fabric"]),
    )


def _clock(seconds: float) -> str:
    """Minutes and seconds."""
    return f"{int(seconds) // 60}:{int(seconds) % 60:02}"


class Progress:
    """Says what is under way: in one line of a terminal, else in a line for each part."""

    def __init__(self, minutes: float) -> None:
        self._start = time.monotonic()
        self._minutes = minutes
        self._text = ""
        self._over = threading.Event()
        self._redraw = threading.Thread(target=self._draw_again, daemon=True)

    def __enter__(self) -> "Progress":
        if sys.stdout.isatty():
            self._redraw.start()
        return self

    def __exit__(self, *unused: object) -> None:
        self._over.set()
        if self._redraw.is_alive():
            self._redraw.join()
            print("\r\033[K", end="", flush=True)

    def show(self, text: str) -> None:
        self._text = text
        if not sys.stdout.isatty():
            print(self._line(), flush=True)

    def _line(self) -> str:
        passed = _clock(time.monotonic() - self._start)
        return f"{passed:>6} of {_clock(self._minutes * 60)}  {self._text}"

    def _draw_again(self) -> None:
        while not self._over.wait(0.5):
            print(f"\r\033[K{self._line()}", end="", flush=True)


def run_all(seed: int, minutes: float, frames: bool, progress: Progress) -> List[Result]:
    results: List[Result] = []
    end = time.monotonic() + minutes * 60
    with tempfile.TemporaryDirectory() as folder:
        shares = 0.0
        for part in parts(seed, minutes, Path(folder), frames):
            wrong = sum(len(result.wrong) for result in results)
            progress.show(part.name + (f" ({wrong} wrong so far)" if wrong else ""))
            if part.share:
                # What one takes too much or leaves, those after it share.
                shares = shares or 1.0
                seconds = max(1.0, (end - time.monotonic()) * part.share / shares)
                shares -= part.share
            else:
                seconds = 0.0
            results.append(Result(part, *part.run(seconds)))
    return results


def report(results: List[Result]) -> str:
    """A line for each part, and all that was wrong."""
    lines = [f"{'':24}{'done':>26}  wrong"]
    for part, done, wrong in results:
        count = f"{done:,} {part.unit}"
        lines.append(f"{part.name:24}{count:>26}  {len(wrong) or '-'}")
    for part, _, wrong in results:
        for text in wrong:
            lines += ["", f"{part.name}:", *(f"  {line}" for line in text.splitlines())]
    return "\n".join(lines)


def main() -> int:
    """Run all parts; the status is 1 if anything is wrong."""
    parser = argparse.ArgumentParser()
    parser.add_argument("--minutes", type=float, default=float(WHOLE))
    parser.add_argument("--seed", type=int, default=int(time.time()))
    parser.add_argument("--no-frames", action="store_false", dest="frames")
    options = parser.parse_args()
    print(f"seed {options.seed}, {options.minutes:g} minutes", flush=True)
    with Progress(options.minutes) as progress:
        results = run_all(options.seed, options.minutes, options.frames, progress)
    print(report(results))
    problems = sum(len(result.wrong) for result in results)
    print(f"\n{problems} wrong, seed {options.seed}")
    return 1 if problems else 0


if __name__ == "__main__":
    sys.exit(main())
