"""The site, built once for all tests, and the modules that make its reference."""

import os
import subprocess
import sys
from pathlib import Path
from typing import Dict

import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ["BUILD_DIR"])
sys.path[:0] = [str(ROOT / "docs"), str(ROOT / "docs/_ext"), str(ROOT / "tests/surface")]
# At the end, for the package of the classes that lies there is not built.
sys.path.append(str(ROOT / "python"))

import check_links  # noqa: E402  (after the path is set)
from catalogue import Catalogue  # noqa: E402  (likewise)


def build(source: Path, folder: Path) -> "subprocess.CompletedProcess[str]":
    """Builds pages as ./dev docs does, into `html` in a folder."""
    command = [
        "/usr/bin/python3",
        *("-m", "sphinx", "-W", "--keep-going", "-n", "-q", "-c", str(ROOT / "docs")),
        *("-d", str(folder / "doctrees"), str(source), str(folder / "html")),
    ]
    return subprocess.run(command, capture_output=True, text=True)


@pytest.fixture(scope="session")
def site(tmp_path_factory: pytest.TempPathFactory) -> Dict[str, check_links.Page]:
    """The pages by their paths in the site; a build that warns is an error."""
    folder = tmp_path_factory.mktemp("docs")
    done = build(ROOT / "docs", folder)
    assert done.returncode == 0, done.stdout + done.stderr
    assert done.stderr == ""
    return check_links.read(folder / "html")


@pytest.fixture(scope="session")
def catalogue() -> Catalogue:
    return Catalogue(ROOT, BUILD)
