"""The libraries that stand before the host's: copies of them, and those of this process.

They have the names of the host's, so whoever finds them first has them. Nothing here needs a host.
"""

import ctypes
import functools
import importlib.util
import os
import shutil
import sys
import tempfile
from pathlib import Path
from typing import Any, Dict, Optional, Tuple

__all__ = ["LIBRARIES", "RUNTIME", "Runtime", "environment", "folder", "place", "stand_in_front"]

PATHS = "LD_LIBRARY_PATH"
RUNTIME = "librecordings.so"
_TRAP = "librecordings_trap.so"
LIBRARIES = ("libvswitch.so", "libnebPublic.so")
# What they are linked against, in place of the host's; no path is longer.
_ROOM = b"@" * 4096
_LONGEST = 8192


def folder() -> Path:
    """Where they are: in this package, or beside the folder of the module, as they are built."""
    installed = Path(__file__).resolve().parent / "recordings"
    if installed.is_dir():
        return installed
    module = importlib.util.find_spec("_libvswitch")
    beside = module.origin if module is not None and module.origin else __file__
    return Path(beside).resolve().parent.parent / "recordings"


def place(made: Path, hosts: Dict[str, Path]) -> None:
    """Puts copies into a folder, which go on to the host's libraries, or have no host."""
    for name in LIBRARIES:
        (made / name).write_bytes(_bound(folder() / name, hosts.get(name)))
    shutil.copy(folder() / RUNTIME, made)


def _bound(library: Path, host: Optional[Path]) -> bytes:
    held = library.read_bytes()
    room = b"@host:" + library.name.encode() + _ROOM
    if held.count(room) != 1:
        raise OSError(f"{library} does not stand before a host")
    needed = os.fsencode(host) if host is not None else RUNTIME.encode()
    return held.replace(room, needed.ljust(len(room), b"\0"))


def environment(made: Path) -> Dict[str, str]:
    """That in which a program finds the copies in a folder."""
    before = os.environ.get(PATHS)
    return {**os.environ, PATHS: os.pathsep.join([str(made), *([before] if before else [])])}


def stand_in_front(hosts: Dict[str, Path]) -> None:
    """Has this process find them in place of the host's libraries.

    Nothing may have loaded those yet: the loader has one library of a name.
    """
    if "_libvswitch" in sys.modules:
        raise OSError("_libvswitch is loaded already, and with it the libraries of a host")
    with tempfile.TemporaryDirectory(prefix="vswitch-front-") as made:
        place(Path(made), hosts)
        # What the module has for a host, and brings too late for these.
        shutil.copy(folder() / _TRAP, made)
        for name in (_TRAP, *LIBRARIES):
            _KEPT[name] = ctypes.CDLL(str(Path(made, name)), ctypes.RTLD_GLOBAL)


_KEPT: Dict[str, ctypes.CDLL] = {}


class Runtime:
    """What becomes of the calls of this process, if the libraries stand in front."""

    def __init__(self) -> None:
        self._library = _runtime()

    def forward(self) -> None:
        """Calls go to the host, if there is one."""
        self._library.recordings_forward()

    def record(self, trace: Path) -> None:
        """Calls go to the host, and are written into a trace that has its first line."""
        self._do("record", os.fsencode(trace))

    def play(self, trace: Path, ledger: Path, by_arguments: bool) -> None:
        """Calls are played."""
        self._do("play", os.fsencode(trace), os.fsencode(ledger), int(by_arguments))

    def failure(self) -> str:
        """What the first call that could not be played was told."""
        return self._said("failure")

    def check(self, trace: Path) -> Tuple[int, int]:
        """Looks at all of a trace; how many processes and how many calls there are."""
        processes, calls = ctypes.c_size_t(), ctypes.c_size_t()
        self._do("check", os.fsencode(trace), ctypes.byref(processes), ctypes.byref(calls))
        return processes.value, calls.value

    def _do(self, what: str, *arguments: Any) -> None:
        wrong = self._said(what, *arguments)
        if wrong:
            raise OSError(wrong)

    def _said(self, what: str, *arguments: Any) -> str:
        said = ctypes.create_string_buffer(_LONGEST)
        function = getattr(self._library, f"recordings_{what}")
        length = function(*arguments, said, ctypes.c_size_t(len(said)))
        return said.value.decode("utf-8", "replace") if length else ""


@functools.lru_cache(maxsize=None)
def _runtime() -> ctypes.CDLL:
    # Once copies of the others are loaded, the loader has theirs, which is the same.
    library = ctypes.CDLL(str(folder() / RUNTIME) if not _KEPT else RUNTIME)
    for name in ("record", "play", "failure", "check"):
        getattr(library, f"recordings_{name}").restype = ctypes.c_size_t
    return library
