"""Which files the loader tries for a library that a module asks for."""

import os
import re
import subprocess
import sysconfig
from pathlib import Path
from typing import Dict, List

from libvswitch import _elf

_TIMEOUT = 60


def candidates(name: str, module: _elf.Elf) -> List[Path]:
    """What has that name, in the order in which the loader tries it."""
    given = os.environ.get("LD_LIBRARY_PATH", "")
    folders = re.split("[:;]", given) if given else []
    origin = str(module.path.resolve().parent)
    for folder in module.runpath:
        folders.append(folder.replace("$ORIGIN", origin).replace("${ORIGIN}", origin))
    # An empty folder among others is the current one, to the loader and to Path.
    files = [Path(folder, name) for folder in folders] + _cached(name)
    multiarch = str(sysconfig.get_config_var("MULTIARCH") or "")
    for folder in ("/lib", "/usr/lib", "/lib64", "/usr/lib64"):
        files += [Path(folder, multiarch, name), Path(folder, name)]
    found: Dict[str, Path] = {}
    for file in files:
        if os.path.exists(file):
            found.setdefault(os.path.realpath(file), Path(os.path.abspath(file)))
    return list(found.values())


def _cached(name: str) -> List[Path]:
    """What the loader's cache knows under that name."""
    for program in ("/sbin/ldconfig", "/usr/sbin/ldconfig"):
        try:
            done = subprocess.run([program, "-p"], stdout=subprocess.PIPE, timeout=_TIMEOUT)
        except (OSError, subprocess.SubprocessError):
            continue
        lines = done.stdout.decode("utf-8", "replace").splitlines()
        return [
            Path(line.split(" => ")[1]) for line in lines if line.strip().startswith(f"{name} ")
        ]
    return []
