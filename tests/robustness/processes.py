"""Processes over the recording host, and a watch over those that may crash or hang."""

import os
import subprocess
import sys
import time
from pathlib import Path
from typing import Dict, List, Optional, Tuple

import notes

HERE = Path(__file__).parent
BUILD = Path(os.environ["BUILD_DIR"])
TESTS = HERE.parent
SANITIZED = "libasan" in os.environ.get("LD_PRELOAD", "")

# How many crashes of one sweep are worth telling apart.
MOST_PROBLEMS = 10


def environment(**more: str) -> Dict[str, str]:
    """The environment in which Python finds the recording host and the vocabulary of all suites."""
    folders = [os.environ["PYTHONPATH"], *map(str, (HERE, TESTS / "contract", TESTS / "module"))]
    host = str(BUILD / "tests" / "recording_host")
    return {
        **os.environ,
        "LD_LIBRARY_PATH": host,
        "PYTHONPATH": os.pathsep.join(folders),
        "PYTHONHASHSEED": "0",
        **more,
    }


def run(*command: str, **more: str) -> "subprocess.CompletedProcess[str]":
    """Run Python to its end."""
    return subprocess.run(
        [sys.executable, *command],
        env=environment(**more),
        capture_output=True,
        text=True,
        check=False,
    )


def watch(command: List[str], note: Path, patience: float) -> Tuple[Optional[int], str]:
    """Run Python until it ends or makes one call for longer than `patience` seconds.

    Returns its status, None if it had to be killed, and what it said last.
    """
    with subprocess.Popen(
        [sys.executable, *command],
        env=environment(),
        stdout=subprocess.DEVNULL,
        stderr=subprocess.PIPE,
        text=True,
        errors="replace",
    ) as child:
        last, since = -1, time.monotonic()
        while child.poll() is None:
            time.sleep(0.05)
            number, _ = notes.read(note)
            if number != last:
                last, since = number, time.monotonic()
            elif time.monotonic() - since > patience:
                child.kill()
                child.wait()
                return None, ""
        assert child.stderr is not None
        return child.returncode, child.stderr.read()[-2000:]


def sweep(
    batch: str, folder: Path, seed: int = 0, seconds: float = 1.0, patience: float = 60.0
) -> Tuple[int, List[str]]:
    """Sweep a batch; a crash or a hang is noted, and the rest goes on after it.

    Returns how many calls there were, and what was wrong.
    """
    note, report = folder / f"{batch}.note", folder / f"{batch}.report"
    notes.create(note)
    report.write_text("")
    problems: List[str] = []
    after = 0
    while len(problems) < MOST_PROBLEMS:
        options = ["--seed", str(seed), "--seconds", str(seconds), "--after", str(after)]
        command = [str(HERE / "sweep.py"), batch, str(note), str(report), *options]
        status, said = watch(command, note, patience)
        number, text = notes.read(note)
        if status == 0:
            after = number
            break
        problems.append(f"{text}: hangs" if status is None else f"{text}: status {status}\n{said}")
        if number <= after:
            break
        after = number
    return after, problems + report.read_text(encoding="utf-8").splitlines()
