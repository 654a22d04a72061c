"""What the tests of recordings share."""

from pathlib import Path

import pytest
from hostless import without_host


@pytest.fixture(name="alone", scope="session")
def fixture_alone(tmp_path_factory: pytest.TempPathFactory) -> Path:
    """A folder with the module, and no host."""
    return without_host(tmp_path_factory.mktemp("alone"))
