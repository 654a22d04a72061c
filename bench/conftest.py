"""Where the tests of the comparison find what was built."""

import os
import sys
from pathlib import Path

import pytest

for _folder in "surface", "simhostd":
    sys.path.append(str(Path(__file__).resolve().parents[1] / "tests" / _folder))


@pytest.fixture(name="build", scope="session")
def fixture_build() -> Path:
    """Return the build folder, which holds the module and the peers."""
    build = Path(os.environ["BUILD_DIR"]).resolve()
    assert (build / "bench" / "peers").is_dir(), "the peers are not built: see ./dev bench"
    return build
