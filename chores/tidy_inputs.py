"""Names what clang-tidy's verdict on a source depends on: tidy_inputs.py FOLDER... -- SOURCE...

Prints a line for each source: the source, and a hash of what its verdict depends on, which is the
source, its commands, the headers that it includes, the configuration and clang-tidy itself. FOLDERs
are build folders of Ninja, in which the compiler left which files each object was made of. Where it
has not compiled a source, or not since one of them changed, all headers of the tree count.
"""

import functools
import hashlib
import subprocess
import sys
from pathlib import Path
from typing import Dict, Iterable, List, NamedTuple

from compile_commands import compile_commands
from ninja_files import made_of

ROOT = Path.cwd()


class Compilation(NamedTuple):
    """A command that compiles a source, and the object that it makes."""

    command: str
    made: str


def compilations(folder: Path) -> Dict[Path, List[Compilation]]:
    """The commands of a build folder by their sources."""
    found: Dict[Path, List[Compilation]] = {}
    for entry in compile_commands(folder):
        words = entry["command"].split()
        made = words[words.index("-o") + 1]
        source = Path(entry["directory"], entry["file"])
        found.setdefault(source, []).append(Compilation(entry["command"], made))
    return found


def digest(parts: Iterable[bytes]) -> str:
    whole = hashlib.sha256()
    for part in parts:
        whole.update(hashlib.sha256(part).digest())
    return whole.hexdigest()[:40]


@functools.lru_cache(maxsize=None)
def content(path: Path) -> bytes:
    return digest([bytes(path), path.read_bytes()]).encode()


def contents(paths: Iterable[Path]) -> List[bytes]:
    return [content(path) for path in sorted(paths)]


def headers_of_the_tree() -> List[Path]:
    hidden = ("build", ".")
    tops = [top for top in ROOT.iterdir() if top.is_dir() and not top.name.startswith(hidden)]
    return [header for top in tops for header in top.rglob("*.h")]


def main(folders: List[Path], sources: List[str]) -> None:
    version = subprocess.run(["clang-tidy", "--version"], stdout=subprocess.PIPE, check=True).stdout
    common = digest([version, (ROOT / ".clang-tidy").read_bytes()]).encode()
    all_headers = digest(contents(headers_of_the_tree())).encode()
    commands = [(compilations(folder), made_of(folder, ROOT)) for folder in folders]
    for source in sources:
        path = (ROOT / source).resolve()
        parts = [common, *contents([path])]
        for by_source, files in commands:
            for one in by_source.get(path, []):
                parts.append(one.command.encode())
                read = files.get(one.made)
                parts += [all_headers] if read is None else contents(read)
        print(source, digest(parts))


if __name__ == "__main__":
    separator = sys.argv.index("--")
    main([Path(name).resolve() for name in sys.argv[1:separator]], sys.argv[separator + 1 :])
