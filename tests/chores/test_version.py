"""The version is said once, in VERSION; whatever tells it has it from there."""

import os
import re
import subprocess
import sys
from importlib import metadata
from pathlib import Path

import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ["BUILD_DIR"])
VERSION = (ROOT / "VERSION").read_text(encoding="ascii").strip()


def printed(*command: object) -> str:
    done = subprocess.run(
        [str(word) for word in command], cwd=ROOT, stdout=subprocess.PIPE, encoding="utf-8"
    )
    assert done.returncode == 0
    return done.stdout.strip()


def test_it_is_three_numbers() -> None:
    assert re.fullmatch(r"\d+\.\d+\.\d+", VERSION)


def test_no_other_file_says_it() -> None:
    said = {
        str(file.relative_to(ROOT))
        for top in ROOT.iterdir()
        if not top.name.startswith(("build", "."))
        for file in ([top] if top.is_file() else top.rglob("*"))
        if file.is_file() and "__pycache__" not in file.parts
        if VERSION.encode() in file.read_bytes()
    }
    # The log of changes says what was new in each version.
    assert said <= {"VERSION", "CHANGELOG.md"}


def test_the_log_of_changes_ends_with_it() -> None:
    log = (ROOT / "CHANGELOG.md").read_text(encoding="utf-8")
    released = [
        name for name in re.findall(r"^## (\S+)", log, re.MULTILINE) if name != "Unreleased"
    ]
    assert released[0] == VERSION


def test_the_simulated_host_tells_it() -> None:
    assert printed(BUILD / "simhost/simhostctl", "--version") == f"simhostctl {VERSION}"
    library = BUILD / "simhost/libsimhost.so"
    program = (
        f"import ctypes; host = ctypes.CDLL({str(library)!r});"
        " host.simhost_version.restype = ctypes.c_char_p; print(host.simhost_version().decode())"
    )
    assert printed(sys.executable, "-c", program) == VERSION


@pytest.mark.parametrize("name", ["libvswitch", "simhost"])
def test_python_tools_are_told_it(name: str) -> None:
    (found,) = (
        one
        for one in metadata.distributions(path=[str(BUILD / "python")])
        if one.metadata["Name"] == name
    )
    assert found.version == VERSION


def test_the_wheel_gets_it() -> None:
    assert printed("/usr/bin/python3", "-W", "ignore", "setup.py", "--version") == VERSION
