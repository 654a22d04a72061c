"""What the module and the simulated libraries show to others is what was agreed on.

The layout of records is held to its table by tests/layout.
"""

import re
import subprocess
from pathlib import Path
from typing import List

import _libvswitch as vs
import processes
import pytest

BASELINE = processes.HERE / "baseline"
FILES = {
    "_libvswitch": Path(vs.__file__),
    "libvswitch": processes.BUILD / "simhost" / "libvswitch.so",
    "libnebPublic": processes.BUILD / "simhost" / "libnebPublic.so",
}

# What a sanitizer adds to everything that it instruments, if it is not there anyway.
ADDED = re.compile(r"needs lib(asan|ubsan|m|stdc\+\+)\.so\.\d+|function __(asan|ubsan|odr_asan)\w+")

_DYNAMIC = {"SONAME": "soname", "NEEDED": "needs", "RUNPATH": "path", "RPATH": "old path"}


def _output(*command: str) -> str:
    return subprocess.run(command, capture_output=True, text=True, check=True).stdout


def shown(file: Path) -> List[str]:
    """What a library exports, needs and searches, in the words of the baseline."""
    lines = []
    for tag, value in re.findall(r"\((\w+)\) .*?\[(.*)\]", _output("readelf", "-dW", str(file))):
        if tag in _DYNAMIC:
            lines.append(f"{_DYNAMIC[tag]} {value}")
    for line in _output("nm", "-D", "--defined-only", str(file)).splitlines():
        _, kind, name = line.split()
        lines.append(f"{'function' if kind in 'TWi' else 'variable'} {name.split('@')[0]}")
    return sorted(lines)


def compared(lines: List[str]) -> str:
    """Lines of either side as one text, without what the way of building decides."""
    if processes.SANITIZED:
        lines = [line for line in lines if not ADDED.fullmatch(line)]
    return "\n".join(lines)


def agreed(name: str) -> List[str]:
    """The lines of a baseline, without its comments."""
    text = (BASELINE / f"{name}.txt").read_text(encoding="ascii")
    return sorted(line for line in text.splitlines() if line and not line.startswith("#"))


@pytest.mark.parametrize("name", FILES)
def test_a_library_shows_what_was_agreed_on(name: str) -> None:
    assert compared(shown(FILES[name])) == compared(agreed(name))


def test_what_is_planted_is_found() -> None:
    """A library with other contents differs, and the difference names them."""
    (faulty,) = (processes.BUILD / "tests" / "python").glob("faulty.*.so")
    difference = set(shown(faulty)) ^ set(agreed("_libvswitch"))
    assert {"function PyInit_faulty", "needs libvswitch.so", "variable exceptionMsg"} <= difference
