"""The programs of examples/ are run on the host that the plug-in gives a test."""

import sys
from typing import Callable, List, Tuple

import pytest
from programs import EXAMPLES
from simhost import SharedHost

Outcome = Tuple[int, List[str], str]


@pytest.fixture
def example(shared_host: SharedHost) -> Callable[..., Outcome]:
    """Runs a program of examples/: its status, the lines that it prints, its errors."""

    def run(name: str, *arguments: str) -> Outcome:
        done = shared_host.run([sys.executable, EXAMPLES / f"{name}.py", *arguments])
        return done.returncode, done.stdout.splitlines(), done.stderr

    return run
