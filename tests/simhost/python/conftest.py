"""Every test has a host of its own."""

import sys
from pathlib import Path
from typing import Callable, List, Tuple

import pytest
from programs import EXAMPLES
from simhost import SharedHost

from simulated_host import Host

Outcome = Tuple[int, List[str], str]


@pytest.fixture
def host(tmp_path: Path) -> Host:
    return Host(tmp_path)


@pytest.fixture
def run(host: Host) -> Callable[[str], str]:
    """Runs code in a process of its own on the test's host; what it writes."""
    return host.python


@pytest.fixture
def example(shared_host: SharedHost) -> Callable[..., Outcome]:
    """Runs a program of examples/: its status, the lines that it prints, its errors."""

    def run(name: str, *arguments: str) -> Outcome:
        done = shared_host.run([sys.executable, EXAMPLES / f"{name}.py", *arguments])
        return done.returncode, done.stdout.splitlines(), done.stderr

    return run
