"""Network namespaces without names: each is held by a process that ends with this one, however that
ends, and the devices in it go with it."""

import os
import shutil
import socket
import subprocess
import sys
from pathlib import Path
from typing import Any, List, Optional

PATIENCE = 30.0
_HOLDER = Path(__file__).with_name("_namespace_holder.py")
_TOOLS = {
    "ethtool": "ethtool",
    "ip": "iproute2",
    "nsenter": "util-linux",
    "setpriv": "util-linux",
    "unshare": "util-linux",
}


class NoFrames(Exception):
    """Frames cannot be had here; the text says what is missing, and what to do."""


class CommandFailed(Exception):
    """A command in a namespace failed; the text says what it said."""


def require_tools() -> None:
    """Raises NoFrames for a command that namespaces take."""
    for tool, package in _TOOLS.items():
        if shutil.which(tool) is None:
            raise NoFrames(f"frames need the command {tool}: install Debian's package {package}")


def own_user_needed() -> bool:
    """Whether namespaces take a user namespace of their own."""
    return os.geteuid() != 0


class Namespace:
    """A network namespace, within `outer`'s user namespace or one of its own."""

    def __init__(self, outer: Optional["Namespace"] = None, own_user: bool = False) -> None:
        words = outer.words() if outer else []
        user = ["--user", "--map-root-user"] if own_user else []
        words += ["unshare", *user, "--net", sys.executable, "-IS", str(_HOLDER)]
        self._enters_user: bool = own_user or (outer is not None and outer._enters_user)
        self._socket, theirs = socket.socketpair()
        with theirs:
            # In a session of its own: an interrupt from the terminal leaves it to its owner.
            self._holder: "subprocess.Popen[bytes]" = subprocess.Popen(
                words, stdin=theirs.fileno(), stderr=subprocess.PIPE, start_new_session=True
            )
        self._socket.settimeout(PATIENCE)
        if not self._socket.recv(1):
            said = self._holder.communicate()[1].decode().strip()
            self._socket.close()
            raise NoFrames(
                f"no network namespace can be made here ({said}): be root, or have the system allow"
                " namespaces of users"
            )

    @property
    def pid(self) -> int:
        """Of the process that holds it."""
        return self._holder.pid

    def words(self) -> List[str]:
        """What a command begins with that runs in here."""
        user = ["--user", "--preserve-credentials"] if self._enters_user else []
        return ["nsenter", "--target", str(self.pid), *user, "--net"]

    def _ending_with_us(self, *words: str) -> List[str]:
        return [*self.words(), "setpriv", "--pdeathsig", "KILL", *words]

    def start(self, *words: str, **options: Any) -> "subprocess.Popen[str]":
        """Starts a program that ends with this process."""
        return subprocess.Popen(
            self._ending_with_us(*words), text=True, start_new_session=True, **options
        )

    def try_run(self, *words: str) -> "subprocess.CompletedProcess[str]":
        return subprocess.run(
            self._ending_with_us(*words),
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
            timeout=PATIENCE,
            check=False,
        )

    def run(self, *words: str) -> str:
        """What a command printed; raises CommandFailed."""
        done = self.try_run(*words)
        if done.returncode != 0:
            raise CommandFailed(f"{' '.join(words)}: {done.stdout}")
        return done.stdout

    def packet_socket(self, device: str) -> socket.socket:
        """A socket that sends and receives whole frames at a device in here."""
        self._socket.sendall(device.encode())
        size = socket.CMSG_LEN(4)
        text, more, _, _ = self._socket.recvmsg(1, size)
        if not text:
            raise CommandFailed(f"no packet socket can be had at {device}")
        return socket.socket(fileno=int.from_bytes(more[0][2], sys.byteorder))

    def close(self) -> None:
        """Ends it with all that is in it."""
        self._socket.close()
        self._holder.kill()
        self._holder.communicate()
