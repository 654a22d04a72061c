"""The command as tests run it: a program with words, on a host whose state is in a file."""

import contextlib
import errno
import fcntl
import json
import os
import pty
import struct
import subprocess
import termios
import time
from pathlib import Path
from typing import IO, Any, Callable, Dict, Iterator, List, NamedTuple, Protocol, Tuple

from simhost import SharedHost

PROGRAM = str(Path(os.environ["BUILD_DIR"], "bin", "vswitch"))
SIMULATED = "# simulated host\n"
# How long a test that fails waits, in seconds.
PATIENCE = 60

LAB: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}, {"name": "nic2", "link": "down"}],
    "switches": [
        {
            "alias": "lab",
            "id": "lab-1",
            "portset": "lab-ports",
            "max_ports": 64,
            "mtu": 9000,
            "uplink_ports": [{"id": "left", "uplink": "nic0"}, {"id": "right", "uplink": "nic1"}],
            "lags": [{"name": "lag1", "uplinks": ["nic0", "nic1"]}],
            "teaming": {"balance": "explicit", "active": ["left"], "standby": ["right"]},
            "ports": [
                {
                    "id": "web-1",
                    "vlan": {"id": 7, "trunk": ["10-12"]},
                    "forbids": ["promiscuous"],
                    "counters": {"pktsInUnicast": 5},
                    "addresses": [{"mac": "02:00:00:00:00:01", "type": "static", "vlan": 7}],
                },
                {"id": "web-2"},
            ],
        },
    ],
}


class Done(NamedTuple):
    """How a run of the program ended."""

    status: int
    stdout: str
    stderr: str

    @property
    def lines(self) -> List[str]:
        return self.stdout.splitlines()

    @property
    def json(self) -> Any:
        return json.loads(self.stdout)


class Vswitch(Protocol):
    def __call__(self, *words: str, input: str = ...) -> Done:
        ...


class Refused(Protocol):
    def __call__(self, *words: str, status: int = ..., input: str = ...) -> str:
        ...


def state(host: SharedHost) -> Dict[str, Any]:
    """All that is there, but for faults, which are used up."""
    return {**host.describe(), "faults": []}


def until(what: Callable[[], bool]) -> None:
    end = time.monotonic() + PATIENCE
    while not what():
        assert time.monotonic() < end, "it has not happened"
        time.sleep(0.05)


@contextlib.contextmanager
def started(host: SharedHost, *words: str) -> "Iterator[Tuple[subprocess.Popen[str], IO[str]]]":
    """The program while it runs, and what it writes. It is ended with the block at the latest."""
    with subprocess.Popen(
        [PROGRAM, *words],
        env=host.environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    ) as running:
        assert running.stdout is not None
        try:
            yield running, running.stdout
        finally:
            running.kill()


def on_terminal(host: SharedHost, *words: str, columns: int = 80, **more: str) -> Tuple[int, str]:
    """The status of the program at a terminal, and all that somebody sees there.

    `more` is its environment besides.
    """
    ours, theirs = pty.openpty()
    fcntl.ioctl(theirs, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))
    with open(ours, "rb", buffering=0) as terminal:
        running = subprocess.Popen(
            [PROGRAM, *words],
            env={**host.environment, "TERM": "xterm", **more},
            stdin=theirs,
            stdout=theirs,
            stderr=theirs,
        )
        os.close(theirs)
        seen = b"".join(iter(lambda: _read(terminal), b"")).decode()
    return running.wait(), seen.replace("\r\n", "\n")


def _read(terminal: "IO[bytes]") -> bytes:
    """What comes next; a terminal that nobody writes to any more is at its end."""
    try:
        return terminal.read(4096)
    except OSError as error:
        if error.errno != errno.EIO:
            raise
        return b""
