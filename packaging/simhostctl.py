"""Runs the simhostctl that a wheel carries beside the simulated host's libraries."""

import os
import sys
from pathlib import Path


def main() -> None:
    program = str(Path(__file__).resolve().with_name("lib") / "simhostctl")
    # Labs are a program of the package that this is a part of.
    os.environ.setdefault("SIMHOST_PYTHON", sys.executable)
    os.execv(program, [program, *sys.argv[1:]])
