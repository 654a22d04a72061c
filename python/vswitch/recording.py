"""Recording what a tool asks of the host: libraries that stand before the host's own, and a trace.

    with recorded(Path("trace.jsonl"), ["./tool.py"]) as environment:
        subprocess.run(["./tool.py"], env=environment)

The libraries of the recorder have the names of the host's. The loader finds them first, and through
them those that it would have found; where these lie is written into copies that live as long as the
recording.
"""

import contextlib
import ctypes
import errno
import hashlib
import importlib.metadata
import json
import os
import tempfile
from datetime import datetime, timezone
from pathlib import Path
from typing import Dict, Iterator, Optional, Sequence

import _libvswitch

from vswitch import _front
from vswitch.trace import MARK, VERSION
from libvswitch.errors import HostError

__all__ = ["anew", "begin", "host_libraries", "recorded"]

# A function of each library.
_FUNCTIONS = {"libvswitch.so": "VSDVS_SetMTU", "libnebPublic.so": "DVSQEX_StateGet"}
_TRACE = "VSWITCH_RECORD_TRACE"


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
    for name, function in _FUNCTIONS.items():
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
    if not (_front.folder() / _front.RUNTIME).exists():
        raise HostError(f"the recorder is not installed: {_front.folder()} lacks its libraries")
    libraries = libraries or host_libraries()
    if any((library.parent / _front.RUNTIME).exists() for library in libraries.values()):
        raise HostError("this is being recorded already")
    with tempfile.TemporaryDirectory(prefix="vswitch-record-") as made:
        _front.place(Path(made), libraries)
        begin(trace, command, libraries)
        yield {**_front.environment(Path(made)), _TRACE: str(trace.absolute())}


def begin(trace: Path, command: Sequence[str], libraries: Dict[str, Path]) -> None:
    """Writes the first line of a trace; what was there is replaced."""
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


@contextlib.contextmanager
def anew(trace: Path) -> Iterator[Path]:
    """A new file in the folder of a trace, to replace it if what is recorded there is to stay.

    What is wrong with the place is told of the trace.
    """
    if trace.is_dir():
        raise IsADirectoryError(errno.EISDIR, os.strerror(errno.EISDIR), str(trace))
    try:
        descriptor, name = tempfile.mkstemp(prefix=f".{trace.name}.", dir=str(trace.parent))
    except OSError as error:
        raise OSError(error.errno, error.strerror, str(trace)) from None
    os.close(descriptor)
    made = Path(name)
    try:
        yield made
    finally:
        if made.exists():
            made.unlink()


def _identity(library: Path) -> Dict[str, str]:
    return {"path": str(library), "sha256": hashlib.sha256(library.read_bytes()).hexdigest()}
