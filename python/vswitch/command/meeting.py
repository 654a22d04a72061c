"""Where a change that waits and its confirmation meet: a socket, a lock and a note, of one user.

Their folder does not depend on the environment of a shell, and outlasts its session: who confirms
may have lost the shell that made the change. It outlasts the machine, too, for the note says of a
change that was cut off that it is left. There is one of each for a host, or for the state file of a
simulated one.
"""

import contextlib
import fcntl
import hashlib
import json
import os
import socket
import stat
from pathlib import Path
from typing import Dict, Iterator, Optional

from libvswitch.errors import HostError
from vswitch.host import Host

__all__ = ["Meeting", "folder"]

_CONFIRM = b"confirm"
_DONE = b"confirmed"
_PATIENCE = 5


def folder() -> Path:
    """Where this user's changes and confirmations meet, whatever a shell's environment says."""
    return Path("/var/tmp", f"vswitch-{os.getuid()}")


class Meeting:
    """The place where a change of this host is confirmed."""

    def __init__(self, host: Host) -> None:
        of = "host"
        if host.simulated:
            if not os.environ.get("SIMHOST_STATE"):
                raise HostError(
                    "this simulated host ends with the command: SIMHOST_STATE names a lasting one"
                )
            of = os.path.realpath(os.environ["SIMHOST_STATE"])
        self._name = hashlib.sha256(os.fsencode(of)).hexdigest()[:16]

    # Both sides

    def _path(self, kind: str) -> Path:
        where = folder()
        with contextlib.suppress(FileExistsError):
            where.mkdir(mode=0o700)
        found = where.lstat()
        # In a folder that is everybody's, that name may be somebody else's.
        if not stat.S_ISDIR(found.st_mode) or found.st_uid != os.getuid() or found.st_mode & 0o077:
            raise HostError(f"{where} is not a folder of this user alone")
        return where / f"{self._name}.{kind}"

    @contextlib.contextmanager
    def _lock(self, more: int) -> Iterator[None]:
        """While somebody has it, a change waits, is made or is taken back."""
        held = os.open(self._path("lock"), os.O_RDWR | os.O_CREAT | os.O_CLOEXEC, 0o600)
        try:
            fcntl.flock(held, fcntl.LOCK_EX | more)
            yield
        finally:
            os.close(held)

    # Who waits

    @contextlib.contextmanager
    def kept(self) -> Iterator[socket.socket]:
        """Listens where changes are confirmed; only one can wait."""
        with contextlib.ExitStack() as stack:
            try:
                stack.enter_context(self._lock(fcntl.LOCK_NB))
            except BlockingIOError:
                raise HostError("another change waits to be confirmed") from None
            path = self._path("socket")
            with contextlib.suppress(FileNotFoundError):
                path.unlink()  # of one that was killed
            listening = stack.enter_context(socket.socket(socket.AF_UNIX))
            listening.bind(str(path))
            path.chmod(0o600)
            listening.listen()
            yield listening

    def stop(self) -> None:
        """Who comes now is too late."""
        with contextlib.suppress(FileNotFoundError):
            self._path("socket").unlink()

    @staticmethod
    def is_confirmed(listening: socket.socket) -> bool:
        """Whether who has come confirms the change."""
        with contextlib.suppress(OSError), listening.accept()[0] as who:
            who.settimeout(_PATIENCE)
            if who.recv(len(_CONFIRM)) == _CONFIRM:
                # Who is gone by then has not been told that it stays, so it does not.
                who.sendall(_DONE)
                return True
        return False

    def note(self, outcome: str, words: str = "") -> None:
        """What became of the change, for who comes too late."""
        path = self._path("note")
        new = path.with_suffix(".new")
        with contextlib.suppress(FileNotFoundError):
            new.unlink()
        made = os.open(new, os.O_WRONLY | os.O_CREAT | os.O_EXCL, 0o600)
        with open(made, "w", encoding="utf-8") as file:
            json.dump({"outcome": outcome, "words": words}, file)
        new.replace(path)

    # Who confirms

    def confirm(self) -> bool:
        """Confirms the change that waits; False if there is none, or none any more.

        While the change is being made, it waits for that.
        """
        with contextlib.suppress(FileNotFoundError, ConnectionError):
            with socket.socket(socket.AF_UNIX) as who:
                who.connect(str(self._path("socket")))
                who.sendall(_CONFIRM)
                return who.recv(len(_DONE)) == _DONE
        return False

    def last(self) -> Optional[Dict[str, str]]:
        """What became of the last change, once that is known."""
        with self._lock(0), contextlib.suppress(FileNotFoundError):
            found: Dict[str, str] = json.loads(self._path("note").read_text(encoding="utf-8"))
            return found
        return None
