"""What Ninja knows of a build folder: the files that each object and each target is made of."""

import functools
import subprocess
from pathlib import Path
from typing import Dict, Iterable, List, Optional, Set


def _ask(folder: Path, *question: str) -> List[str]:
    command = ["ninja", "-C", str(folder), "-t", *question]
    told = subprocess.run(command, stdout=subprocess.PIPE, check=True, encoding="utf-8")
    return told.stdout.splitlines()


def made_of(folder: Path, root: Path) -> Dict[str, Set[Path]]:
    """The files below root that the compiler read for each object, as far as that still holds.

    The objects have the names that Ninja gives them; what a folder has not built is not there.
    """

    @functools.lru_cache(maxsize=None)  # most objects are made of the same headers
    def below_root(name: str) -> Optional[Path]:
        path = (folder / name).resolve()
        return path if root in path.parents else None

    found: Dict[str, Set[Path]] = {}
    files: Set[Path] = set()
    for line in _ask(folder, "deps"):
        if line.startswith("    "):
            path = below_root(line.strip())
            if path is not None:
                files.add(path)
        elif line:
            made, _, state = line.partition(": ")
            files = set()
            if state.endswith("(VALID)"):
                found[made] = files
    return found


def inputs(folder: Path, target: str) -> Set[str]:
    """All that a target is made from, objects among them; files of the tree are absolute."""
    return {line.strip() for line in _ask(folder, "inputs", target)}


def touched(folder: Path, root: Path, targets: Iterable[str], changed: Set[Path]) -> Set[str]:
    """The targets that a change of these files makes anew."""
    sources = {str(path) for path in changed}
    objects = {made for made, files in made_of(folder, root).items() if files & changed}
    return {target for target in targets if inputs(folder, target) & (sources | objects)}
