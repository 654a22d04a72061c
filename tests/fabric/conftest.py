"""The client of what hosts share is tried on the databases and hosts of the tests of frames."""

import sys
from pathlib import Path
from typing import Iterator

import pytest

sys.path.append(str(Path(__file__).parents[1] / "simhostd"))

from fabric_lab import Databases, FabricLab  # noqa: E402  (after the path is set)
from operating import populate  # noqa: E402
from vswitch.fabric import Fabric  # noqa: E402


@pytest.fixture
def databases(tmp_path: Path) -> Iterator[Databases]:
    with FabricLab(tmp_path) as lab:
        populate(lab.databases)
        yield lab.databases


@pytest.fixture
def fabric(databases: Databases) -> Iterator[Fabric]:
    with Fabric(databases.local_addresses) as fabric:
        yield fabric
