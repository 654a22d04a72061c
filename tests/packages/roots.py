"""Empty Debian systems to install into: folders with a bookworm of their own, entered by chroot.

The bare system is made once and kept as an archive, and so is every package that apt fetched, both
in the build folder; removing packages/base.tar there gets newer ones.
"""

import os
import shutil
import subprocess
from pathlib import Path
from typing import Set

FOLDER = Path(os.environ["BUILD_DIR"], "packages")
_BASE = FOLDER / "base.tar"
_ARCHIVES = FOLDER / "apt"

# Mounts die with the namespace that the command runs in, and its processes with it.
_ENTER = """
mount --bind "$2" "$1/var/cache/apt/archives"
mount -t proc proc "$1/proc"
root=$1
shift 2
exec chroot "$root" "$@"
"""

# What apt, dpkg and ldconfig keep for themselves, and what comes and goes by itself.
_OF_THE_SYSTEM = (
    "/proc",
    "/dev",
    "/tmp",
    "/var/cache",
    "/var/log",
    "/var/lib/apt",
    "/var/lib/dpkg",
)

Done = subprocess.CompletedProcess


class Root:
    """A Debian system of its own, with nothing but the essential packages and apt."""

    def __init__(self, name: str) -> None:
        self.folder = FOLDER / "roots" / name
        shutil.rmtree(self.folder, ignore_errors=True)
        self.folder.mkdir(parents=True)
        _ARCHIVES.mkdir(exist_ok=True)
        subprocess.run(["tar", "-x", "-f", str(_base()), "-C", str(self.folder)], check=True)

    def path(self, inside: str) -> Path:
        return self.folder / inside.lstrip("/")

    def try_run(self, *command: str, **environment: str) -> "Done[str]":
        """Runs it as root in the folder /tmp of that system, with an environment of its own."""
        settings = {
            "PATH": "/usr/sbin:/usr/bin:/sbin:/bin",
            "LC_ALL": "C.UTF-8",
            "HOME": "/tmp",
            "DEBIAN_FRONTEND": "noninteractive",
            **environment,
        }
        clean = [
            "env",
            "-i",
            "-C",
            "/tmp",
            *(f"{name}={value}" for name, value in settings.items()),
        ]
        return subprocess.run(
            ["unshare", "--mount", "--pid", "--fork", "--kill-child", "sh", "-ec", _ENTER, "enter"]
            + [str(self.folder), str(_ARCHIVES), *clean, *command],
            stdin=subprocess.DEVNULL,
            capture_output=True,
            text=True,
            timeout=1200,
        )

    def run(self, *command: str, **environment: str) -> str:
        """What the command prints; it must succeed."""
        done = self.try_run(*command, **environment)
        assert done.returncode == 0, f"{' '.join(command)}\n{done.stdout}{done.stderr}"
        return done.stdout

    def satisfy(self, dependencies: str) -> None:
        """Installs what such a line of a package's control file asks for."""
        self.run("apt-get", "satisfy", "-q", "-y", "--no-install-recommends", dependencies)

    def put(self, file: Path, folder: str) -> str:
        """Copies the file into the folder there; returns its path there."""
        self.path(folder).mkdir(parents=True, exist_ok=True)
        shutil.copy(file, self.path(folder))
        return f"{folder}/{file.name}"

    def write(self, inside: str, text: str) -> str:
        self.path(inside).parent.mkdir(parents=True, exist_ok=True)
        self.path(inside).write_text(text, encoding="utf-8")
        return inside

    def files(self, below: str = "/") -> Set[str]:
        """All that lies there, but for what is the system's own business."""
        left_out = [word for folder in _OF_THE_SYSTEM for word in ("-path", folder, "-prune", "-o")]
        return set(self.run("find", below, *left_out, "-print").splitlines())


def _base() -> Path:
    if not _BASE.exists():
        making = _BASE.with_suffix(".new.tar")
        # The lists of packages stay, so that apt can work in a root at once.
        subprocess.run(
            ["mmdebstrap", "--mode=root", "--variant=minbase", "--quiet"]
            + ["--skip=cleanup/apt/lists", "bookworm", str(making)],
            check=True,
        )
        making.rename(_BASE)
    return _BASE
