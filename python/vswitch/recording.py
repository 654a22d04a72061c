"""Recording what a tool asks of the host: libraries that stand before the host's own, and a trace.

    with recorded(Path("trace.jsonl"), ["./tool.py"]) as environment:
        subprocess.run(["./tool.py"], env=environment)

The libraries of the recorder have the names of the host's. The loader finds them first, and through
them those that it would have found; where these lie is written into copies that live as long as the
recording.
"""

import contextlib
import ctypes
import hashlib
import importlib.metadata
import json
import os
import shutil
import tempfile
from datetime import datetime, timezone
from pathlib import Path
from typing import Dict, Iterator, Optional, Sequence

import _libvswitch

from vswitch.trace import MARK, VERSION
from libvswitch.errors import HostError

__all__ = ["host_libraries", "recorded"]

_FOLDER = Path(_libvswitch.__file__).resolve().parent.parent / "recordings"
_RUNTIME = "librecordings.so"
# A function of each library.
_LIBRARIES = {"libvswitch.so": "VSDVS_SetMTU", "libnebPublic.so": "DVSQEX_StateGet"}
# What the libraries of the recorder are linked against, in place of the host's; no path is longer.
_ROOM = b"@" * 4096
_PATHS, _TRACE = "LD_LIBRARY_PATH", "VSWITCH_RECORD_TRACE"


class _Found(ctypes.Structure):
    _fields_ = [
        ("file", ctypes.c_char_p),
        ("base", ctypes.c_void_p),
        ("name", ctypes.c_char_p),
        ("address", ctypes.c_void_p),
    ]


def host_libraries() -> Dict[str, Path]:
    """The host's libraries as the loader has found them for this process."""
    module = ctypes.CDLL(_libvswitch.__file__)
    look = ctypes.CDLL(None).dladdr
    found = {}
    for name, function in _LIBRARIES.items():
        at = _Found()
        look(ctypes.cast(getattr(module, function), ctypes.c_void_p), ctypes.byref(at))
        found[name] = Path(os.fsdecode(at.file or b"")).absolute()
    return found


@contextlib.contextmanager
def recorded(
    trace: Path, command: Sequence[str], libraries: Optional[Dict[str, Path]] = None
) -> Iterator[Dict[str, str]]:
    """Begins a trace; the environment in which a tool's calls are written into it.

    They go on to the host's libraries as this process has them, or to those that are given.
    """
    if not (_FOLDER / _RUNTIME).exists():
        raise HostError(f"the recorder is not installed: {_FOLDER} lacks its libraries")
    libraries = libraries or host_libraries()
    with tempfile.TemporaryDirectory(prefix="vswitch-record-") as made:
        _stand_before(libraries, Path(made))
        _begin(trace, command, libraries)
        paths = [made, os.environ[_PATHS]] if os.environ.get(_PATHS) else [made]
        yield {**os.environ, _PATHS: os.pathsep.join(paths), _TRACE: str(trace.absolute())}


def _stand_before(libraries: Dict[str, Path], folder: Path) -> None:
    for name, library in libraries.items():
        if (library.parent / _RUNTIME).exists():
            raise HostError("this is being recorded already")
        (folder / name).write_bytes(_bound(name, library))
    shutil.copy(_FOLDER / _RUNTIME, folder)


def _bound(name: str, library: Path) -> bytes:
    """A library of the recorder that forwards to one of the host's."""
    held = (_FOLDER / name).read_bytes()
    room, path = b"@host:" + name.encode() + _ROOM, os.fsencode(library)
    if held.count(room) != 1:
        raise HostError(f"{_FOLDER / name} is no library of the recorder")
    return held.replace(room, path.ljust(len(room), b"\0"))


def _begin(trace: Path, command: Sequence[str], libraries: Dict[str, Path]) -> None:
    header = {
        MARK: VERSION,
        "module": importlib.metadata.version("libvswitch"),
        "time": datetime.now(timezone.utc).strftime("%Y-%m-%dT%H:%M:%SZ"),
        "command": list(command),
        "libraries": {name: _identity(library) for name, library in libraries.items()},
    }
    # What a tool asks of a host is nobody's business but its user's.
    descriptor = os.open(trace, os.O_WRONLY | os.O_CREAT | os.O_TRUNC, 0o600)
    with open(descriptor, "w", encoding="utf-8") as file:
        file.write(json.dumps(header) + "\n")


def _identity(library: Path) -> Dict[str, str]:
    return {"path": str(library), "sha256": hashlib.sha256(library.read_bytes()).hexdigest()}
