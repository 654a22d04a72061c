"""Files as an examination looks at them: none is changed, waited for or read without end."""

import os
import shutil
import stat
from pathlib import Path

# No library, state or scenario comes near.
_MOST_BYTES = 1 << 28
_ATTEMPTS = 5


class NotExamined(Exception):
    """The file is not one to look into; the text says why."""


def require_plain(path: Path) -> None:
    """NotExamined for what is no regular file, or too large; an OSError if there is none."""
    found = path.stat()
    if not stat.S_ISREG(found.st_mode):
        raise NotExamined(f"{path} is no regular file")
    if found.st_size > _MOST_BYTES:
        raise NotExamined(f"{path} has {found.st_size} bytes, more than any such file")


def read(path: Path, most: int = -1) -> bytes:
    """The bytes of a regular file, or the first of them."""
    require_plain(path)
    with path.open("rb") as file:
        return file.read(most)


def copy_of_state(state: Path, folder: Path) -> Path:
    """A state and what its database keeps beside it, as they are together at one time.

    A call may bring a state forward, use up a fault, or make a state of an empty file: of the copy.
    """
    require_plain(state)
    if state.stat().st_uid not in (os.geteuid(), 0):
        raise NotExamined(f"{state} belongs to another user")
    copy = folder / "host.db"
    for _ in range(_ATTEMPTS):
        before = _marks(state)
        for beside in ("", "-wal"):
            source = Path(f"{state}{beside}")
            if source.exists():
                require_plain(source)
                shutil.copyfile(source, f"{copy}{beside}")
        if _marks(state) == before:
            break
    copy.chmod(0o600)
    return copy


def _marks(state: Path) -> object:
    """What tells whether files changed."""
    found = []
    for beside in ("", "-wal"):
        try:
            status = os.stat(f"{state}{beside}")
            found.append((status.st_ino, status.st_size, status.st_mtime_ns))
        except OSError:
            found.append((0, 0, 0))
    return found
