"""A lab for each test: a switch with three ports for clients and two uplinks."""

from pathlib import Path
from typing import Iterator

import pytest

from frame_lab import ONE_SWITCH, Lab


@pytest.fixture
def idle(tmp_path: Path) -> Iterator[Lab]:
    """Without a daemon."""
    with Lab(tmp_path, ONE_SWITCH) as lab:
        yield lab


@pytest.fixture
def lab(idle: Lab) -> Lab:
    idle.start()
    return idle
