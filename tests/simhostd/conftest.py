"""A lab for each test: a switch with three ports for clients and two uplinks."""

from pathlib import Path
from typing import Iterator

import pytest

from frame_lab import ONE_SWITCH, Lab
from lasting_open_vswitch import LastingOpenVSwitch


@pytest.fixture
def idle(tmp_path: Path) -> Iterator[Lab]:
    """Without a daemon."""
    with Lab(tmp_path, ONE_SWITCH) as lab:
        yield lab


@pytest.fixture
def lab(idle: Lab) -> Lab:
    idle.start()
    return idle


@pytest.fixture
def clock(idle: Lab) -> Iterator[LastingOpenVSwitch]:
    """Of the Open vSwitch of a lab with a daemon: it can be stopped, and put forward."""
    with LastingOpenVSwitch(idle.host, idle.run_folder(), clock_may_stand=True) as open_vswitch:
        idle.start(open_vswitch.where)
        yield open_vswitch
