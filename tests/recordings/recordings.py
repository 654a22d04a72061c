"""Tools that are recorded: programs in processes of their own, on the host that a test names."""

import os
import subprocess
import sys
import textwrap
from pathlib import Path
from typing import Dict, List, NamedTuple, Tuple

from vswitch.recording import recorded
from vswitch.trace import Call, Trace

__all__ = ["FORMATTING", "RECORDING", "SIMULATED", "Recording", "record"]

_BUILD = Path(os.environ["BUILD_DIR"])
SIMULATED = _BUILD / "simhost"
RECORDING = _BUILD / "tests" / "recording_host"
FORMATTING = _BUILD / "tests" / "formatting_host"
"""Which has nothing but a Panic that writes what it is given."""
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


def record(program: str, trace: Path, host: Path = SIMULATED, **variables: str) -> Recording:
    """Runs a program in Python, and records it."""
    libraries = {name: host / name for name in ("libvswitch.so", "libnebPublic.so")}
    if not libraries["libnebPublic.so"].exists():
        libraries["libnebPublic.so"] = SIMULATED / "libnebPublic.so"
    with recorded(trace, ["test"], libraries) as environment:
        environment.update(variables)
        for name in ("SIMHOST_STATE", "SIMHOST_SCENARIO"):
            if name not in variables:
                environment.pop(name, None)
        environment["PYTHONPATH"] += os.pathsep + str(_CONTRACT)
        return Recording(*_run(program, environment), trace)


def _run(program: str, environment: Dict[str, str]) -> Tuple[int, str, str]:
    command = [sys.executable, "-c", textwrap.dedent(program)]
    done = subprocess.run(
        command,
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
        timeout=_TIMEOUT,
    )
    return done.returncode, done.stdout, done.stderr
