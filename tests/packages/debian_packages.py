"""Debian packages, as tests look at them and install them."""

import re
import subprocess
from pathlib import Path
from typing import List, Set

from roots import Root

NAMES = (
    "libvswitch-command",
    "libvswitch-dev",
    "libvswitch-simhost",
    "libvswitch-simhostd",
    "python3-libvswitch",
)


def field(deb: Path, name: str) -> str:
    done = subprocess.run(["dpkg-deb", "-f", deb, name], check=True, capture_output=True, text=True)
    return done.stdout.strip()


def satisfy(root: Root, debs: List[Path]) -> None:
    """Installs what these packages ask for, without what comes from them themselves."""
    parts = [part.strip() for deb in debs for part in field(deb, "Depends").split(",")]
    foreign = [part for part in parts if part and part.split(" ")[0] not in NAMES]
    root.satisfy(", ".join(foreign))


def install(root: Root, debs: List[Path]) -> Set[str]:
    """Installs the packages, and returns the names of all that apt adds for them."""
    files = [root.put(deb, "/tmp/packages") for deb in debs]
    said = root.run("apt-get", "install", "-q", "-y", "--no-install-recommends", *files)
    return set(re.findall(r"^Setting up ([^ :]+)", said, re.MULTILINE))
