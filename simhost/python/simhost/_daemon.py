"""simhostd, with an Open vSwitch of its own in a network namespace."""

import signal
import subprocess
from pathlib import Path
from typing import Any, Optional, Sequence

from simhost import _loaded
from simhost._namespaces import PATIENCE, Namespace, NoFrames


class Daemon:
    """Moves the frames of the host in a state file; `where` is what it says of Open vSwitch, and
    `more` are further options of it."""

    def __init__(
        self, namespace: Namespace, state: Path, where: str, log: Path, more: Sequence[str] = ()
    ) -> None:
        with open(log, "a", encoding="utf-8") as errors:
            self._process: Optional["subprocess.Popen[str]"] = start_simhostd(
                namespace, state, where, more, stdout=subprocess.PIPE, stderr=errors
            )
        if _first_line(self._process) != "ready\n":
            self.stop(signal.SIGKILL)
            raise NoFrames(f"simhostd does not start:\n{log.read_text(encoding='utf-8').strip()}")

    @property
    def pid(self) -> int:
        assert self._process is not None
        return self._process.pid

    def send(self, number: int) -> None:
        assert self._process is not None
        self._process.send_signal(number)

    def stop(self, number: int = signal.SIGTERM) -> None:
        if self._process is not None:
            self._process.send_signal(number)
            self._process.communicate(timeout=PATIENCE)
            self._process = None


def start_simhostd(
    namespace: Namespace, state: Path, where: str, more: Sequence[str] = (), **options: Any
) -> "subprocess.Popen[str]":
    program = str(_loaded.program("simhostd", package="libvswitch-simhostd"))
    words = ["--state", str(state), "--openvswitch", where, *more]
    return namespace.start(program, *words, **options)


def _first_line(process: "subprocess.Popen[str]") -> str:
    """What it says first; nothing if it ends."""
    assert process.stdout is not None
    return str(process.stdout.readline())
