"""Tools that are recorded and played: programs in processes of their own, on the host that a test
names, or without any."""

import os
import subprocess
import sys
import textwrap
from pathlib import Path
from typing import Dict, List, NamedTuple, Sequence, Tuple

from vswitch.playing import Recorded, played
from vswitch.recording import recorded
from vswitch.trace import Call, Trace

__all__ = [
    "FORMATTING",
    "LEAVING",
    "RECORDING",
    "SIMULATED",
    "Playing",
    "Recording",
    "play",
    "program",
    "record",
    "record_made",
    "record_tool",
]

_BUILD = Path(os.environ["BUILD_DIR"])
SIMULATED = _BUILD / "simhost"
RECORDING = _BUILD / "tests" / "recording_host"
FORMATTING = _BUILD / "tests" / "formatting_host"
"""Which has nothing but a Panic that writes what it is given."""
LEAVING = _BUILD / "tests" / "leaving_tool" / "leaving_tool"
"""A tool without an interpreter, which jumps out of walks, and makes a call when it exits."""
_CONTRACT = Path(__file__).parents[1] / "contract"
_TIMEOUT = 60


class Recording(NamedTuple):
    """What a tool did, and what is told of it."""

    status: int
    stdout: str
    stderr: str
    trace: Path

    @property
    def calls(self) -> List[Call]:
        with Trace(self.trace) as trace:
            return list(trace)

    def call(self, function: str, nth: int = 0) -> Call:
        return [one for one in self.calls if one.function == function][nth]


class Playing(NamedTuple):
    """What a tool did over a trace, and which of its calls it did not make."""

    status: int
    stdout: str
    stderr: str
    left: List[Recorded]
    has_failed: bool


def program(source: str) -> List[str]:
    """The command that runs a program in Python."""
    return [sys.executable, "-c", textwrap.dedent(source)]


def record(source: str, trace: Path, host: Path = SIMULATED, **variables: str) -> Recording:
    """Runs a program in Python, and records it."""
    return record_tool(program(source), trace, host, **variables)


def record_made(maker: str, seed: int, count: int, trace: Path) -> None:
    """Records what a function makes by chance, in a process of its own; it is one of a module that
    can be imported here."""
    module = maker.split(".")[0]
    path = f"import sys; sys.path[:0] = {sys.path!r}"
    made = record(f"{path}; import {module}; {maker}({seed}, {count})", trace)
    if made.status != 0:
        raise RuntimeError(made.stderr)


def record_tool(
    command: Sequence[str], trace: Path, host: Path = SIMULATED, **variables: str
) -> Recording:
    """Runs a tool, and records it."""
    libraries = {name: host / name for name in ("libvswitch.so", "libnebPublic.so")}
    if not libraries["libnebPublic.so"].exists():
        libraries["libnebPublic.so"] = SIMULATED / "libnebPublic.so"
    with recorded(trace, ["test"], libraries) as environment:
        return Recording(*_run(command, environment, variables), trace)


def play(
    command: Sequence[str], trace: Path, folder: Path, by: str = "order", **variables: str
) -> Playing:
    """Runs a tool over a trace, where no host can be found; `folder` is of without_host."""
    with played(trace, by) as playing:
        environment = playing.environment
        environment["PYTHONPATH"] = os.pathsep.join(
            [str(folder / "python"), os.environ["PYTHONPATH"]]
        )
        done = _run(command, environment, variables)
        return Playing(*done, playing.ledger.left, playing.ledger.has_failed)


def _run(
    command: Sequence[str], environment: Dict[str, str], variables: Dict[str, str]
) -> Tuple[int, str, str]:
    environment.update(variables)
    for name in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
        if name not in variables:
            environment.pop(name, None)
    environment["PYTHONPATH"] += os.pathsep + str(_CONTRACT)
    done = subprocess.run(
        command,
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
        timeout=_TIMEOUT,
    )
    return done.returncode, done.stdout, done.stderr
