"""Every test has a host of its own."""

from pathlib import Path
from typing import Callable

import pytest

from simulated_host import Host


@pytest.fixture
def host(tmp_path: Path) -> Host:
    return Host(tmp_path)


@pytest.fixture
def run(host: Host) -> Callable[[str], str]:
    """Runs code in a process of its own on the test's host; what it writes."""
    return host.python
